"""The packages: what is in them, and what they do to a fresh machine that installs them."""

import collections
import glob
import subprocess

import pytest

from product import (CONFIGURATION, DEFAULTS, EXAMPLE, LOG, PINGS, WATCH_CRON, daemon, install,
                     set_up, upgrade)

# Debian's own documents of a package.
DEBIAN_ALONE = {"usr/share/doc/tolkwd/copyright", "usr/share/doc/tolkwd/changelog.Debian.gz",
                "usr/share/lintian/overrides/tolkwd"}


on_a_machine = pytest.mark.machine


def output(*command):
    return subprocess.run(command, check=True, capture_output=True, text=True).stdout


def files_of_deb(package):
    lines = output("dpkg-deb", "--contents", package).splitlines()
    return {line.split(" -> ")[0].split(" ./", 1)[1] for line in lines
            if not line.startswith("d")}


def cron(machine):
    return machine.read("/run/crond.pid").strip()


def foreign_package(folder):
    """A package of the management agent's: a file in each of its folders."""
    tree = folder / "agentx"
    for name in ("opt/varden/tolk/bin/agent.conf", "etc/opt/varden/tolk/cimom"):
        (tree / name).parent.mkdir(parents=True)
        (tree / name).write_text("")
    (tree / "DEBIAN").mkdir()
    (tree / "DEBIAN" / "control").write_text(
        "Package: agentx\nVersion: 1\nArchitecture: all\nMaintainer: somebody\n"
        "Description: another package of the same folders\n")
    subprocess.run(["dpkg-deb", "--root-owner-group", "--build", tree, folder / "agentx.deb"],
                   check=True, stdout=subprocess.DEVNULL)
    return folder / "agentx.deb"


def test_every_file_has_its_place(packed):
    files = files_of_deb(packed("DEB"))
    assert {"opt/varden/tolk/bin/tolkwd", "usr/sbin/tolkwd", EXAMPLE[1:], DEFAULTS[1:],
            "opt/varden/tolk/bin/tolkwd-check", "usr/sbin/tolkwd-check",
            "opt/varden/tolk/bin/tolkwd-report", "usr/bin/tolkwd-report",
            "usr/share/bash-completion/completions/tolkwd-check",
            "usr/share/bash-completion/completions/tolkwd-report",
            "etc/init.d/tolkwd", "usr/lib/systemd/system/tolkwd.service",
            "usr/share/man/man8/tolkwd.8.gz", "usr/share/man/man5/tolkwd.xml.5.gz",
            "usr/share/man/man8/tolkwd-check.8.gz", "usr/share/man/man1/tolkwd-report.1.gz",
            "usr/share/doc/tolkwd/LICENSE", "usr/share/doc/tolkwd/OPERATING.md",
            "usr/share/doc/tolkwd/MESSAGES.md"} <= files
    assert CONFIGURATION[1:] not in files


def test_the_programs_need_no_library_but_cs_and_cpps(packed):
    depends = output("dpkg-deb", "--field", packed("DEB"), "Depends")
    assert {one.split()[0] for one in depends.split(", ")} == {
        "libc6", "libgcc-s1", "libstdc++6", "sysvinit-utils"}


def test_rpm_holds_the_same(packed):
    rpm = set(output("rpm", "--query", "--list", "--package", packed("RPM"),
                     "--queryformat", "[%{FILEMODES:perms} %{FILENAMES}\n]").splitlines())
    files = {line.split(" /", 1)[1] for line in rpm if " " in line and not line.startswith("d")}
    assert files == files_of_deb(packed("DEB")) - DEBIAN_ALONE


def test_rpm_keeps_what_operators_edit(packed):
    kept = output("rpm", "--query", "--configfiles", "--package", packed("RPM")).split()
    assert sorted(kept) == sorted([DEFAULTS, "/etc/init.d/tolkwd", EXAMPLE])


def test_lintian_has_nothing_to_say(packed):
    done = subprocess.run(["lintian", "--fail-on", "error,warning", packed("DEB")],
                          capture_output=True, text=True)
    assert (done.returncode, done.stdout) == (0, "")


def test_the_same_sources_give_the_same_package(build, packed, tmp_path):
    # Not even their compressed files know when they were made, or of what file.
    compressed = glob.glob(str(build / "packaging/*.gz"))
    assert compressed
    for name in compressed:
        with open(name, "rb") as file:
            assert file.read(8)[3:] == bytes(5), name
    environment = {"SOURCE_DATE_EPOCH": "1000000000", "PATH": "/usr/sbin:/usr/bin:/sbin:/bin"}
    contents = []
    for folder in (tmp_path / "first", tmp_path / "second"):
        subprocess.run(["cpack", "-G", "DEB", "-B", folder], cwd=build, env=environment,
                       check=True, stdout=subprocess.DEVNULL)
        package, = folder.glob("*.deb")
        contents.append(package.read_bytes())
    assert contents[0] == contents[1]


