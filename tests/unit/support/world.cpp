#include "world.h"

#include <algorithm>
#include <cerrno>
#include <cstdarg>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <memory>
#include <sstream>

#include <fcntl.h>
#include <poll.h>

#include "wdLocalLog_linux.h"

namespace {

constexpr std::size_t kDateCharacters = 24;
constexpr pthread_t kFirstPretendedThread = 71;

const pthread_t testthread = pthread_self();

std::map<pthread_t, std::pair<void* (*)(void*), void*>> pretendedthreads;

// "DATE LEVEL module|TID123 text" as "LEVEL text", or "LEVEL [module] text" for another module.
std::string eventof(const std::string& line, const std::string& homemodule)
{
    const std::size_t levelstart = kDateCharacters + 1;
    const std::size_t modulestart = line.find(' ', levelstart) + 1;
    const std::size_t moduleend = line.find("|TID", modulestart);
    if (moduleend == std::string::npos) {
        return line; // a later line of one message
    }
    const std::size_t textstart = line.find(' ', moduleend + 4);
    const std::string module = line.substr(modulestart, moduleend - modulestart);
    const std::string origin = module == homemodule ? "" : " [" + module + "]";
    return line.substr(levelstart, modulestart - 1 - levelstart) + origin + line.substr(textstart);
}

void replaceall(std::string& text, const std::string& from, const std::string& to)
{
    for (std::size_t at = text.find(from); at != std::string::npos; at = text.find(from, at)) {
        text.replace(at, from.size(), to);
        at += to.size();
    }
}

struct OutputReader {
    Output output;
    std::size_t next = 0;
};

ssize_t readoutput(void* cookie, char* buffer, std::size_t size)
{
    auto& reader = *static_cast<OutputReader*>(cookie);
    if (reader.next == reader.output.size()) {
        return 0;
    }
    const auto& piece = reader.output[reader.next++];
    if (const int* failure = std::get_if<int>(&piece)) {
        errno = *failure;
        return -1;
    }
    const auto& text = std::get<std::string>(piece);
    const std::size_t count = std::min(size, text.size());
    std::copy_n(text.data(), count, buffer);
    return static_cast<ssize_t>(count);
}

int closeoutput(void* cookie)
{
    delete static_cast<OutputReader*>(cookie);
    return 0;
}

} // namespace

World& World::current()
{
    static World world;
    return world;
}

void World::reset(const std::string& folder, const std::string& module)
{
    onsleep = [](unsigned) {
    };
    onsystem = [](const std::string&) {
        return 0;
    };
    onthread = [](const std::string&) {
    };
    onpopen = [](const std::string&) {
        return Output{};
    };
    realpopen = false;
    now = 1'000'000'000;
    existing.clear();
    files.clear();
    onrealproc = nullptr;
    onexit = [] {
    };
    recordpolls = false;
    readerneverreads = false;
    recordopens = false;
    lockinitresult = 0;
    writelockfails = false;
    threadsfail = false;
    threadsarereal = true;
    recordthreads = false;
    tmp = folder;
    homemodule = module;
    logread = 0;
    happened.clear();
    pretendedthreads.clear();
}

void World::readlog()
{
    std::ifstream log(wdLocalLog::logFilePath);
    log.seekg(static_cast<std::streamoff>(logread));
    for (std::string line; std::getline(log, line) && !log.eof();) {
        logread += line.size() + 1; // a line that another thread is still writing waits
        std::string event = eventof(line, homemodule);
        replaceall(event, tmp, "TMP/");
        happened.push_back(event);
    }
}

void World::record(const std::string& event)
{
    const std::scoped_lock lock(guard);
    readlog();
    happened.push_back(event);
    replaceall(happened.back(), tmp, "TMP/");
}

std::string World::events()
{
    const std::scoped_lock lock(guard);
    readlog();
    return lines(happened);
}

int exited(int status)
{
    return status << 8;
}

std::string lines(const std::vector<std::string>& events)
{
    std::string text;
    for (const auto& event : events) {
        text += event + "\n";
    }
    return text;
}

