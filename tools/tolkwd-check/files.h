// Facts about this machine's files, each looked up once. Nothing is opened but to tell a script.
#pragma once

#include <cstddef>
#include <map>
#include <set>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

namespace check {

// Where the daemon's unit and its init script look for programs.
inline constexpr std::string_view kDaemonPath =
    "/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin";

// What is there, as far as it may be seen: behind a closed folder all is kHidden.
enum class presence { kMissing, kThere, kHidden };

struct filefacts {
    presence found = presence::kMissing; // symbolic links followed
    bool folder = false;
    bool executable = false; // a file that root can execute
    bool readable = false;   // by others than root; of a folder: they may reach what is in it
    unsigned owner = 0;      // user id
};

// Remembers what it has seen: for one look at a machine, not for long. One thread's; no lock.
class machinefiles {
public:
    // Of the file or folder `path`.
    const filefacts& of(const std::string& path);

    // The path of the program that the shell runs for `name`: `name` itself if it holds a slash.
    // Empty: there is none. Relative paths are the daemon's, whose folder is "/".
    const std::string& program(const std::string& name);

    // Whether the file begins as a script does; false where it cannot be read.
    bool isscript(const std::string& path);

    // Its path without symbolic links, or `path` where that cannot be told.
    const std::string& realpathof(const std::string& path);

    // What others than root may write of all that lies on the way from "/" to `path`, itself
    // included: folders, files, links and what these lead to. A folder with the sticky bit is none
    // of it unless it is the end of the way: others may add to it, but not replace what is root's.
    const std::vector<std::string>& writableon(const std::string& path);

    // Whether others than root and its owner may read the file, through the folders above it.
    bool isreadable(const std::string& path);

    // Whether the service command may know the name: an init script or a systemd unit is there, or
    // a folder that may hold one cannot be read.
    bool isservice(const std::string& name);

private:
    void listservices();
    void listfolder(const std::string& folder, bool units);

    std::unordered_map<std::string, filefacts> files;
    std::unordered_map<std::string, std::string> programs;
    std::unordered_map<std::string, bool> scripts;
    std::unordered_map<std::string, std::string> realpaths;
    std::unordered_map<std::string, std::vector<std::string>> writables;
    std::set<std::string, std::less<>> services; // init scripts by name, units without ".service"
    bool listed = false;
    bool hidden = false;
};

// The folder that `path` stands in; of one without a slash ".". Any thread.
std::string folderof(const std::string& path);

} // namespace check