@pytest.mark.parametrize("kind, list_files", [("DEB", ["dpkg-deb", "--contents"]),
                                              ("RPM", ["rpm", "-qlvp"])])
def test_folders_can_be_read_whoever_makes_the_package(build, tmp_path, kind, list_files):
    subprocess.run(["cpack", "-G", kind, "-B", tmp_path], cwd=build, umask=0o077, check=True,
                   stdout=subprocess.DEVNULL)
    package, = tmp_path.glob(f"*.{kind.lower()}")
    folders = [line for line in output(*list_files, package).splitlines() if line[0] == "d"]
    assert folders
    assert [line for line in folders if not line.startswith("drwxr-xr-x")] == []


def test_rpm_says_what_it_is_and_needs(packed):
    described = output("rpm", "-qp", "--queryformat", "%{DESCRIPTION}", packed("RPM"))
    assert described.startswith("tolkwd asks the service command")
    assert "/usr/sbin/service" in output("rpm", "-qp", "--requires", packed("RPM")).split()


def test_rpm_has_its_scripts(packed, project):
    scripts = output("rpm", "-qp", "--scripts", packed("RPM"))
    for name in ("post", "preun", "postun"):
        assert (project / "packaging/rpm" / name).read_text() in scripts


def test_an_installation_by_hand_overwrites_no_edited_file(build, tmp_path):
    def install():
        subprocess.run(["cmake", "--install", build], env={"DESTDIR": str(tmp_path),
                       "PATH": "/usr/bin:/bin"}, check=True, stdout=subprocess.DEVNULL)

    install()
    for link in ("usr/sbin/tolkwd", "usr/sbin/tolkwd-check", "usr/bin/tolkwd-report"):
        name = link.rsplit("/", 1)[1]
        program = tmp_path / "opt/varden/tolk/bin" / name
        assert program.stat().st_mode & 0o111 == 0o111
        assert (tmp_path / link).readlink().as_posix() == f"{PINGS}/{name}"
    edited = tmp_path / EXAMPLE[1:]
    edited.write_text("edited")
    install()
    assert edited.read_text() == "edited"


def test_the_unit_is_in_order(build, project, tmp_path):
    """In a sandbox in which the program is where the unit expects it."""
    subprocess.run(["cmake", "--install", build], env={"DESTDIR": str(tmp_path),
                   "PATH": "/usr/bin:/bin"}, check=True, stdout=subprocess.DEVNULL)

    def verify(unit):
        done = subprocess.run(
            [project / "scripts/sandbox.sh", "--ro-bind", tmp_path / "opt/varden", "/opt/varden",
             "--ro-bind", unit, "/run/tolkwd.service", "--",
             "systemd-analyze", "verify", "--man=no", "/run/tolkwd.service"],
            stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True)
        return done.returncode, done.stdout

    unit = tmp_path / "usr/lib/systemd/system/tolkwd.service"
    # What operators rely on.
    assert {"ConditionPathExists=" + CONFIGURATION, "After=local-fs.target", "Restart=always",
            "RestartSec=10", "RestartPreventExitStatus=2", "StartLimitIntervalSec=0",
            "IgnoreSIGPIPE=yes", "KillMode=process", "OOMPolicy=continue", "TasksMax=infinity",
            "StandardOutput=journal", "StandardError=journal", "LogRateLimitIntervalSec=0",
            "Environment=LC_MESSAGES=C", "UnsetEnvironment=LC_ALL",
            "EnvironmentFile=-" + DEFAULTS,
            # The checker's findings, its end and its absence never stop a start.
            "ExecStartPre=-/usr/bin/timeout -k 1 20 /opt/varden/tolk/bin/tolkwd-check "
            + CONFIGURATION,
            "WantedBy=multi-user.target"} <= set(unit.read_text().splitlines())
    assert verify(unit) == (0, "")
    (tmp_path / "opt/varden/tolk/bin/tolkwd-check").unlink()
    assert verify(unit) == (0, "")
    broken = tmp_path / "broken.service"
    broken.write_text(unit.read_text().replace("RestartSec=10", "RestartSec=ten"))
    assert "Failed to parse sec value" in verify(broken)[1]


