#include "owners.h"

#include <algorithm>
#include <fstream>
#include <optional>

#include <pwd.h>

#include "printable.h"

namespace check {

namespace {

struct processowner {
    int parent = 0;
    uid_t user = 0; // the real one: a program that is set-user-id has another effective one
};

// Nothing for a process that has ended.
std::optional<processowner> ownerof(int process)
{
    std::ifstream status("/proc/" + std::to_string(process) + "/status");
    processowner owner;
    for (std::string line; std::getline(status, line);) {
        if (line.starts_with("PPid:")) {
            owner.parent = std::stoi(line.substr(line.find(':') + 1));
        } else if (line.starts_with("Uid:")) {
            owner.user = static_cast<uid_t>(std::stoul(line.substr(line.find(':') + 1)));
            return owner; // it stands behind the parent
        }
    }
    return std::nullopt;
}

} // namespace

std::string username(uid_t user)
{
    const passwd* const entry = getpwuid(user);
    return entry != nullptr ? tools::printable(entry->pw_name) : "user " + std::to_string(user);
}

std::vector<uid_t> startersof(const std::vector<int>& processes)
{
    std::vector<uid_t> users;
    for (const int process : processes) {
        const auto owner = ownerof(process);
        if (owner &&
            std::find(processes.begin(), processes.end(), owner->parent) == processes.end() &&
            std::find(users.begin(), users.end(), owner->user) == users.end()) {
            users.push_back(owner->user);
        }
    }
    return users;
}

} // namespace check
