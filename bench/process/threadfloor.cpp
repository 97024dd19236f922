// threadfloor THREADS SECONDS: nothing but threads, each of which runs a status command through the
// shell and pauses, for ever. What this is large is what a thread for each target costs at least.

#include <cstdio>
#include <cstdlib>
#include <string>
#include <thread>
#include <vector>

#include <unistd.h>

namespace {

[[noreturn]] void askforever(long number, unsigned pause)
{
    const std::string name = "s" + std::to_string(number);
    const std::string file = "/opt/varden/tolk/bin/agent." + name;
    const std::string command = "service " + name + " status 1>" + file + " 2>" + file;
    for (;;) {
        if (std::system(command.c_str()) != 0) {
            dprintf(STDERR_FILENO, "failed: %s\n", command.c_str());
            std::_Exit(EXIT_FAILURE);
        }
        sleep(pause);
    }
}

} // namespace

int main(int argc, char** argv)
{
    if (argc != 3) {
        dprintf(STDERR_FILENO, "usage: threadfloor THREADS SECONDS\n");
        return 2;
    }
    const long count = std::strtol(argv[1], nullptr, 10);
    const auto seconds = static_cast<unsigned>(std::strtoul(argv[2], nullptr, 10));
    std::vector<std::thread> threads;
    for (long number = 1; number <= count; ++number) {
        threads.emplace_back(askforever, number, seconds);
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
}