@on_a_machine
def test_the_checker_works_for_everybody(machine, packed):
    install(machine, packed("DEB"))
    ask = "setpriv --reuid nobody --clear-groups tolkwd-check "
    assert "[unreadable-file]" in machine.run(ask + "/nowhere.xml", expect=2)
    assert machine.run(ask + "--version").startswith("tolkwd-check ")


@on_a_machine
def test_ordinary_users_may_ask_and_nothing_else(machine, packed):
    set_up(machine, packed("DEB"))
    by_nobody = "setpriv --reuid nobody --clear-groups "
    assert "tolkwd is running" in machine.run(by_nobody + "service tolkwd status")
    assert "only root may do this" in machine.run(by_nobody + "service tolkwd stop", expect=4)
    assert "cron" in machine.run(by_nobody + "tolkwd-report status")


@on_a_machine
def test_an_upgrade_without_a_configuration_stops_no_later_one(machine, packed, tmp_path):
    install(machine, packed("DEB"))
    upgrade(machine, packed("DEB"), tmp_path)
    set_up(machine, packed("DEB"))
    watchdog = daemon(machine)
    machine.run("dpkg --install /newer.deb")
    assert daemon(machine) != watchdog
    killed = daemon(machine)
    machine.run(f"kill -KILL {killed}")
    machine.await_success(f"! kill -0 {killed}")
    machine.run("dpkg --install /newer.deb")
    assert "tolkwd is running" in machine.run("service tolkwd status")


@on_a_machine
def test_a_removal_that_may_not_stop_it_leaves_it_its_folder(machine, packed):
    set_up(machine, packed("DEB"))
    watchdog, watched = daemon(machine), cron(machine)
    machine.write("/usr/sbin/policy-rc.d", "#!/bin/sh\nexit 101\n")
    said = machine.run("chmod 755 /usr/sbin/policy-rc.d && dpkg --remove tolkwd")
    assert "it still runs" in said
    assert machine.exists(PINGS + "/agent.cron")
    machine.run(f"kill -0 {watchdog}; : >{LOG}")
    machine.await_line(LOG, "General ping successful!")
    assert cron(machine) == watched


@on_a_machine
def test_it_may_be_installed_behind_a_link(machine, packed):
    machine.run("mkdir -p /data /opt && rmdir /opt && ln -s /data /opt")
    set_up(machine, packed("DEB"))
    assert "tolkwd is running" in machine.run("service tolkwd status")
    machine.run("dpkg --remove tolkwd")
    assert "tolkwd is not running" in machine.run("service tolkwd status", expect=3)
    assert not machine.exists("/data/varden/tolk/bin/agent.cron")


@on_a_machine
@pytest.mark.parametrize("links", ["true", "update-rc.d tolkwd remove"], ids=["links", "no links"])
def test_an_init_script_that_was_removed_stays_so(machine, packed, tmp_path, links):
    set_up(machine, packed("DEB"))
    machine.run(f"service tolkwd stop && rm /etc/init.d/tolkwd && {links}")
    upgrade(machine, packed("DEB"), tmp_path)
    assert not machine.exists("/etc/init.d/tolkwd")
    machine.run("dpkg --remove tolkwd && dpkg --purge tolkwd")


@on_a_machine
def test_purging_leaves_the_agents_files_alone(machine, packed, tmp_path):
    set_up(machine, packed("DEB"))
    machine.copy_in(foreign_package(tmp_path), "/agentx.deb")
    machine.run("dpkg --install /agentx.deb")
    machine.write(PINGS + "/agent.helper", "#!/bin/sh\n")
    machine.run(f"chmod 755 {PINGS}/agent.helper && dpkg --purge tolkwd")
    assert machine.run("dpkg --verify agentx") == ""
    assert machine.exists(PINGS + "/agent.helper")
    assert not machine.exists(PINGS + "/agent.cron")
    assert not machine.exists(CONFIGURATION)


@on_a_machine
def test_purging_is_not_stopped_by_what_operators_do(machine, packed):
    set_up(machine, packed("DEB"))
    machine.run(f"service tolkwd stop && rm {LOG} && mkdir {LOG} && mkdir /data"
                " && mv /etc/opt/varden/tolk /data && ln -s /data/tolk /etc/opt/varden/tolk")
    machine.run("dpkg --purge tolkwd")
    machine.run("dpkg-query --status tolkwd", expect=1)


