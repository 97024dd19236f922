#include "shellwords.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <utility>

namespace check {

namespace {

using namespace std::string_view_literals;

struct word {
    std::string text;  // without its quotes
    bool plain = true; // nothing in it was quoted or will be expanded
};

struct token {
    enum kind { kWord, kSeparator, kRedirection, kComment };

    kind what;
    word content; // of a separator: its characters
};

constexpr std::string_view kWordEnds = " \t\n;&|()<>";

// Cuts the text into words and operators. What it cannot follow makes `sure` false and ends it.
class lexer {
public:
    explicit lexer(std::string_view cut) : text(cut) {}

    std::vector<token> run()
    {
        std::vector<token> tokens;
        while (sure && skipblanks()) {
            tokens.push_back(next());
        }
        return tokens;
    }

    [[nodiscard]] bool understood() const { return sure; }

private:
    [[nodiscard]] bool at(std::string_view what) const
    {
        return text.substr(place, what.size()) == what;
    }

    bool skipblanks()
    {
        while (at(" ") || at("\t") || at("\\\n")) {
            place += at("\\\n") ? 2 : 1;
        }
        return place < text.size();
    }

    token next()
    {
        if (at("#")) {
            place = std::min(text.find('\n', place), text.size());
            return {token::kComment, {}};
        }
        if (at("<") || at(">")) {
            return redirection();
        }
        for (const auto known : {"&&"sv, "||"sv, ";"sv, "&"sv, "|"sv, "("sv, ")"sv, "\n"sv}) {
            if (at(known)) {
                place += known.size();
                return {token::kSeparator, {std::string(known)}};
            }
        }
        word read = readword();
        const bool number =
            read.plain && read.text.find_first_not_of("0123456789") == std::string::npos;
        if (number && (at("<") || at(">"))) {
            return redirection();
        }
        return {token::kWord, std::move(read)};
    }

    token redirection()
    {
        sure = sure && !at("<<"); // the lines behind it are no commands
        place = std::min(text.find_first_not_of("<>&|", place), text.size());
        return {token::kRedirection, {}};
    }

    word readword()
    {
        word read;
        while (sure && place < text.size() &&
               kWordEnds.find(text[place]) == std::string_view::npos) {
            readpart(read);
        }
        read.plain = read.plain || read.text == "[" || read.text == "[["; // the builtins
        return read;
    }

    void readpart(word& read)
    {
        const char first = text[place];
        if (R"(\'"$`*?[~)"sv.find(first) != std::string_view::npos) {
            read.plain = false;
        }
        switch (first) {
        case '\\':
            read.text += text.substr(std::min(place + 1, text.size()), 1);
            place = std::min(place + 2, text.size());
            break;
        case '\'':
        case '`': {
            const std::size_t end = text.find(first, place + 1);
            sure = sure && end != std::string_view::npos;
            read.text += text.substr(place + 1, end - place - 1);
            place = end + 1;
            break;
        }
        case '"':
            read.text += readquotes();
            break;
        case '$':
            skipexpansion();
            break;
        default:
            read.text += first;
            ++place;
        }
    }

    std::string_view readquotes()
    {
        const std::size_t begin = ++place;
        while (place < text.size() && text[place] != '"') {
            if (text[place] == '$') {
                skipexpansion();
            } else {
                place += text[place] == '\\' ? 2 : 1;
            }
        }
        sure = sure && place < text.size();
        place = std::min(place + 1, text.size());
        return text.substr(begin, place - begin - 1);
    }

    // Of a nested one only the end counts; a quote in it is followed no further.
    void skipexpansion()
    {
        ++place;
        const char open = at("(") ? '(' : '{';
        const char close = at("(") ? ')' : '}';
        if (!at("(") && !at("{")) {
            return;
        }
        int depth = 0;
        for (; place < text.size(); ++place) {
            sure = sure && R"('"\)"sv.find(text[place]) == std::string_view::npos;
            depth += text[place] == open ? 1 : 0;
            depth -= text[place] == close ? 1 : 0;
            if (depth == 0) {
                ++place;
                return;
            }
        }
        sure = false;
    }

