// A file that lies in memory and yet has a path, for code that opens what it reads.
#pragma once

#include <string>
#include <string_view>

class MemoryFile {
public:
    MemoryFile();
    ~MemoryFile();
    MemoryFile(const MemoryFile&) = delete;
    MemoryFile& operator=(const MemoryFile&) = delete;

    // For this process only.
    [[nodiscard]] const std::string& path() const noexcept { return name; }

    // Makes `content` all that the file holds.
    void write(std::string_view content) const;

    [[nodiscard]] std::string read() const;

private:
    const int fd;
    const std::string name;
};
