#include "sourcetext.h"

#include <algorithm>
#include <cerrno>
#include <system_error>
#include <utility>

#include <fcntl.h>
#include <unistd.h>

#include "printable.h"

namespace check {

namespace {

constexpr std::size_t kBlockBytes = 1 << 20;

// What is longer has no end, or is no configuration.
constexpr std::size_t kMostBytes = 1 << 30;

std::string readall(int fd)
{
    std::string text;
    for (;;) {
        const std::size_t used = text.size();
        text.resize(used + kBlockBytes);
        const ssize_t got = read(fd, text.data() + used, kBlockBytes);
        text.resize(used + static_cast<std::size_t>(std::max<ssize_t>(got, 0)));
        if (got == 0) {
            return text;
        }
        if (text.size() > kMostBytes) {
            throw std::system_error(EFBIG, std::generic_category());
        }
        if (got < 0 && errno != EINTR) {
            throw std::system_error(errno, std::generic_category());
        }
    }
}

} // namespace

sourcetext::sourcetext(std::string text) : content(std::move(text)), begins{0}
{
    for (std::size_t end = content.find('\n'); end != std::string::npos;
         end = content.find('\n', end + 1)) {
        begins.push_back(end + 1);
    }
}

std::size_t sourcetext::lineindex(std::size_t place) const
{
    const auto behind = std::upper_bound(begins.begin(), begins.end(), place);
    return static_cast<std::size_t>(behind - begins.begin()) - 1;
}

position sourcetext::at(std::size_t place) const
{
    place = std::min(place, content.size());
    const std::size_t index = lineindex(place);
    if (index != counted.index || place < counted.place) {
        counted = {index, begins[index], 0};
    }
    const auto stretch = std::string_view(content).substr(counted.place, place - counted.place);
    counted = {index, place, counted.characters + tools::characters(stretch)};
    return {index + 1, counted.characters + 1};
}

std::size_t sourcetext::linenumber(std::size_t place) const
{
    return lineindex(std::min(place, content.size())) + 1;
}

sourcetext::line sourcetext::lineof(std::size_t place) const
{
    const std::size_t index = lineindex(std::min(place, content.size()));
    const std::size_t begin = begins[index];
    const std::size_t end = index + 1 < begins.size() ? begins[index + 1] - 1 : content.size();
    return {std::string_view(content).substr(begin, end - begin), begin};
}

std::string readwhole(const std::string& path)
{
    if (path == "-") {
        return readall(STDIN_FILENO);
    }
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY);
    if (fd < 0) {
        throw std::system_error(errno, std::generic_category());
    }
    try {
        std::string text = readall(fd);
        close(fd);
        return text;
    } catch (...) {
        close(fd);
        throw;
    }
}

} // namespace check
