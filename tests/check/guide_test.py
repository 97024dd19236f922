"""What doc/OPERATING.md tells operators to run: the commands themselves, in a sandbox."""

import pathlib
import subprocess
import sys

import pytest

PROJECT = pathlib.Path(__file__).resolve().parents[2]
sys.path.insert(0, str(PROJECT / "tests" / "support"))

import guide  # noqa: E402 -- needs the path

TIME_LIMIT = 60  # seconds


def play(script, *options):
    """What the script prints in a sandbox, as root."""
    done = subprocess.run(
        [PROJECT / "scripts" / "sandbox.sh", *options, "--", "bash", "-euc", script],
        stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True,
        timeout=TIME_LIMIT)
    assert done.returncode == 0, done.stderr
    return done.stdout


BOUNDS = guide.commands("5. Bounding commands", "/usr/local/sbin/check-smtp")

# Runs a check as the unit does. What the shell says about a signal does not belong to the answer.
CHECK = """
printf '%s 1>/tmp/answer 2>/tmp/answer' "$COMMAND" >/tmp/check
env --ignore-signal=PIPE LC_MESSAGES=C sh /tmp/check 2>/dev/null || true
stat -c %s /tmp/answer
head -n 1 /tmp/answer
"""


def checked(tmp_path, command, program):
    """The size of what the command leaves in the answer's file, and its first line."""
    script = tmp_path / "check-smtp"
    script.write_text(program)
    script.chmod(0o755)
    size, line = play(CHECK, "--ro-bind", tmp_path, "/usr/local/sbin",
                      "--setenv", "COMMAND", command).splitlines()
    return int(size), line


def test_the_guide_shows_both_bounds():
    assert ["prlimit --fsize=" in command for command in BOUNDS] == [True, False]
    assert ["head -c " in command for command in BOUNDS] == [False, True]


@pytest.mark.parametrize("command", BOUNDS)
@pytest.mark.parametrize("stream", [1, 2])
def test_a_bounded_check_does_not_fill_the_disk(tmp_path, command, stream):
    size, _ = checked(tmp_path, command, f"#!/bin/sh\nexec yes >&{stream} 2>&{stream}\n")
    assert 0 < size <= 65536 + 100  # and that a limit was passed


@pytest.mark.parametrize("command", BOUNDS)
def test_a_bounded_check_answers(tmp_path, command):
    assert checked(tmp_path, command, "#!/bin/sh\necho service: ok\n") == (12, "service: ok")


def test_an_answer_before_the_bound_is_kept(tmp_path):
    _, line = checked(tmp_path, BOUNDS[1], "#!/bin/sh\necho service: ok\nexec yes\n")
    assert line == "service: ok"


PERMISSIONS = guide.script("12. Permissions", "find ")

# All that the script looks at, root's.
SOUND = """
mkdir -p /etc/opt/varden/tolk /opt/varden/tolk/bin /opt/site/team/bin /opt/links
touch /etc/opt/varden/tolk/tolkwd.xml /opt/varden/tolk/bin/agent.web /opt/site/team/bin/check
ln -s /opt/site/team/bin/check /opt/links/check
"""


@pytest.mark.parametrize("spoilt, printed", [
    (":", []),
    ("chmod 664 /etc/opt/varden/tolk/tolkwd.xml", ["/etc/opt/varden/tolk/tolkwd.xml"]),
    ("chown 65534 /opt/varden", ["/opt/varden"]),
    ("chmod 1777 /opt/varden/tolk/bin", ["/opt/varden/tolk/bin"]),
    ("chown 65534 /opt/site", ["/opt/site"]),
    ("chmod 757 /opt/site/team", ["/opt/site/team"]),
    ("chown 65534 /opt/links", ["/opt/links"]),
    ("chown 65534 /opt/site /etc/opt", ["/etc/opt", "/opt/site"]),
])
def test_the_permission_test_looks_up_to_the_root(spoilt, printed):
    assert "/usr/local/sbin/check-smtp" in PERMISSIONS
    script = PERMISSIONS.replace("/usr/local/sbin/check-smtp", "/opt/links/check")
    assert play(f"{SOUND}\n{spoilt}\n{script}").splitlines() == printed


def test_the_permission_test_ends_where_a_file_is_missing():
    assert play(SOUND + PERMISSIONS.replace("/usr/local/sbin/", "no/such/") + "true") == ""
