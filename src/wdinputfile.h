// A file that is read once, from its start: the configuration, and what a ping's command printed.
//
// Not a stream: the buffers that streams allocate and free would stay in the heap of each of a
// thousand monitor threads, and cost more than such a short file itself.
#pragma once

#include <cstddef>
#include <span>
#include <string>
#include <string_view>

// A local object of one thread; takes no lock. Nothing here fails but by giving no bytes.
class wdinputfile {
public:
    // Opens `path`, close-on-exec: the services that the daemon starts inherit none of its files.
    explicit wdinputfile(const std::string& path) noexcept;
    ~wdinputfile();
    wdinputfile(const wdinputfile&) = delete;
    wdinputfile& operator=(const wdinputfile&) = delete;

    [[nodiscard]] bool isopen() const noexcept;

    // The next bytes, as many as there are and `block` can hold, valid as long as it is. None at
    // the end, or where the file cannot be read.
    std::string_view read(std::span<char> block) noexcept;

private:
    int fd;
};
