#include "machine.h"

#include <algorithm>
#include <set>
#include <string>
#include <string_view>
#include <unordered_map>

#include <unistd.h>

#include "fields.h"
#include "files.h"
#include "passwords.h"
#include "printable.h"
#include "shellwords.h"
#include "wdmonitorthread_linux.h"
#include "wdsettings.h"

namespace check {

namespace {

class machinecheck {
public:
    machinecheck(const std::string& file, findings& collected) : path(file), found(collected) {}

    void run(const daemonview& view)
    {
        checkfolder();
        checkconfiguration();
        for (const targetview& target : view.targets) {
            checkprogram(target.monitored);
            checkservice(target.monitored, true);
            checkcommand(target.monitored, &service::functionalpingcmd);
            checkboth(target.monitored);
            for (const serviceview& dependent : target.dependents) {
                const service& record = *dependent.record;
                checkservice(dependent,
                             record.startcmd == kNoCommand || record.stopcmd == kNoCommand);
                checkboth(dependent);
            }
        }
    }

private:
    void checkboth(const serviceview& view)
    {
        checkcommand(view, &service::startcmd);
        checkcommand(view, &service::stopcmd);
    }

    void checkfolder()
    {
        const std::string folder = folderof(_tmp_file_path);
        if (const filefacts& facts = files.of(folder); facts.found == presence::kMissing) {
            found.add(
                "ping-folder", severity::warning, kNoPlace,
                "there is no folder " + tools::inquotes(_tmp_file_path) +
                    " on this machine: what pings and checks print has nowhere to go, so "
                    "every one fails, and every service is restarted and given up; make it as "
                    "root");
        } else if (facts.found == presence::kThere && !facts.folder) {
            found.add("ping-folder", severity::warning, kNoPlace,
                      tools::inquotes(folder) +
                          " is no folder: what pings and checks print has nowhere "
                          "to go, so every one fails, and every service is "
                          "restarted and given up");
        }
        exposed(folder, kNoPlace, "the folder of what pings and checks print");
    }

    // Who is not root and looks at a file of his own is mostly writing it, not installing it.
    void checkconfiguration()
    {
        if (path == "-") {
            return;
        }
        const std::string what = "the configuration";
        const unsigned self = geteuid();
        if (self != 0 && files.of(path).owner == self) {
            addwritable(files.realpathof(path), kNoPlace, what, severity::note);
        } else {
            exposed(path, kNoPlace, what);
        }
    }

    // The file or folder itself, and all that lies on the way to it.
    void exposed(const std::string& which, std::size_t place, const std::string& what)
    {
        for (const std::string& each : files.writableon(which)) {
            if (told.insert(each).second) {
                const bool itself = each == files.realpathof(which);
                addwritable(each, place,
                            itself ? what
                                   : "on the path of " + tools::inquotes(which) + ", " + what,
                            severity::error);
            }
        }
    }

    void addwritable(const std::string& which, std::size_t place, const std::string& what,
                     severity level)
    {
        found.add("writable-file", level, place,
                  tools::inquotes(which) + ", " + what +
                      ", can be written by others than root, who so can have the daemon run "
                      "anything as root; make root its owner and the only one who may write it");
    }

    void checkprogram(const serviceview& view)
    {
        constexpr field kProgram = &service::binarypath;
        if (!isown(view, kProgram)) {
            return;
        }
        const bool used = looksatthresholds(*view.record);
        const severity level = used ? severity::warning : severity::note;
        const std::string& name = view.record->binarypath;
        const auto add = [&](std::string_view rule, const std::string& message) {
            found.add(rule, level, placeof(view, kProgram),
                      valueof(view, kProgram) + message +
                          (used ? "" : " (here the daemon only writes it to the log)"));
        };
        if (!isplainpath(name)) {
            add("binary-blank", ", which the shell takes apart in \"pidof PATH\", and a blank in a "
                                "process's name shifts its figures: thresholds are compared with "
                                "wrong ones; give the program a plain name");
            return;
        }
        const std::string& program = files.program(name);
        if (program.empty()) {
            add("binary-missing", missingprogram(name));
        } else if (files.isscript(program)) {
            add("binary-script", ", which is a script: its process is its interpreter's, so none "
                                 "is found and the thresholds see nothing; name the program that "
                                 "the script starts");
        }
    }

