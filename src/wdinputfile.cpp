#include "wdinputfile.h"

#include <cerrno>

#include <fcntl.h>
#include <unistd.h>

wdinputfile::wdinputfile(const std::string& path) noexcept
    : fd(open(path.c_str(), O_RDONLY | O_CLOEXEC))
{
}

wdinputfile::~wdinputfile()
{
    if (fd >= 0) {
        close(fd);
    }
}

bool wdinputfile::isopen() const noexcept
{
    return fd >= 0;
}

// Not const: it moves on in the file.
// NOLINTNEXTLINE(readability-make-member-function-const)
std::string_view wdinputfile::read(std::span<char> block) noexcept
{
    for (;;) {
        const ssize_t got = ::read(fd, block.data(), block.size());
        if (got >= 0) {
            return {block.data(), static_cast<std::size_t>(got)};
        }
        if (errno != EINTR) {
            return {};
        }
    }
}