// The replaced functions, under the names that the linker gives them.
extern "C" {

std::FILE* __real_fopen(const char* path, const char* mode);
int __real_pclose(std::FILE* stream);
std::FILE* __real_popen(const char* command, const char* mode);
int __real_system(const char* command);
int __real_open(const char* path, int flags, ...);
int __real_poll(pollfd* streams, nfds_t count, int timeout);
int __real_pthread_create(pthread_t* id, const pthread_attr_t* attributes, void* (*body)(void*),
                          void* argument);
[[noreturn]] void __real__exit(int status);
[[noreturn]] void __real_pthread_exit(void* value);
int __real_pthread_join(pthread_t id, void** value);
int __real_pthread_rwlock_destroy(pthread_rwlock_t* lock);
int __real_pthread_rwlock_init(pthread_rwlock_t* lock, const pthread_rwlockattr_t* attributes);
int __real_pthread_rwlock_rdlock(pthread_rwlock_t* lock);
int __real_pthread_rwlock_unlock(pthread_rwlock_t* lock);
int __real_pthread_rwlock_wrlock(pthread_rwlock_t* lock);

[[noreturn]] void __wrap__exit(int status)
{
    World::current().onexit();
    __real__exit(status);
}

int __wrap_access(const char* path, int /*mode*/)
{
    auto& world = World::current();
    world.record(std::string("look for ") + path);
    return world.existing.contains(path) ? 0 : -1;
}

std::FILE* __wrap_fopen(const char* path, const char* mode)
{
    if (std::strncmp(path, "/proc/", 6) != 0) {
        return __real_fopen(path, mode);
    }
    const auto& world = World::current();
    if (world.onrealproc) {
        std::FILE* real = __real_fopen(path, mode);
        world.onrealproc();
        return real;
    }
    const auto found = world.files.find(path);
    if (found == world.files.end()) {
        errno = ENOENT;
        return nullptr;
    }
    std::FILE* file = std::tmpfile();
    std::fwrite(found->second.data(), 1, found->second.size(), file);
    std::rewind(file);
    return file;
}

int __wrap_open(const char* path, int flags, ...)
{
    va_list rest;
    va_start(rest, flags);
    const mode_t mode = (flags & O_CREAT) != 0 ? va_arg(rest, mode_t) : 0;
    va_end(rest);
    auto& world = World::current();
    if (world.recordopens) {
        const auto flag = [flags](int bit, const char* name) {
            return (flags & bit) == bit ? std::string(" ") + name : std::string();
        };
        world.record(std::string("open ") + path + flag(O_WRONLY, "for writing") +
                     flag(O_APPEND, "append") + flag(O_TRUNC, "truncate") +
                     flag(O_CLOEXEC, "cloexec") + " mode " + std::to_string(mode));
    }
    return __real_open(path, flags, mode);
}

int __wrap_poll(pollfd* streams, nfds_t count, int timeout)
{
    auto& world = World::current();
    if (world.recordpolls) {
        world.record("wait " + std::to_string(timeout) + " ms");
    }
    const bool waits = timeout != 0 && !world.readerneverreads;
    return __real_poll(streams, count, waits ? -1 : 0);
}

std::FILE* __wrap_popen(const char* command, const char* mode)
{
    auto& world = World::current();
    world.record(std::string("popen ") + mode + " " + command);
    if (world.realpopen) {
        return __real_popen(command, mode);
    }
    auto output = world.onpopen(command);
    if (!output) {
        return nullptr;
    }
    auto reader = std::make_unique<OutputReader>(OutputReader{std::move(*output)});
    return fopencookie(reader.release(), "r", {readoutput, nullptr, nullptr, closeoutput});
}

int __wrap_pclose(std::FILE* stream)
{
    auto& world = World::current();
    world.record("pclose");
    return world.realpopen ? __real_pclose(stream) : std::fclose(stream);
}

int __wrap_pthread_create(pthread_t* id, const pthread_attr_t* attributes, void* (*body)(void*),
                          void* argument)
{
    auto& world = World::current();
    world.onthread("create thread");
    if (world.recordthreads) {
        world.record("create thread");
    }
    if (world.threadsfail) {
        *id = static_cast<pthread_t>(0xdeadbeef);
        return EAGAIN;
    }
    if (world.threadsarereal) {
        return __real_pthread_create(id, attributes, body, argument);
    }
    *id = kFirstPretendedThread + pretendedthreads.size();
    pretendedthreads[*id] = {body, argument};
    return 0;
}

int __wrap_pthread_join(pthread_t id, void** value)
{
    auto& world = World::current();
    world.onthread("join thread");
    if (world.recordthreads) {
        world.record("join thread");
    }
    if (world.threadsarereal) {
        return __real_pthread_join(id, value);
    }
    const auto found = pretendedthreads.find(id);
    if (found == pretendedthreads.end()) {
        return ESRCH;
    }
    found->second.first(found->second.second);
    pretendedthreads.erase(found);
    return 0;
}

[[noreturn]] void __wrap_pthread_exit(void* value)
{
    if (pthread_equal(pthread_self(), testthread) != 0) {
        throw ThreadExit{value};
    }
    __real_pthread_exit(value);
}

int __wrap_pthread_rwlock_init(pthread_rwlock_t* lock, const pthread_rwlockattr_t* attributes)
{
    auto& world = World::current();
    if (world.recordthreads) {
        world.record(attributes == nullptr ? "make lock" : "make lock with attributes");
    }
    if (world.lockinitresult != 0) {
        return world.lockinitresult;
    }
    return __real_pthread_rwlock_init(lock, attributes);
}

int __wrap_pthread_rwlock_destroy(pthread_rwlock_t* lock)
{
    auto& world = World::current();
    if (world.recordthreads) {
        world.record("destroy lock");
    }
    return __real_pthread_rwlock_destroy(lock);
}

int __wrap_pthread_rwlock_rdlock(pthread_rwlock_t* lock)
{
    auto& world = World::current();
    if (world.recordthreads) {
        world.record("take lock for reading");
    }
    return __real_pthread_rwlock_rdlock(lock);
}

int __wrap_pthread_rwlock_unlock(pthread_rwlock_t* lock)
{
    auto& world = World::current();
    const int result = __real_pthread_rwlock_unlock(lock);
    if (world.recordthreads && pthread_rwlock_trywrlock(lock) == 0) {
        world.record("release lock");
        __real_pthread_rwlock_unlock(lock);
    }
    return result;
}

int __wrap_pthread_rwlock_wrlock(pthread_rwlock_t* lock)
{
    auto& world = World::current();
    if (world.recordthreads) {
        world.record("take lock for writing");
    }
    if (world.writelockfails) {
        __real_pthread_rwlock_rdlock(lock);
        return EINVAL;
    }
    return __real_pthread_rwlock_wrlock(lock);
}

unsigned __wrap_sleep(unsigned seconds)
{
    auto& world = World::current();
    world.record("sleep " + std::to_string(seconds));
    world.now += seconds;
    world.onsleep(seconds);
    return 0;
}

int __wrap_system(const char* command)
{
    auto& world = World::current();
    world.record(std::string("run ") + command);
    return world.onsystem(command);
}

std::time_t __wrap_time(std::time_t* result)
{
    const std::time_t now = World::current().now;
    if (result != nullptr) {
        *result = now;
    }
    return now;
}
}

int runforreal(const std::string& command)
{
    return __real_system(command.c_str());
}
