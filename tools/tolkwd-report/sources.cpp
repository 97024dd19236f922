#include "sources.h"

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <optional>
#include <string_view>
#include <system_error>
#include <utility>

#include <fcntl.h>
#include <poll.h>
#include <sys/stat.h>
#include <unistd.h>

#include "descriptor.h"

namespace report {

namespace {

constexpr std::size_t kBlockBytes = std::size_t{256} * 1024; // stays in the processor's cache
constexpr std::size_t kGlimpseBytes = 256; // holds a line or two, with their times
constexpr int kLookPauseMilliseconds = 200;

[[noreturn]] void refuse(int reason, const std::string& name)
{
    throw std::system_error(reason, std::generic_category(),
                            name == kStandardInput ? "standard input" : name);
}

// Waits at a named pipe until somebody writes to it, as long as `proceed` says after a signal.
descriptor opened(const std::string& name, const std::function<bool()>& proceed)
{
    if (name == kStandardInput) {
        return descriptor(STDIN_FILENO, false);
    }
    int fd = -1;
    do {
        fd = open(name.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY);
    } while (fd < 0 && errno == EINTR && proceed());
    if (fd < 0) {
        refuse(errno, name);
    }
    return descriptor(fd);
}

// Also where all has been read, or reading fails: then the next read tells.
bool hasmore(int fd, int milliseconds)
{
    pollfd stream{fd, POLLIN, 0};
    return poll(&stream, 1, milliseconds) > 0;
}

struct stat factsof(const descriptor& file, const std::string& name)
{
    struct stat facts {};
    if (fstat(file.number(), &facts) != 0) {
        refuse(errno, name);
    }
    return facts;
}

bool issame(const struct stat& one, const struct stat& other) noexcept
{
    return one.st_dev == other.st_dev && one.st_ino == other.st_ino;
}

// A log and its bytes.
class source {
public:
    source(descriptor from, std::string called)
        : file(std::move(from)), name(std::move(called)), block(kBlockBytes)
    {
    }

    [[nodiscard]] int number() const noexcept { return file.number(); }
    [[nodiscard]] struct stat facts() const { return factsof(file, name); }

    // The next bytes, up to so many, to `into`; returns their number, 0 at the end.
    std::size_t read(char* into, std::size_t most)
    {
        for (;;) {
            const ssize_t got = ::read(file.number(), into, most);
            if (got >= 0) {
                return static_cast<std::size_t>(got);
            }
            if (errno == EAGAIN) {
                (void)hasmore(file.number(), -1); // whoever has it, too, does not want to wait
            } else if (errno != EINTR) {
                refuse(errno, name);
            }
        }
    }

    // The next bytes; none at the end. Valid until the next call.
    std::string_view next() { return {block.data(), read(block.data(), block.size())}; }

    // As many bytes as there are from `place` on, `most` of them at most. Valid until the next
    // call.
    std::string_view at(off_t place, std::size_t most = kBlockBytes)
    {
        ssize_t got = -1;
        do {
            got = pread(file.number(), block.data(), std::min(most, block.size()), place);
        } while (got < 0 && errno == EINTR);
        if (got < 0) {
            refuse(errno, name);
        }
        return {block.data(), static_cast<std::size_t>(got)};
    }

private:
    descriptor file;
    std::string name;
    std::vector<char> block;
};

void readtoend(source& from, logreader& into)
{
    into.feedall([&from](char* bytes, std::size_t most) { return from.read(bytes, most); });
    into.endfile();
}

// Reads a file from its beginning to where it ends at each look. The daemon empties its log, the
// same file, and may have written more than before by the next look: so what was read is compared
// with what is there, at its beginning and at its end, where each line has its time.
class growingfile {
public:
    explicit growingfile(source from) : file(std::move(from)) {}

    [[nodiscard]] struct stat facts() const { return file.facts(); }

    // Whether there was anything new.
    bool readon(logreader& into)
    {
        const bool emptied = isrewritten();
        if (emptied) {
            into.endfile();
            place = 0;
            head.clear();
            tail.clear();
        }
        const off_t before = place;
        for (std::string_view bytes = file.at(place); !bytes.empty(); bytes = file.at(place)) {
            into.feed(bytes);
            remember(bytes);
        }
        return emptied || place > before;
    }

private:
    [[nodiscard]] bool isrewritten()
    {
        return file.at(0, head.size()) != head ||
               file.at(place - static_cast<off_t>(tail.size()), tail.size()) != tail;
    }

