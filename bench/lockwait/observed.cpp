// Looks on at the lock and the pauses: the functions that the linker calls in their place.
#include "observed.h"

#include <atomic>

#include <pthread.h>

namespace {

thread_local WriteRequest writerequest;
thread_local bool reading = false;
thread_local Clock::time_point readingsince;

std::atomic<long> readcount = 0;
std::atomic<Clock::rep> readtotal = 0;

} // namespace

WriteRequest lastwriterequest()
{
    return writerequest;
}

Reads takereads()
{
    return {readcount.exchange(0), Clock::duration(readtotal.exchange(0))};
}

Pauses& Pauses::current()
{
    static Pauses pauses;
    return pauses;
}

bool Pauses::pause(Clock::duration length)
{
    std::unique_lock lock(guard);
    return !change.wait_for(lock, length, [this] { return ended; });
}

void Pauses::end()
{
    const std::scoped_lock lock(guard);
    ended = true;
    change.notify_all();
}

void Pauses::begin()
{
    const std::scoped_lock lock(guard);
    ended = false;
}

extern "C" {

int __real_pthread_rwlock_rdlock(pthread_rwlock_t* lock);
int __real_pthread_rwlock_unlock(pthread_rwlock_t* lock);
int __real_pthread_rwlock_wrlock(pthread_rwlock_t* lock);

int __wrap_pthread_rwlock_rdlock(pthread_rwlock_t* lock)
{
    const int result = __real_pthread_rwlock_rdlock(lock);
    if (result == 0) {
        reading = true;
        readingsince = Clock::now();
    }
    return result;
}

int __wrap_pthread_rwlock_unlock(pthread_rwlock_t* lock)
{
    if (reading) {
        reading = false;
        readtotal += (Clock::now() - readingsince).count();
        ++readcount;
    }
    return __real_pthread_rwlock_unlock(lock);
}

int __wrap_pthread_rwlock_wrlock(pthread_rwlock_t* lock)
{
    writerequest.entered = Clock::now();
    const int result = __real_pthread_rwlock_wrlock(lock);
    writerequest.held = Clock::now();
    return result;
}

unsigned __wrap_sleep(unsigned seconds)
{
    Pauses::current().pause(std::chrono::seconds(seconds));
    return 0;
}
}
