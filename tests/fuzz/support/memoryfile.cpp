#include "memoryfile.h"

#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include "fuzz.h"

MemoryFile::MemoryFile()
    : fd(memfd_create("unit", MFD_CLOEXEC)), name("/proc/self/fd/" + std::to_string(fd))
{
    demand(fd >= 0, "a file in memory can be made");
}

MemoryFile::~MemoryFile()
{
    close(fd);
}

void MemoryFile::write(std::string_view content) const
{
    const bool done = ftruncate(fd, 0) == 0 && pwrite(fd, content.data(), content.size(), 0) ==
                                                   static_cast<ssize_t>(content.size());
    demand(done, "a file in memory takes its content");
}

std::string MemoryFile::read() const
{
    struct stat status {};
    demand(fstat(fd, &status) == 0, "a file in memory knows its size");
    std::string content(static_cast<std::size_t>(status.st_size), '\0');
    demand(pread(fd, content.data(), content.size(), 0) == status.st_size,
           "a file in memory gives its content");
    return content;
}