    void remember(std::string_view bytes)
    {
        head += bytes.substr(0, kGlimpseBytes - head.size());
        tail += bytes.substr(bytes.size() - std::min(bytes.size(), kGlimpseBytes));
        tail.erase(0, tail.size() - std::min(tail.size(), kGlimpseBytes));
        place += static_cast<off_t>(bytes.size());
    }

    source file;
    off_t place = 0;
    std::string head; // the first bytes that were read
    std::string tail; // and the last ones
};

// The file that `name` leads to now, unless it is `known` or none, or cannot be read.
std::optional<source> successor(const struct stat& known, const std::string& name)
{
    const int fd = open(name.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY | O_NONBLOCK);
    if (fd < 0) {
        return std::nullopt;
    }
    source next(descriptor(fd), name);
    const struct stat facts = next.facts();
    if (!S_ISREG(facts.st_mode) || issame(facts, known)) {
        return std::nullopt;
    }
    return next;
}

class follower {
public:
    follower(source from, const std::string& called)
        : name(called), file(std::move(from)), known(file.facts())
    {
    }

    // Whether there was anything new.
    bool look(logreader& into)
    {
        const bool grown = file.readon(into);
        if (!isgone()) {
            gone = false;
            return grown;
        }
        // Whoever had opened the old file may be about to write to it: one look more.
        if (!std::exchange(gone, true)) {
            return grown;
        }
        std::optional<source> next = successor(known, name);
        if (!next) {
            return grown;
        }
        into.endfile();
        file = growingfile(*std::move(next));
        known = file.facts();
        gone = false;
        (void)file.readon(into);
        return true;
    }

private:
    [[nodiscard]] bool isgone() const
    {
        struct stat facts {};
        return stat(name.c_str(), &facts) != 0 || !issame(facts, known);
    }

    const std::string& name;
    growingfile file;
    struct stat known;
    bool gone = false; // another file has the name, or none
};

void followfile(source from, const std::string& name, logreader& into,
                const std::function<void()>& caughtup, const std::function<bool()>& proceed,
                const std::function<void()>& pause)
{
    follower log(std::move(from), name);
    while (proceed()) {
        if (log.look(into)) {
            into.pause();
            caughtup();
        }
        pause();
    }
}

// Reads as it comes; asks also while nothing comes.
void followstream(source from, logreader& into, const std::function<void()>& caughtup,
                  const std::function<bool()>& proceed)
{
    bool told = true;
    while (proceed()) {
        if (!hasmore(from.number(), told ? kLookPauseMilliseconds : 0)) {
            if (!std::exchange(told, true)) {
                into.pause();
                caughtup();
            }
            continue;
        }
        const std::string_view bytes = from.next();
        if (bytes.empty()) {
            into.endfile();
            caughtup();
            return;
        }
        into.feed(bytes);
        told = false;
    }
}

} // namespace

void readlogs(const std::vector<std::string>& names, logreader& into)
{
    for (const std::string& name : names) {
        source log(opened(name, [] { return true; }), name);
        readtoend(log, into);
    }
}

bool islog(const std::vector<std::string>& names, const struct stat& file)
{
    return std::any_of(names.begin(), names.end(), [&](const std::string& name) {
        struct stat facts {};
        const int known =
            name == kStandardInput ? fstat(STDIN_FILENO, &facts) : stat(name.c_str(), &facts);
        return known == 0 && issame(facts, file);
    });
}

void pausebetweenlooks()
{
    (void)poll(nullptr, 0, kLookPauseMilliseconds);
}

void followlog(const std::string& name, logreader& into, const std::function<void()>& caughtup,
               const std::function<bool()>& proceed, const std::function<void()>& pause)
{
    source log(opened(name, proceed), name);
    const struct stat facts = log.facts();
    if (S_ISDIR(facts.st_mode)) {
        refuse(EISDIR, name);
    }
    if (S_ISREG(facts.st_mode) && name != kStandardInput) {
        followfile(std::move(log), name, into, caughtup, proceed, pause);
    } else {
        followstream(std::move(log), into, caughtup, proceed);
    }
}

} // namespace report
