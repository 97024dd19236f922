#include "fuzz.h"

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <ctime>

#include <fcntl.h>
#include <unistd.h>

#include "wdLocalLog_linux.h"

namespace {

// Under the sanitizers the slowest honest units take 0.2 microseconds a byte, and up to 10 ms go to
// whatever else the machine does at the time. Some ten and five times that is allowed.
constexpr double kSecondsForAStart = 0.05;
constexpr double kSecondsPerByte = 2e-6;

// A unit is too slow when it is so every time: one measurement may have met a busy machine.
constexpr int kMeasurements = 3;

double threadseconds()
{
    timespec now{};
    clock_gettime(CLOCK_THREAD_CPUTIME_ID, &now);
    constexpr double kNanosecond = 1e-9;
    return static_cast<double>(now.tv_sec) + static_cast<double>(now.tv_nsec) * kNanosecond;
}

bool quickenough(const std::string& unit)
{
    Stopwatch watch;
    const std::size_t bytes = tryunit(unit, watch);
    const double allowed = kSecondsForAStart + kSecondsPerByte * static_cast<double>(bytes);
    if (watch.seconds() <= allowed) {
        return true;
    }
    std::fprintf(stderr, "%zu bytes took %.3f s, more than %.3f s\n", bytes, watch.seconds(),
                 allowed);
    return false;
}

} // namespace

void demand(bool holds, const char* what)
{
    if (!holds) {
        std::fprintf(stderr, "does not hold: %s\n", what);
        std::abort();
    }
}

Stopwatch::Lap::Lap(Stopwatch& stopwatch) : watch(stopwatch), start(threadseconds()) {}

Stopwatch::Lap::~Lap()
{
    watch.sum += threadseconds() - start;
}

std::vector<std::string> cut(const std::string& text, char separator)
{
    std::vector<std::string> pieces(1);
    for (const char c : text) {
        if (c == separator) {
            pieces.emplace_back();
        } else {
            pieces.back() += c;
        }
    }
    return pieces;
}

// The log's lines go to standard output, too: the fuzzer itself writes to standard error.
extern "C" int LLVMFuzzerInitialize(int* /*argc*/, char*** /*argv*/)
{
    const int null = open("/dev/null", O_WRONLY | O_CLOEXEC);
    demand(null >= 0 && dup2(null, STDOUT_FILENO) == STDOUT_FILENO, "standard output is quiet");
    close(null);
    wdLocalLog::logFilePath = "/dev/null";
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    const std::string unit(reinterpret_cast<const char*>(data), size);
    int measurement = 1;
    while (!quickenough(unit)) {
        demand(++measurement <= kMeasurements, "the time is bounded by the bytes");
    }
    return 0;
}
