// Keeps what changes from run to run from changing the number of instructions: the functions that
// the linker calls in their place.
#include "steady.h"

#include <cstdarg>
#include <cstdio>
#include <ctime>
#include <string>

#include <fcntl.h>
#include <unistd.h>

namespace {

constexpr pid_t kOwnProcess = 4100;

std::time_t now = 1'000'000'000;
int opened = 0;

// The path to open in place of `path`.
const char* steadied(const char* path)
{
    static const std::string watched = std::string("/proc/") + kWatchedProcess + "/stat";
    if (path != watched) {
        return path;
    }
    ++opened;
    return kFigures;
}

} // namespace

void passseconds(int seconds)
{
    now += seconds;
}

int figuresopened()
{
    return opened;
}

extern "C" {

std::FILE* __real_fopen(const char* path, const char* mode);
int __real_open(const char* path, int flags, ...);

int __wrap_clock_gettime(clockid_t /*clock*/, timespec* result)
{
    *result = {now, 0};
    return 0;
}

std::FILE* __wrap_fopen(const char* path, const char* mode)
{
    return __real_fopen(steadied(path), mode);
}

pid_t __wrap_getpid()
{
    return kOwnProcess;
}

int __wrap_open(const char* path, int flags, ...)
{
    va_list rest;
    va_start(rest, flags);
    const mode_t mode = (flags & O_CREAT) != 0 ? va_arg(rest, mode_t) : 0;
    va_end(rest);
    return __real_open(steadied(path), flags, mode);
}

std::time_t __wrap_time(std::time_t* result)
{
    if (result != nullptr) {
        *result = now;
    }
    return now;
}
}
