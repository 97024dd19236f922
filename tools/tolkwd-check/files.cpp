#include "files.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <system_error>

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace check {

namespace {

constexpr std::string_view kUnitSuffix = ".service";
constexpr const char* kInitScripts = "/etc/init.d";
constexpr std::array kUnitFolders = {
    "/etc/systemd/system",           "/run/systemd/system",         "/run/systemd/generator",
    "/run/systemd/generator.early",  "/run/systemd/generator.late", "/run/systemd/transient",
    "/usr/local/lib/systemd/system", "/lib/systemd/system",         "/usr/lib/systemd/system",
};

struct folderclose {
    void operator()(DIR* folder) const noexcept { (void)closedir(folder); }
};
struct textfree {
    void operator()(char* text) const noexcept { std::free(text); } // NOLINT(*-no-malloc)
};

bool ismissing(int reason)
{
    return reason == ENOENT || reason == ENOTDIR || reason == ELOOP || reason == ENAMETOOLONG;
}

filefacts look(const std::string& path)
{
    struct stat seen {};
    if (path.find('\0') != std::string::npos) {
        return {};
    }
    if (stat(path.c_str(), &seen) != 0) {
        filefacts none;
        none.found = ismissing(errno) ? presence::kMissing : presence::kHidden;
        return none;
    }
    const bool folder = S_ISDIR(seen.st_mode);
    const mode_t bygroup = seen.st_gid == 0 ? 0 : folder ? S_IXGRP : S_IRGRP;
    return {
        .found = presence::kThere,
        .folder = folder,
        .executable = S_ISREG(seen.st_mode) && (seen.st_mode & (S_IXUSR | S_IXGRP | S_IXOTH)) != 0,
        .readable = (seen.st_mode & (bygroup | (folder ? S_IXOTH : S_IROTH))) != 0,
        .owner = seen.st_uid,
    };
}

bool iswritable(const struct stat& seen)
{
    const bool bygroup = (seen.st_mode & S_IWGRP) != 0 && seen.st_gid != 0;
    return seen.st_uid != 0 || bygroup || (seen.st_mode & S_IWOTH) != 0;
}

// Whether others may add to the folder, but not replace what is root's there.
bool issticky(const struct stat& seen)
{
    return S_ISDIR(seen.st_mode) && (seen.st_mode & S_ISVTX) != 0 && seen.st_uid == 0;
}

// The components of `path`, the last one first.
std::vector<std::string> components(const std::filesystem::path& path)
{
    std::vector<std::string> parts;
    for (const std::filesystem::path& part : path) {
        if (!part.empty() && part != ".") {
            parts.push_back(part);
        }
    }
    std::reverse(parts.begin(), parts.end());
    return parts;
}

std::vector<std::string> findwritable(const std::string& path)
{
    constexpr int kMostLinks = 40; // the kernel follows no more either
    std::error_code failure;
    std::vector<std::string> found;
    std::vector<std::string> left = components(std::filesystem::absolute(path, failure));
    std::filesystem::path here; // without links
    struct stat folder {};      // of `here`
    for (int links = 0; !left.empty() && links <= kMostLinks;) {
        const std::string part = left.back();
        left.pop_back();
        const std::filesystem::path next = part == ".." ? here.parent_path() : here / part;
        struct stat seen {};
        if (lstat(next.c_str(), &seen) != 0) {
            break;
        }
        if (S_ISLNK(seen.st_mode)) {
            // Who owns a link cannot change it, but replace it where the folder lets him.
            if (seen.st_uid != 0 && issticky(folder) && iswritable(folder)) {
                found.push_back(next);
            }
            const auto behind = components(std::filesystem::read_symlink(next, failure));
            left.insert(left.end(), behind.begin(), behind.end());
            ++links;
            continue;
        }
        here = next;
        folder = seen;
        if (iswritable(seen) && (!issticky(seen) || left.empty())) {
            found.push_back(here);
        }
    }
    return found;
}

bool beginsasscript(const std::string& path)
{
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY | O_NONBLOCK);
    if (fd < 0) {
        return false;
    }
    std::array<char, 2> begin{};
    const bool is = read(fd, begin.data(), begin.size()) == 2 && begin[0] == '#' && begin[1] == '!';
    close(fd);
    return is;
}

// The value of `key`, made by `make` the first time it is asked for.
template <typename Map, typename Make>
typename Map::mapped_type& remembered(Map& known, const std::string& key, Make make)
{
    const auto found = known.find(key);
    return found != known.end() ? found->second : known.emplace(key, make(key)).first->second;
}

} // namespace

const filefacts& machinefiles::of(const std::string& path)
{
    return remembered(files, path, look);
}

const std::string& machinefiles::program(const std::string& name)
{
    return remembered(programs, name, [this](const std::string& wanted) -> std::string {
        if (wanted.find('/') != std::string::npos) {
            const std::string path = wanted.front() == '/' ? wanted : "/" + wanted;
            const filefacts& facts = of(path);
            return facts.executable || facts.found == presence::kHidden ? path : "";
        }
        for (std::string_view left = kDaemonPath; !left.empty();) {
            const std::size_t end = std::min(left.find(':'), left.size());
            std::string path = std::string(left.substr(0, end)).append("/").append(wanted);
            if (of(path).executable || of(path).found == presence::kHidden) {
                return path;
            }
            left.remove_prefix(std::min(end + 1, left.size()));
        }
        return {};
    });
}

bool machinefiles::isscript(const std::string& path)
{
    return remembered(scripts, path, beginsasscript);
}

const std::string& machinefiles::realpathof(const std::string& path)
{
    return remembered(realpaths, path, [](const std::string& asked) {
        const std::unique_ptr<char, textfree> real(realpath(asked.c_str(), nullptr));
        return real ? std::string(real.get()) : asked;
    });
}

const std::vector<std::string>& machinefiles::writableon(const std::string& path)
{
    return remembered(writables, path, findwritable);
}

bool machinefiles::isreadable(const std::string& path)
{
    std::string step = realpathof(path);
    while (of(step).readable) {
        if (step == "/") {
            return true;
        }
        step = folderof(step);
    }
    return false;
}

bool machinefiles::isservice(const std::string& name)
{
    listservices();
    if (hidden || services.contains(name)) {
        return true;
    }
    const std::size_t instance = name.find('@');
    return instance != std::string::npos && services.contains(name.substr(0, instance + 1));
}

// Two thousand services are looked for in a dozen folders: one listing of each is quicker.
void machinefiles::listservices()
{
    if (listed) {
        return;
    }
    listed = true;
    listfolder(kInitScripts, false);
    for (const char* const folder : kUnitFolders) {
        listfolder(folder, true);
    }
}

void machinefiles::listfolder(const std::string& folder, bool units)
{
    const std::unique_ptr<DIR, folderclose> listing(opendir(folder.c_str()));
    if (!listing) {
        hidden = hidden || !ismissing(errno);
        return;
    }
    while (const dirent* const entry = readdir(listing.get())) {
        std::string name = &entry->d_name[0];
        if (name == "." || name == "..") {
            continue;
        }
        if (!units) {
            services.insert(std::move(name));
        } else if (name.ends_with(kUnitSuffix)) {
            services.insert(name.substr(0, name.size() - kUnitSuffix.size()));
        }
    }
}

std::string folderof(const std::string& path)
{
    const std::size_t slash = path.rfind('/');
    if (slash == std::string::npos) {
        return ".";
    }
    return slash == 0 ? "/" : path.substr(0, slash);
}

} // namespace check
