#include "newfile.h"

#include <array>
#include <cerrno>
#include <climits>
#include <filesystem>
#include <iostream>
#include <random>
#include <stdexcept>
#include <system_error>
#include <utility>

#include <ext/stdio_filebuf.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include "descriptor.h"
#include "sources.h"

namespace report {

namespace {

namespace fs = std::filesystem;

constexpr const char* kAccessList = "system.posix_acl_access"; // an attribute

[[noreturn]] void fail(int reason, const std::string& name)
{
    throw std::system_error(reason, std::generic_category(), name);
}

struct stat factsof(const descriptor& file, const std::string& name)
{
    struct stat facts {};
    if (fstat(file.number(), &facts) != 0) {
        fail(errno, name);
    }
    return facts;
}

struct place {
    descriptor folder;
    std::string name{}; // within it
    descriptor file{};  // what is there, if anything; not open for reading or writing
};

// Root does not follow other users' links: they may lead to any file of the system.
void checklink(const struct stat& link, const std::string& name)
{
    if (geteuid() == 0 && link.st_uid != 0) {
        throw std::runtime_error(name + ": a symbolic link of another user");
    }
}

std::string linktext(int folder, const std::string& link, const std::string& name)
{
    std::array<char, PATH_MAX> text{};
    const ssize_t size = readlinkat(folder, link.c_str(), text.data(), text.size());
    if (size < 0) {
        fail(errno, name);
    }
    return {text.data(), static_cast<std::size_t>(size)};
}

// The folder `path`, which may be relative to the folder `from`.
descriptor folderat(const fs::path& path, int from, const std::string& name, int links = 0)
{
    constexpr int kMostLinks = 40; // as the system's own
    descriptor folder(openat(from, path.is_absolute() ? "/" : ".", O_PATH | O_CLOEXEC));
    for (const fs::path& part : path.relative_path()) {
        if (part.empty()) { // behind a slash at the end
            continue;
        }
        descriptor next(openat(folder.number(), part.c_str(), O_PATH | O_NOFOLLOW | O_CLOEXEC));
        if (next.number() < 0 || links > kMostLinks) {
            fail(next.number() < 0 ? errno : ELOOP, name);
        }
        if (const struct stat facts = factsof(next, name); S_ISLNK(facts.st_mode)) {
            checklink(facts, name);
            next = folderat(linktext(folder.number(), part, name), folder.number(), name, ++links);
        }
        folder = std::move(next);
    }
    return folder;
}

// What is at `path`, which may be relative to the folder `from`.
place placeof(const fs::path& path, int from, const std::string& name)
{
    if (path.filename().empty()) {
        fail(path.empty() ? ENOENT : EISDIR, name);
    }
    place found{folderat(path.parent_path(), from, name), path.filename()};
    found.file = descriptor(
        openat(found.folder.number(), found.name.c_str(), O_PATH | O_NOFOLLOW | O_CLOEXEC));
    if (found.file.number() < 0 && errno != ENOENT) {
        fail(errno, name);
    }
    return found;
}

// Where the file is, whose folder is held open. Symbolic links are followed, one after the other.
place resolved(const std::string& name)
{
    place found = placeof(name, AT_FDCWD, name);
    while (found.file.number() >= 0) {
        const struct stat facts = factsof(found.file, name);
        if (!S_ISLNK(facts.st_mode)) {
            break;
        }
        checklink(facts, name);
        const int folder = found.folder.number();
        descriptor target(openat(folder, found.name.c_str(), O_PATH | O_CLOEXEC));
        if (target.number() < 0 && errno != ENOENT) {
            fail(errno, name);
        }
        place next = placeof(linktext(folder, found.name, name), folder, name);
        if (next.file.number() < 0 && target.number() >= 0) { // a pipe behind /dev/stdout
            found.file = std::move(target);
            break;
        }
        found = std::move(next);
    }
    return found;
}

// In a folder such as /tmp another user may have made the file, to own what root writes to it.
void checkowner(const place& found, const struct stat& file, const std::string& name)
{
    const struct stat folder = factsof(found.folder, name);
    const bool isshared = (folder.st_mode & S_ISVTX) != 0 && (folder.st_mode & 022U) != 0;
    if (geteuid() == 0 && isshared && file.st_uid != 0 && file.st_uid != folder.st_uid) {
        throw std::runtime_error(name + ": a file of another user in a shared folder");
    }
}

// A stream does not report why it failed; errno mostly holds the reason.
void writethrough(const descriptor& file, const std::string& name,
                  const std::function<void(std::ostream&)>& write)
{
    errno = 0;
    __gnu_cxx::stdio_filebuf<char> buffer(fcntl(file.number(), F_DUPFD_CLOEXEC, 0),
                                          std::ios::out | std::ios::binary);
    std::ostream out(&buffer);
    write(out);
    if (!out || buffer.close() == nullptr) {
        fail(errno == 0 ? EIO : errno, name);
    }
}

// A path to a file that is held open, also after a rename.
std::string pathof(const descriptor& file)
{
    return "/proc/self/fd/" + std::to_string(file.number());
}

void writeto(const descriptor& known, const std::string& name,
             const std::function<void(std::ostream&)>& write)
{
    const descriptor file(open(pathof(known).c_str(), O_WRONLY | O_NOCTTY | O_CLOEXEC));
    if (file.number() < 0) {
        fail(errno, name);
    }
    writethrough(file, name, write);
}

// The mode of a new file.
mode_t usualmode()
{
    const mode_t mask = umask(0);
    umask(mask);
    return 0666U & ~mask;
}

// The mode of a file that replaces an old one. No user gains a right: where the group changes,
// group and others get what both had; where an access control list is lost, they get nothing.
mode_t modelike(const descriptor& old, const struct stat& facts, bool samegroup)
{
    const mode_t mode = facts.st_mode & 0777U;
    if (getxattr(pathof(old).c_str(), kAccessList, nullptr, 0) > 0) {
        return mode & 0700U;
    }
    const mode_t both = (mode >> 3U) & mode & 07U; // its group and others
    return samegroup ? mode : (mode & 0700U) | both << 3U | both;
}

// A new file beside another, readable by its owner only. Deleted at the end unless renamed.
class temporaryfile {
public:
    temporaryfile(const place& beside, const std::string& name) : at(beside), asked(name)
    {
        constexpr int kTries = 100;
        for (int tries = 0; tries < kTries && file.number() < 0; ++tries) {
            own = at.name + '.' + std::to_string(std::random_device()());
            file = descriptor(openat(at.folder.number(), own.c_str(),
                                     O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
            if (file.number() < 0 && errno != EEXIST) {
                break;
            }
        }
        if (file.number() < 0) {
            fail(errno, asked);
        }
    }
    ~temporaryfile()
    {
        if (!own.empty()) {
            (void)unlinkat(at.folder.number(), own.c_str(), 0);
        }
    }
    temporaryfile(const temporaryfile&) = delete;
    temporaryfile& operator=(const temporaryfile&) = delete;

    [[nodiscard]] const descriptor& opened() const noexcept { return file; }

    // Takes over mode, group and owner of the old file. The owner comes last: only the owner may
    // change the rest.
    void takerights()
    {
        if (at.file.number() < 0) {
            setmode(usualmode());
            return;
        }
        const struct stat old = factsof(at.file, asked);
        (void)fremovexattr(file.number(), kAccessList); // the folder may have given one
        const bool samegroup = fchown(file.number(), static_cast<uid_t>(-1), old.st_gid) == 0;
        setmode(modelike(at.file, old, samegroup));
        [[maybe_unused]] const int ignored =
            fchown(file.number(), old.st_uid, static_cast<gid_t>(-1));
    }

    void rename()
    {
        const int folder = at.folder.number();
        if (renameat(folder, own.c_str(), folder, at.name.c_str()) != 0) {
            fail(errno, asked);
        }
        own.clear();
    }

private:
    void setmode(mode_t mode) const
    {
        if (fchmod(file.number(), mode) != 0) {
            fail(errno, asked);
        }
    }

    const place& at;
    const std::string& asked;
    std::string own;
    descriptor file;
};

void refuseinput(const struct stat& output, const std::vector<std::string>& inputs,
                 const std::string& name)
{
    const bool isstream = S_ISCHR(output.st_mode) || S_ISSOCK(output.st_mode); // one for both
    if (!isstream && islog(inputs, output)) {
        throw std::runtime_error(name + ": the output is also an input");
    }
}

} // namespace

void writewhole(const std::string& name, const std::vector<std::string>& inputs,
                const std::function<void(std::ostream&)>& write)
{
    struct stat facts {};
    if (name == "-") {
        if (fstat(STDOUT_FILENO, &facts) == 0) {
            refuseinput(facts, inputs, "standard output");
        }
        write(std::cout);
        return;
    }
    const place found = resolved(name);
    if (found.file.number() >= 0) {
        facts = factsof(found.file, name);
        refuseinput(facts, inputs, name);
        checkowner(found, facts, name);
        if (!S_ISREG(facts.st_mode)) {
            writeto(found.file, name, write);
            return;
        }
    }
    temporaryfile fresh(found, name);
    writethrough(fresh.opened(), name, write);
    fresh.takerights();
    fresh.rename();
}

} // namespace report