    std::string_view text;
    std::size_t place = 0;
    bool sure = true;
};

// A program that starts the one that its arguments name.
struct starter {
    std::string_view name;
    std::string_view valued; // options whose value is a word of its own, each between blanks
    int operands;            // words between the options and the program
};

constexpr std::array kStarters = {
    starter{"timeout", " -k -s --kill-after --signal ", 1},
    starter{"env", " -u -C --unset --chdir ", 0},
    starter{"exec", " -a ", 0},
    starter{"nice", " -n --adjustment ", 0},
    starter{"nohup", " ", 0},
    starter{"prlimit", " -o -p --output --pid ", 0},
    starter{"setsid", " ", 0},
    starter{"sudo", " -u -g -h -p -C -D -R -T -r -t ", 0},
};

// Whoever uses these may know himself whether a program is there, or where it is.
constexpr std::array kInquiring = {"."sv,    "["sv,      "[["sv,   "alias"sv, "command"sv, "eval"sv,
                                   "hash"sv, "source"sv, "test"sv, "type"sv,  "which"sv};

constexpr std::array kShells = {"sh"sv, "bash"sv, "dash"sv};
constexpr std::array kInterpreters = {"sh"sv, "bash"sv, "dash"sv, "python3"sv, "perl"sv};

constexpr std::array kBuiltins = {
    "."sv,        ":"sv,      "["sv,       "[["sv,       "alias"sv,   "bg"sv,      "break"sv,
    "cd"sv,       "chdir"sv,  "command"sv, "continue"sv, "declare"sv, "echo"sv,    "eval"sv,
    "exec"sv,     "exit"sv,   "export"sv,  "false"sv,    "fg"sv,      "getopts"sv, "hash"sv,
    "jobs"sv,     "kill"sv,   "let"sv,     "local"sv,    "printf"sv,  "pwd"sv,     "read"sv,
    "readonly"sv, "return"sv, "set"sv,     "shift"sv,    "source"sv,  "test"sv,    "time"sv,
    "times"sv,    "trap"sv,   "true"sv,    "type"sv,     "typeset"sv, "ulimit"sv,  "umask"sv,
    "unalias"sv,  "unset"sv,  "wait"sv,
};

template <typename List>
bool isin(const List& list, std::string_view text)
{
    return std::find(list.begin(), list.end(), text) != list.end();
}

bool isassignment(std::string_view text)
{
    const std::size_t end =
        text.find_first_not_of("abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789_");
    return end != 0 && end != std::string_view::npos && text[end] == '=';
}

// The words of one simple command, and what it adds to the whole.
class simplecommand {
public:
    simplecommand(const std::vector<word>& command, shelltext& whole)
        : words(command), result(whole)
    {
    }

    void run()
    {
        result.needed =
            result.needed && !std::any_of(words.begin(), words.end(), [](const word& each) {
                return each.text.starts_with("PATH=");
            });
        while (skipassignments() && words[place].plain) {
            const auto* const found =
                std::find_if(kStarters.begin(), kStarters.end(), [this](const starter& known) {
                    return known.name == words[place].text;
                });
            if (found == kStarters.end()) {
                addlast();
                return;
            }
            addstarter(*found);
        }
    }

private:
    bool skipassignments()
    {
        while (place < words.size() && isassignment(words[place].text)) {
            ++place;
        }
        return place < words.size();
    }

    void addstarter(const starter& known)
    {
        result.bounded = result.bounded || known.name == "timeout";
        if (!isin(kBuiltins, known.name)) {
            result.programs.push_back({words[place].text, started, false});
            started = true;
        }
        ++place;
        while (place < words.size() && words[place].text.starts_with('-')) {
            const std::string option = " " + words[place].text + " ";
            place += known.valued.find(option) != std::string_view::npos ? 2 : 1;
        }
        place += static_cast<std::size_t>(known.operands);
    }

