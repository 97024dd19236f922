// A file descriptor that has an owner.
#pragma once

#include <utility>

#include <unistd.h>

namespace report {

// Closed at the end if it is `ours`; -1 is none.
class descriptor {
public:
    explicit descriptor(int number = -1, bool ours = true) noexcept : fd(number), own(ours) {}
    ~descriptor()
    {
        if (own && fd >= 0) {
            (void)close(fd);
        }
    }
    descriptor(descriptor&& other) noexcept
        : fd(std::exchange(other.fd, -1)), own(std::exchange(other.own, false))
    {
    }
    descriptor& operator=(descriptor&& other) noexcept
    {
        std::swap(fd, other.fd);
        std::swap(own, other.own);
        return *this;
    }
    descriptor(const descriptor&) = delete;
    descriptor& operator=(const descriptor&) = delete;

    [[nodiscard]] int number() const noexcept { return fd; }

private:
    int fd;
    bool own;
};

} // namespace report
