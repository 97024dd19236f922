#include "columns.h"

#include <algorithm>
#include <array>
#include <clocale>
#include <cwchar>

#include <sys/ioctl.h>
#include <unistd.h>

#include "printable.h"

namespace report {

namespace {

constexpr std::size_t kLeastColumns = 80;
constexpr std::string_view kEllipsis = "...";

// While it lives, this thread takes text for UTF-8, whatever the user's locale is: what is written
// is UTF-8 in any case. Without that locale each character counts as one column.
class utf8locale {
public:
    utf8locale() noexcept : before(uselocale(known())) {}
    ~utf8locale() { uselocale(before); }
    utf8locale(const utf8locale&) = delete;
    utf8locale& operator=(const utf8locale&) = delete;

    [[nodiscard]] static bool available() noexcept { return known() != locale_t{}; }

private:
    static locale_t known() noexcept
    {
        static const locale_t once = newlocale(LC_CTYPE_MASK, "C.UTF-8", locale_t{});
        return once;
    }

    locale_t before;
};

struct shape {
    std::size_t bytes;
    std::size_t columns;
};

// Of the first character of `text`, which is not empty.
shape firstof(std::string_view text) noexcept
{
    wchar_t code = 0;
    std::mbstate_t state{};
    const std::size_t length = std::mbrtowc(&code, text.data(), text.size(), &state);
    if (length == 0 || length > text.size()) {
        return {1, 1};
    }
    const int width = wcwidth(code);
    return {length, width < 0 ? 1 : static_cast<std::size_t>(width)};
}

// How many bytes of `text` fit into so many columns. A character that joins the one before it stays
// with it.
std::size_t bytesin(std::string_view text, std::size_t most) noexcept
{
    std::size_t bytes = 0;
    std::size_t columns = 0;
    while (bytes < text.size()) {
        const shape next = firstof(text.substr(bytes));
        if (columns + next.columns > most) {
            break;
        }
        bytes += next.bytes;
        columns += next.columns;
    }
    return bytes;
}

// A tab would tear the columns of a table apart.
std::string inoneline(std::string_view text)
{
    std::string shown;
    for (const char byte : tools::printable(text)) {
        if (byte == '\t') {
            shown += "\\x09";
        } else {
            shown += byte;
        }
    }
    return shown;
}

std::string blanks(const std::string& text, std::size_t width)
{
    std::string result;
    result.resize(width - std::min(width, columnsof(text)), ' ');
    return result;
}

} // namespace

std::size_t columnsof(std::string_view text)
{
    const utf8locale here;
    if (!utf8locale::available()) {
        return tools::characters(text);
    }
    std::size_t columns = 0;
    while (!text.empty()) {
        const shape next = firstof(text);
        columns += next.columns;
        text.remove_prefix(next.bytes);
    }
    return columns;
}

std::string fitted(std::string_view text, std::size_t most)
{
    std::string shown = inoneline(text);
    if (columnsof(shown) <= most) {
        return shown;
    }
    const utf8locale here;
    shown.resize(bytesin(shown, most - kEllipsis.size()));
    return shown.append(kEllipsis);
}

std::string filledbehind(std::string text, std::size_t width)
{
    const std::string rest = blanks(text, width);
    return std::move(text) + rest;
}

std::string filledbefore(std::string text, std::size_t width)
{
    return blanks(text, width) + text;
}

std::size_t outputcolumns() noexcept
{
    winsize size{};
    if (isatty(STDOUT_FILENO) == 0 || ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) != 0) {
        return kLeastColumns;
    }
    return std::max<std::size_t>(size.ws_col, kLeastColumns);
}

} // namespace report