    void addlast()
    {
        const std::string& name = words[place].text;
        result.needed = result.needed && !isin(kInquiring, name);
        if (isin(kBuiltins, name)) {
            return;
        }
        result.programs.push_back({name, started, false});
        if (place + 1 == words.size()) {
            return;
        }
        const word& next = words[place + 1];
        if (isin(kInterpreters, name) && next.plain && next.text.starts_with('/')) {
            result.programs.push_back({next.text, true, true});
        }
        if (isin(kShells, name) && next.text == "-c" && place + 2 < words.size() &&
            words[place + 2].text.find("timeout ") != std::string::npos) {
            result.bounded = true;
        }
    }

    const std::vector<word>& words;
    shelltext& result;
    std::size_t place = 0;
    bool started = false; // by a starter that is a program
};

constexpr std::array kOpening = {"{"sv, "if"sv, "while"sv, "until"sv, "for"sv};
constexpr std::array kClosing = {"}"sv, "fi"sv, "done"sv};
constexpr std::array kBetween = {"then"sv, "else"sv, "elif"sv, "do"sv, "!"sv};
constexpr std::array kNotFollowed = {"case"sv, "select"sv, "function"sv, "coproc"sv};

// Takes the tokens in their order and keeps track of what encloses what.
class reader {
public:
    shelltext run(std::string_view text)
    {
        lexer cutter(text);
        for (const token& each : cutter.run()) {
            take(each);
        }
        endcommand();
        result.openend = comment || behind == ";" || behind == "&";
        result.compound = result.compound && !result.openend;
        result.sure = result.sure && cutter.understood() && depth == 0 && !target && !isopen();
        return std::move(result);
    }

private:
    [[nodiscard]] bool isopen() const { return behind == "&&" || behind == "||" || behind == "|"; }

    void take(const token& each)
    {
        switch (each.what) {
        case token::kWord:
            takeword(each.content);
            break;
        case token::kSeparator:
            takeseparator(each.content.text);
            break;
        case token::kRedirection:
            target = true;
            break;
        case token::kComment:
            comment = true;
            break;
        }
    }

    void takeword(const word& content)
    {
        if (std::exchange(target, false) || head) {
            return;
        }
        if (!current.empty() || !takekeyword(content)) {
            begincommand();
            current.push_back(content);
        }
    }

    // Whether it is one, where a command would begin.
    bool takekeyword(const word& content)
    {
        if (!content.plain) {
            return false;
        }
        if (isin(kOpening, content.text)) {
            begincommand();
            ++depth;
            result.needed = result.needed && (content.text == "{" || content.text == "for");
            head = content.text == "for";
            return true;
        }
        if (isin(kClosing, content.text)) {
            --depth;
            behind.clear();
            return true;
        }
        result.sure = result.sure && !isin(kNotFollowed, content.text);
        return isin(kBetween, content.text);
    }

    void takeseparator(const std::string& which)
    {
        head = false;
        comment = false; // only a line's end follows one
        if (which == "(") {
            result.sure = result.sure && current.empty(); // else a function
            begincommand();
            ++depth;
            return;
        }
        endcommand();
        result.needed = result.needed && which != "||";
        if (which == ")") {
            --depth;
            result.sure = result.sure && depth >= 0;
            behind.clear();
        } else if (depth == 0 && (which != "\n" || (begun && behind.empty()))) {
            behind = which;
        }
    }

    void begincommand()
    {
        if (depth == 0) {
            result.compound = result.compound || (!behind.empty() && behind != "|");
            behind.clear();
            begun = true;
        }
    }

    void endcommand()
    {
        simplecommand(current, result).run();
        current.clear();
    }

    shelltext result;
    std::vector<word> current;
    std::string behind;   // the separator, outside all, that nothing has followed yet
    int depth = 0;        // of parentheses, braces and keywords
    bool begun = false;   // there has been a command
    bool head = false;    // between `for` and the end of its list
    bool target = false;  // the next word belongs to a redirection
    bool comment = false; // no line has followed it yet
};

} // namespace

shelltext splitshell(std::string_view text)
{
    return reader().run(text.substr(0, text.find('\0'))); // as much of it as the shell gets
}

} // namespace check
