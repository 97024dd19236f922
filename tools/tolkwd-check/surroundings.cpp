#include "surroundings.h"

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <iostream>
#include <system_error>
#include <utility>

#include <fcntl.h>
#include <unistd.h>

#include "wdsettings.h"

namespace check {

namespace {

constexpr std::string_view kFolderPattern = "/tolkwd-check.XXXXXX";

// The folder's name becomes part of shell commands, which do not quote it.
bool plainpath(std::string_view path)
{
    constexpr std::string_view kPlain = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ"
                                        "0123456789/._-";
    return path.starts_with('/') && path.find_first_not_of(kPlain) == std::string_view::npos;
}

// With a slash at its end, as _tmp_file_path has one.
std::string makefolder()
{
    const char* const wanted = std::getenv("TMPDIR");
    std::string path = wanted != nullptr && plainpath(wanted) ? wanted : "/tmp";
    path += kFolderPattern;
    if (mkdtemp(path.data()) == nullptr) {
        throw std::system_error(errno, std::generic_category(),
                                "a folder for the commands' output");
    }
    return path + '/';
}

void setorunset(const std::string& name, const char* value)
{
    if (value != nullptr) {
        setenv(name.c_str(), value, 1);
    } else {
        unsetenv(name.c_str());
    }
}

void ignoresignal(int signal, struct sigaction& before)
{
    struct sigaction ignored {};
    ignored.sa_handler = SIG_IGN;
    sigaction(signal, &ignored, &before);
}

} // namespace

outputfolder::outputfolder() : folder(makefolder()) {}

outputfolder::~outputfolder()
{
    std::error_code failure; // there is nothing more to be done about it
    std::filesystem::remove_all(folder, failure);
}

surroundings::surroundings(const std::string& folder)
    : pingfolder(std::exchange(_tmp_file_path, folder))
{
    std::cout.flush();
    const int null = open("/dev/null", O_RDWR); // not close-on-exec: it may be one of the three
    for (int fd = STDIN_FILENO; fd <= STDERR_FILENO; ++fd) {
        streams.at(static_cast<std::size_t>(fd)) = fcntl(fd, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
        dup2(null, fd);
    }
    if (null > STDERR_FILENO) {
        close(null);
    }
    workingfolder = open(".", O_PATH | O_DIRECTORY | O_CLOEXEC);
    [[maybe_unused]] const int ignored = chdir("/"); // there always is one
    setvariable("LC_MESSAGES", "C");
    setvariable("LC_ALL", nullptr);
    ignoresignal(SIGPIPE, pipesignal);
}

surroundings::~surroundings()
{
    sigaction(SIGPIPE, &pipesignal, nullptr);
    for (const auto& [name, value] : variables) {
        setorunset(name, value ? value->c_str() : nullptr);
    }
    if (workingfolder >= 0) {
        [[maybe_unused]] const int ignored = fchdir(workingfolder); // or it is gone
        close(workingfolder);
    }
    for (int fd = STDIN_FILENO; fd <= STDERR_FILENO; ++fd) {
        const int before = streams.at(static_cast<std::size_t>(fd));
        if (before >= 0) {
            dup2(before, fd);
            close(before);
        } else {
            close(fd);
        }
    }
    _tmp_file_path = pingfolder;
}

void surroundings::tell(std::string_view text) const
{
    const int fd = streams.at(STDERR_FILENO);
    if (isatty(fd) == 1) {
        [[maybe_unused]] const ssize_t ignored = write(fd, text.data(), text.size());
    }
}

void surroundings::setvariable(const std::string& name, const char* value)
{
    const char* const before = std::getenv(name.c_str());
    variables[name] = before != nullptr ? std::optional<std::string>(before) : std::nullopt;
    setorunset(name, value);
}

} // namespace check