    std::string missingprogram(const std::string& name)
    {
        const std::size_t slash = name.rfind('/');
        if (slash == std::string::npos) {
            return ", which is not on the daemon's PATH: " + withoutprocess(name);
        }
        const std::string what =
            name.front() != '/' ? ", which is not there seen from the daemon's folder, /: "
            : files.of(name).found == presence::kThere ? ", which is no program: "
                                                       : ", which is not there: ";
        return what + "any process called " + tools::inquotes(name.substr(slash + 1)) +
               " is looked at instead; " + withoutprocess(name);
    }

    static std::string withoutprocess(const std::string& name)
    {
        return "where there is no process, the thresholds see nothing and each check writes an "
               "ERROR line; try " +
               tools::inquotes("pidof " + name) + " while the service runs";
    }

    void checkservice(const serviceview& view, bool asked)
    {
        const std::string& name = view.record->name;
        if (asked && isown(view, &service::name) && isplainname(name) && !files.isservice(name)) {
            found.add("unknown-service", severity::warning, placeof(view, &service::name),
                      "this machine has neither /etc/init.d/" + name + " nor a systemd unit " +
                          name +
                          ".service: the service command does not know it, and it is given up or "
                          "not watched at all");
        }
    }

    void checkcommand(const serviceview& view, field which)
    {
        const std::string& command = view.record->*which;
        if (!isown(view, which) || command == kNoCommand || isnullspelling(command)) {
            return;
        }
        checkpassword(view, which);
        const auto known = commands.find(command);
        const shelltext& split = known != commands.end()
                                     ? known->second
                                     : commands.emplace(command, splitshell(command)).first->second;
        if (!split.sure) {
            return;
        }
        for (const program& each : split.programs) {
            checkcommandfile(view, which, each, split.needed);
        }
    }

    // It has no place in the file, for the line of the file that is shown would show the password.
    void checkpassword(const serviceview& view, field which)
    {
        const std::string_view form = passwordform(view.record->*which);
        if (form.empty() || path == "-" || !files.isreadable(path)) {
            return;
        }
        found.add(
            "password-readable", severity::note, kNoPlace,
            fieldof(view, which) + " seems to carry a password (" + std::string(form) +
                "), and others than root can read " + tools::inquotes(path) +
                ": let only root read it (chmod 600), or have the command read the password from "
                "a file of root's");
    }

    void checkcommandfile(const serviceview& view, field which, const program& named, bool needed)
    {
        if (named.name.find('/') != std::string::npos && named.name.front() != '/') {
            return; // where it is, `cd` may have decided
        }
        const std::string& file = named.argument ? named.name : files.program(named.name);
        if (file.empty() || (named.argument && files.of(file).found == presence::kMissing)) {
            if (needed) {
                missing(view, which, named);
            }
            return;
        }
        exposed(file, placeof(view, which), "which " + fieldof(view, which) + " runs");
    }

    void missing(const serviceview& view, field which, const program& named)
    {
        const bool check = which == &service::functionalpingcmd;
        const std::string consequence =
            !check ? "nothing is run, and a recovery goes on as if it had been"
            : named.started
                ? "the check is reported as missing and its service goes unchecked, or is "
                  "restarted where that message does not come first"
                : "Debian's shell says \"not found\", which is a failed check, so the service is "
                  "restarted and given up";
        found.add("command-missing", check ? severity::error : severity::warning,
                  placeof(view, which),
                  fieldof(view, which) + " runs " + tools::inquotes(named.name) +
                      ", which is no program of this machine: " + consequence +
                      "; correct the name, or install the program");
    }

    const std::string& path;
    findings& found;
    machinefiles files;
    std::unordered_map<std::string, shelltext> commands;
    std::set<std::string> told; // paths that are writable, found once
};

} // namespace

void checkmachine(const std::string& path, const daemonview& view, findings& found)
{
    machinecheck(path, found).run(view);
}

} // namespace check
