#include "messages.h"

#include <algorithm>
#include <string>
#include <string_view>

namespace report {

namespace {

constexpr std::string_view kVisibleBlank = "\u2420";
constexpr std::string_view kIndent = "    ";
constexpr std::size_t kColumns = 80;

std::string_view wordof(loglevel level)
{
    switch (level) {
    case loglevel::kError:
        return "ERROR";
    case loglevel::kInfo:
        return "INFO";
    case loglevel::kDebug:
        return "DEBUG";
    case loglevel::kStandardError:
        break;
    }
    return "stderr";
}

// `text` with the blanks at its ends, and those beside another one, made visible.
std::string shown(std::string_view text)
{
    const auto blank = [text](std::size_t i) {
        return i >= text.size() || text[i] == ' '; // beyond an end, also that before the first
    };
    std::string result;
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] == ' ' && (blank(i - 1) || blank(i + 1))) {
            result += kVisibleBlank;
        } else {
            result += text[i];
        }
    }
    return result;
}

void writefolded(std::ostream& out, std::string_view text)
{
    constexpr std::size_t kWidth = kColumns - kIndent.size();
    while (text.size() > kWidth) {
        const std::size_t blank = text.rfind(' ', kWidth);
        const std::size_t end = blank == std::string_view::npos ? text.size() : blank;
        out << kIndent << text.substr(0, end) << '\n';
        text.remove_prefix(std::min(end + 1, text.size()));
    }
    if (!text.empty()) {
        out << kIndent << text << '\n';
    }
}

} // namespace

void writemessages(std::ostream& out, std::span<const messageform> forms)
{
    for (const messageform& form : forms) {
        out << wordof(form.level) << ' ' << shown(form.module) << (form.module.empty() ? "" : " ")
            << shown(form.text) << '\n';
        writefolded(out, form.meaning);
    }
}

} // namespace report
