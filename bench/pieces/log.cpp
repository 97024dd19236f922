// One log line against a bare loop of the system calls that it cannot do without, and a suppressed
// one against opening and closing; by one thread and by many at once.
#include <benchmark/benchmark.h>

#include <fstream>
#include <string>
#include <string_view>

#include <fcntl.h>
#include <unistd.h>

#include "surroundings.h"
#include "wdLocalLog_linux.h"
#include "wdlogbuffer.h"

namespace {

constexpr off_t kLimitBytes = 1023999;
constexpr mode_t kMode = 0666;
constexpr std::size_t kDateCharacters = 24;
constexpr const char* kModule = "wdmonitorthread";
constexpr std::string_view kMessage = "(/usr/sbin/servicename) Executing functional ping now ... ";

int openlimited(const char* path)
{
    const int fd = open(path, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, kMode);
    if (lseek(fd, 0, SEEK_END) > kLimitBytes) {
        benchmark::DoNotOptimize(ftruncate(fd, 0));
    }
    return fd;
}

// Whether every line of the file is one that a thread has written, whole.
bool wholelines(const char* path)
{
    const std::string start = std::string(" INFO ") + kModule + "|TID";
    std::ifstream file(path);
    std::size_t count = 0;
    for (std::string line; std::getline(file, line); ++count) {
        const std::size_t digits = kDateCharacters + start.size();
        const std::size_t end = line.find_first_not_of("0123456789", digits);
        if (line.compare(kDateCharacters, start.size(), start) != 0 || end == std::string::npos ||
            line.substr(end) != " " + std::string(kMessage)) {
            return false;
        }
    }
    return count > 0;
}

void logline(benchmark::State& state, const char* path)
{
    if (state.thread_index() == 0) {
        unlink(path);
        prepare(path);
    }
    const std::string binarypath = "/usr/sbin/servicename";
    for ([[maybe_unused]] auto _ : state) {
        wdlog(kModule, kLevelInfo, "(", binarypath, ") Executing functional ping now ... ");
    }
    if (state.thread_index() == 0 && !wholelines(path)) {
        state.SkipWithError("a line is torn or missing");
    }
}

void bareline(benchmark::State& state, const char* path)
{
    if (state.thread_index() == 0) {
        unlink(path);
    }
    const std::string line = "Mon Nov 16 03:19:16 2026 INFO " + std::string(kModule) + "|TID" +
                             std::to_string(pthread_self()) + " " + std::string(kMessage) + "\n";
    for ([[maybe_unused]] auto _ : state) {
        const int fd = openlimited(path);
        benchmark::DoNotOptimize(write(STDOUT_FILENO, line.data(), line.size()));
        benchmark::DoNotOptimize(write(fd, line.data(), line.size()));
        close(fd);
    }
}

// A line with a number, as the results of pings are.
void numberline(benchmark::State& state, const char* path)
{
    prepare(path);
    int number = 0;
    for ([[maybe_unused]] auto _ : state) {
        wdlog(kModule, kLevelInfo, "(/usr/sbin/servicename) Skipping functional ping. ", ++number,
              " FPs skipped so far.");
    }
}

void suppressedline(benchmark::State& state, const char* path)
{
    prepare(path);
    int number = 0;
    for ([[maybe_unused]] auto _ : state) {
        wdlog(kModule, kLevelDebug, "General ping sleep ", ++number);
    }
}

void bareopening(benchmark::State& state, const char* path)
{
    for ([[maybe_unused]] auto _ : state) {
        close(openlimited(path));
    }
}

} // namespace

void registerlog(bool brief)
{
    for (const auto& [place, path] : {std::pair{"disk", "log"}, std::pair{"shm", "shm/log"}}) {
        const auto add = [where = std::string("/") + place, path = path](const char* name,
                                                                         auto function) {
            return benchmark::RegisterBenchmark((name + where).c_str(), function, path);
        };
        add("line/tolkwd", logline);
        add("line/bare", bareline);
        add("line/number", numberline);
        add("suppressed/tolkwd", suppressedline);
        add("suppressed/bare", bareopening);
        for (const int threads : {1, 2, 8, 200}) {
            if (!brief || threads == 2) {
                add("together/tolkwd", logline)->Threads(threads)->UseRealTime();
                add("together/bare", bareline)->Threads(threads)->UseRealTime();
            }
        }
    }
}
