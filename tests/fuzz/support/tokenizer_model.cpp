#include "tokenizer_model.h"

namespace {

constexpr auto kNowhere = std::string::npos;
constexpr const char* kWhite = "\n\r\t ";

// What a rule does when it does not lead on.
struct LeadsNowhere {};
struct NoName {};

// `place`, where the search found one.
std::size_t found(std::size_t place)
{
    if (place == kNowhere) {
        throw LeadsNowhere();
    }
    return place;
}

class Walk {
public:
    explicit Walk(const std::string& document) : text(document), last(document.rfind('>')) {}

    Reading run()
    {
        try {
            walk();
            add(Token::Kind::endOfDocument, "");
        } catch (const LeadsNowhere&) {
            reading.open = true;
        } catch (const NoName&) {
            add(Token::Kind::tagWithoutName, "");
        }
        return reading;
    }

private:
    void walk()
    {
        if (text.find('<') == kNowhere && last == kNowhere) {
            return;
        }
        pos = found(text.find('<'));
        cur = pos;
        do {
            skipdeclaration();
            skipwhite();
            if (text[cur] != '<') {
                taketext();
            } else {
                taketag();
            }
        } while (cur != last);
    }

    // Looks at cur, which behind an end tag is one ahead of pos; the "?" it looks for is the first
    // of the text, not the first from here.
    void skipdeclaration()
    {
        if (text.compare(cur, 2, "<?") != 0) {
            return;
        }
        pos = found(text.find('?', 2)) + 2;
        if (pos < cur) {
            throw LeadsNowhere();
        }
    }

    void skipwhite()
    {
        pos = found(text.find_first_not_of(kWhite, pos));
        cur = pos;
    }

    void taketext()
    {
        pos = found(text.find('<', pos + 1));
        add(Token::Kind::text, trimmed(text.substr(cur, pos - cur)));
        cur = pos;
    }

    void taketag()
    {
        pos = found(text.find_first_of(">/", pos));
        if (text[pos] == '>') {
            takestarttag();
        } else {
            takeendtag();
        }
    }

    void takestarttag()
    {
        add(Token::Kind::startTag, trimmed(text.substr(cur + 1, pos - cur - 1)));
        pos = pos + 1;
        cur = pos;
    }

    // pos stays on the ">", which the next pass then takes for text.
    void takeendtag()
    {
        const std::size_t slash = pos;
        pos = found(text.find('>', slash));
        const std::string name = text.substr(slash + 1, pos - slash - 1);
        add(Token::Kind::endTag, trimmed(name));
        cur = name == "wdtargets" ? pos : pos + 1;
    }

    static std::string trimmed(const std::string& piece)
    {
        const std::size_t first = piece.find_first_not_of(kWhite);
        if (first == kNowhere) {
            throw NoName();
        }
        return piece.substr(first, piece.find_last_not_of(kWhite) - first + 1);
    }

    void add(Token::Kind kind, const std::string& piece)
    {
        reading.tokens.push_back({kind, piece});
    }

    const std::string& text;
    const std::size_t last; // the place of the last ">"
    std::size_t pos = 0;
    std::size_t cur = 0;
    Reading reading;
};

} // namespace

Reading readbymodel(const std::string& text)
{
    return Walk(text).run();
}
