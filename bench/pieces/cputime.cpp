#include "cputime.h"

#include <ctime>

#include <sys/resource.h>

namespace {

constexpr double kNanoseconds = 1e-9;
constexpr double kMicroseconds = 1e-6;

double seconds(const timeval& time)
{
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) * kMicroseconds;
}

} // namespace

cputime cputime::now()
{
    timespec own{};
    clock_gettime(CLOCK_THREAD_CPUTIME_ID, &own);
    rusage children{};
    getrusage(RUSAGE_CHILDREN, &children);
    return {static_cast<double>(own.tv_sec) + static_cast<double>(own.tv_nsec) * kNanoseconds,
            seconds(children.ru_utime) + seconds(children.ru_stime)};
}

cputime cputime::since(const cputime& before) const
{
    return {own - before.own, children - before.children};
}
