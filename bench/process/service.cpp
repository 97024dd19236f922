// Stands for the system's `service` command in the benchmarks: service NAME status|start|stop.
// A service is stopped while the file /opt/bench/state/NAME.stopped exists; so anybody can let one
// die. Each call is recorded. As cheap as a process can be (no C++ library, linked statically), so
// that what is measured is what the caller spends.

#include <climits>
#include <cstdio>
#include <cstring>

#include <fcntl.h>
#include <unistd.h>

#include "record.h"

namespace {

constexpr int kRunning = 0;
constexpr int kStopped = 3; // as init scripts say it
constexpr int kWrongUse = 2;

int status(const char* name, const char* statefile)
{
    const bool running = access(statefile, F_OK) != 0;
    const char* const answer = running ? "running" : "stopped";
    if (!record(name, "status", answer)) {
        return kWrongUse;
    }
    dprintf(STDOUT_FILENO, "%s is %s\n", name, answer);
    return running ? kRunning : kStopped;
}

int start(const char* name, const char* statefile)
{
    unlink(statefile); // nothing to do where it runs
    return record(name, "start", "-") ? 0 : kWrongUse;
}

int stop(const char* name, const char* statefile)
{
    const int file = open(statefile, O_WRONLY | O_CREAT | O_CLOEXEC, S_IRUSR | S_IWUSR);
    if (file < 0) {
        return kWrongUse;
    }
    close(file);
    return record(name, "stop", "-") ? 0 : kWrongUse;
}

} // namespace

int main(int argc, char** argv)
{
    if (argc != 3) {
        return kWrongUse;
    }
    const char* const name = argv[1];
    const char* const verb = argv[2];
    char statefile[PATH_MAX];
    const int length =
        std::snprintf(statefile, sizeof statefile, "/opt/bench/state/%s.stopped", name);
    if (length < 0 || static_cast<std::size_t>(length) >= sizeof statefile) {
        return kWrongUse;
    }
    if (std::strcmp(verb, "status") == 0) {
        return status(name, statefile);
    }
    if (std::strcmp(verb, "start") == 0) {
        return start(name, statefile);
    }
    return std::strcmp(verb, "stop") == 0 ? stop(name, statefile) : kWrongUse;
}
