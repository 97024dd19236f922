// One ping against a bare loop that runs the same command and reads the line that it printed; and
// one check of thresholds against running pidof and reading the process's figures. The time is the
// processor's, that of the commands included; "own" is the part without them.
#include <benchmark/benchmark.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>

#include <fcntl.h>
#include <unistd.h>

#include "ProcessStatistics_Linux.h"
#include "cputime.h"
#include "surroundings.h"
#include "wdmonitorthread_linux.h"
#include "wdsettings.h"

namespace {

constexpr const char* kCheck = "echo CreationClassName";

wdmonitorthread monitor()
{
    wdmonitortarget target;
    target.monitoredservice.name = "web";
    target.monitoredservice.functionalpingcmd = kCheck;
    return wdmonitorthread(target);
}

service web()
{
    service svc;
    svc.name = "web";
    return svc;
}

// Calls `work` over and over and reports its processor time.
template <typename Work>
void measure(benchmark::State& state, const Work& work)
{
    prepare("log");
    pthread_rwlock_init(&pingreclock, nullptr);
    double own = 0;
    for ([[maybe_unused]] auto _ : state) {
        const cputime before = cputime::now();
        const bool worked = work();
        const cputime spent = cputime::now().since(before);
        state.SetIterationTime(spent.own + spent.children);
        own += spent.own;
        if (!worked) {
            state.SkipWithError("it did not work");
            break;
        }
    }
    state.counters["own"] = benchmark::Counter(own, benchmark::Counter::kAvgIterations);
    pthread_rwlock_destroy(&pingreclock);
}

void generalping(benchmark::State& state)
{
    wdmonitorthread thread = monitor();
    const service svc = web();
    measure(state, [&] { return thread.generalping(svc) == kServiceRunning; });
}

void functionalping(benchmark::State& state)
{
    wdmonitorthread thread = monitor();
    measure(state, [&] { return thread.functionalping() == kAnswerCorrect; });
}

// The least that a ping can do.
bool runandread(const std::string& command, const char* output)
{
    constexpr std::size_t kLineBytes = 256;
    std::array<char, kLineBytes> line{};
    benchmark::DoNotOptimize(std::system(command.c_str()));
    const int fd = open(output, O_RDONLY | O_CLOEXEC);
    const ssize_t got = read(fd, line.data(), line.size());
    close(fd);
    return got > 0;
}

void baregeneral(benchmark::State& state)
{
    const std::string command = "service web status 1>./agent.web 2>./agent.web";
    measure(state, [&] { return runandread(command, "./agent.web"); });
}

void barefunctional(benchmark::State& state)
{
    const std::string command =
        std::string(kCheck) + " 1>./agent.functionalping.web 2>./agent.functionalping.web";
    measure(state, [&] { return runandread(command, "./agent.functionalping.web"); });
}

std::string thisprogram()
{
    return std::filesystem::read_symlink("/proc/self/exe").string();
}

void thresholdcheck(benchmark::State& state)
{
    ProcessStatistics statistics(thisprogram());
    statistics.SetThresholdAverageCPUUsage("1000000");
    statistics.SetThresholdThreadCount("1000000");
    statistics.SetThresholdMemoryUsage("100000000");
    measure(state, [&] { return !statistics.IsThresholdReached(); });
}

void barecheck(benchmark::State& state)
{
    constexpr std::size_t kStatBytes = 1024;
    const std::string command = "pidof " + thisprogram();
    const std::string statfile = "/proc/" + std::to_string(getpid()) + "/stat";
    measure(state, [&] {
        std::array<char, kStatBytes> text{};
        std::FILE* pipe = popen(command.c_str(), "re");
        const bool found = std::fgets(text.data(), static_cast<int>(text.size()), pipe) != nullptr;
        pclose(pipe);
        const int fd = open(statfile.c_str(), O_RDONLY | O_CLOEXEC);
        const ssize_t got = read(fd, text.data(), text.size());
        close(fd);
        return found && got > 0;
    });
}

} // namespace

void registerping(bool /*brief*/)
{
    const auto add = [](const char* name, void (*function)(benchmark::State&)) {
        benchmark::RegisterBenchmark(name, function)
            ->UseManualTime()
            ->Unit(benchmark::kMicrosecond);
    };
    add("generalping/tolkwd", generalping);
    add("generalping/bare", baregeneral);
    add("functionalping/tolkwd", functionalping);
    add("functionalping/bare", barefunctional);
    add("check/tolkwd", thresholdcheck);
    add("check/bare", barecheck);
}
