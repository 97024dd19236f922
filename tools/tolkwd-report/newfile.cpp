#include "newfile.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <system_error>

#include <sys/stat.h>
#include <unistd.h>

namespace report {

namespace {

namespace fs = std::filesystem;

[[noreturn]] void fail(int reason, const std::string& name)
{
    throw std::system_error(reason, std::generic_category(), name);
}

// A stream does not tell why it failed; what the system said last mostly does.
void writeto(const fs::path& path, const std::string& name,
             const std::function<void(std::ostream&)>& write)
{
    errno = 0;
    std::ofstream file(path, std::ios::binary | std::ios::trunc);
    if (file) {
        write(file);
        file.close();
    }
    if (!file) {
        fail(errno == 0 ? EIO : errno, name);
    }
}

// The rights that a new file has.
mode_t usualmode()
{
    const mode_t mask = umask(0);
    umask(mask);
    return 0666U & ~mask;
}

// Gone at the end, unless it has got its name.
class temporaryfile {
public:
    temporaryfile(const fs::path& beside, const std::string& name)
        : path(beside.native() + ".XXXXXX")
    {
        const int fd = mkstemp(path.data());
        if (fd < 0) {
            fail(errno, name);
        }
        (void)fchmod(fd, usualmode());
        (void)close(fd);
    }
    ~temporaryfile()
    {
        if (!path.empty()) {
            (void)unlink(path.c_str());
        }
    }
    temporaryfile(const temporaryfile&) = delete;
    temporaryfile& operator=(const temporaryfile&) = delete;

    [[nodiscard]] const std::string& where() const noexcept { return path; }

    void rename(const fs::path& to, const std::string& name)
    {
        if (std::rename(path.c_str(), to.c_str()) != 0) {
            fail(errno, name);
        }
        path.clear();
    }

private:
    std::string path;
};

} // namespace

void writewhole(const std::string& name, const std::function<void(std::ostream&)>& write)
{
    if (name == "-") {
        write(std::cout);
        return;
    }
    std::error_code ignored;
    const bool exists = fs::exists(name, ignored);
    if (exists && !fs::is_regular_file(name, ignored)) {
        writeto(name, name, write);
        return;
    }
    // A symbolic link stays one.
    const fs::path target = exists ? fs::canonical(name) : fs::path(name);
    temporaryfile fresh(target, name);
    writeto(fresh.where(), name, write);
    fresh.rename(target, name);
}

} // namespace report