@on_a_machine
def test_the_rpms_scripts_do_their_work(machine, packed, project):
    """On the files of the Debian package, which are the same."""
    set_up(machine, packed("DEB"))
    for name in ("post", "preun", "postun"):
        machine.copy_in(project / "packaging/rpm" / name, f"/{name}")
    watchdog = daemon(machine)
    machine.run("sh /post 1; sh /preun 1")
    assert daemon(machine) == watchdog
    machine.run("sh /postun 1")
    assert daemon(machine) != watchdog
    assert machine.exists(PINGS + "/agent.cron")
    machine.run("sh /preun 0; sh /postun 0")
    assert "tolkwd is not running" in machine.run("service tolkwd status", expect=3)
    assert not machine.exists(PINGS + "/agent.cron")


@on_a_machine
def test_another_process_with_its_number_is_no_watchdog(machine, packed):
    set_up(machine, packed("DEB"))
    machine.run("service tolkwd stop; sleep 1000 >/dev/null 2>&1 & echo $! >/run/tolkwd.pid")
    assert "tolkwd is not running" in machine.run("service tolkwd status", expect=1)
    # Nor is the init script itself, whose name is the same.
    machine.run("echo $$ >/run/tolkwd.pid; exec /etc/init.d/tolkwd start")
    assert "tolkwd is running" in machine.run("service tolkwd status")


@on_a_machine
@pytest.mark.parametrize("mode", ["755", "4755"], ids=["plain", "set-user-id"])
def test_a_users_process_with_its_number_and_its_name_is_no_watchdog(machine, packed, mode):
    set_up(machine, packed("DEB"))
    machine.run("service tolkwd stop")
    machine.run(f"cp /bin/sleep /usr/local/bin/sleeper && chmod {mode} /usr/local/bin/sleeper")
    posing = machine.run(
        f"setpriv --reuid nobody --clear-groups bash -c 'exec -a {PINGS}/tolkwd"
        " /usr/local/bin/sleeper 1000 >/dev/null 2>&1 & echo $!' | tee /run/tolkwd.pid").strip()
    machine.await_success(f"grep -qF {PINGS}/tolkwd /proc/{posing}/cmdline"
                          f" && ! grep -qF bash /proc/{posing}/comm")

    assert "tolkwd is not running" in machine.run("service tolkwd status", expect=1)
    assert "tolkwd started" in machine.run("service tolkwd start")
    assert daemon(machine) != posing
    machine.run(f"service tolkwd stop; kill -0 {posing}")


@on_a_machine
def test_commands_are_asked_in_english(machine, packed):
    set_up(machine, packed("DEB"))
    machine.run("service tolkwd stop; LC_ALL=C.UTF-8 /etc/init.d/tolkwd start")
    variables = machine.run(f"tr '\\0' '\\n' </proc/{daemon(machine)}/environ").splitlines()
    assert "LC_MESSAGES=C" in variables
    assert [variable for variable in variables if variable.startswith("LC_ALL=")] == []


@on_a_machine
def test_a_restart_without_a_configuration_leaves_it_as_it_is(machine, packed):
    set_up(machine, packed("DEB"))
    watchdog = daemon(machine)
    machine.run(f"rm {CONFIGURATION}")
    for action in ("restart", "force-reload", "try-restart"):
        assert "left as it is" in machine.run(f"service tolkwd {action}", expect=6)
    assert daemon(machine) == watchdog
    assert "tolkwd is running" in machine.run("service tolkwd status")


@on_a_machine
def test_standard_output_goes_where_the_operator_says(machine, packed):
    set_up(machine, packed("DEB"))
    machine.run(f"echo TOLKWD_OUTPUT=/var/log/tolkwd.out >>{DEFAULTS}")
    machine.run(f"service tolkwd stop; rm {LOG}; service tolkwd start")
    machine.await_line(LOG, "General ping successful!")
    machine.run("service tolkwd stop")
    # Lines of different threads may be in another order.
    logged = collections.Counter(machine.read(LOG).splitlines())
    assert logged - collections.Counter(machine.read("/var/log/tolkwd.out").splitlines()) == {}


@on_a_machine
@pytest.mark.parametrize("cause, said", [
    (f"echo TOLKWD_OUTPUT=/nowhere/out >{DEFAULTS}", "/nowhere/out"),
    (f"mkdir {LOG}", "Unable to open the log file"),
])
def test_a_start_that_fails_says_why(machine, packed, cause, said):
    install(machine, packed("DEB"))
    machine.write(CONFIGURATION, WATCH_CRON)
    machine.write("/var/log/tolkwd.err", "of last week\n")
    machine.run(cause)
    answer = machine.run("service tolkwd start", expect=1)
    assert said in answer
    assert "of last week" not in answer
    assert "tolkwd is not running" in machine.run("service tolkwd status", expect=1)
