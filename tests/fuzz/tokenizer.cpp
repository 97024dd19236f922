// The configuration reader against a plain model of it: both must cut any text into the same
// tokens, and raise at the same tag without a name. Where the model leaves the ending open the
// reader may go on as it likes, but must come to an end. The handler is replaced at link time by
// functions that write the tokens down.
//
// A unit is the text; or an asterisk and a piece of text that is repeated, for a search that starts
// over at every token shows only in a long text of many tokens.

#include <algorithm>
#include <stdexcept>

#include "fuzz.h"
#include "memoryfile.h"
#include "tokenizer_model.h"
#include "wdxmlparserhandler.h"
#include "xmlparser.h"

namespace {

std::vector<Token> tokens;

constexpr char kRepeated = '*';
constexpr std::size_t kRepeatedBytes = 16384;

std::string textof(const std::string& unit)
{
    if (!unit.starts_with(kRepeated) || unit.size() == 1) {
        return unit;
    }
    std::string text;
    while (text.size() < kRepeatedBytes) {
        text.append(unit, 1);
    }
    return text;
}

void readbyreader(const std::string& path, Stopwatch& watch)
{
    tokens.clear();
    try {
        const Stopwatch::Lap lap(watch);
        demand(xmlparser::parse(path) == 0, "reading gives 0");
    } catch (const std::out_of_range&) {
        tokens.push_back({Token::Kind::tagWithoutName, ""});
    }
}

// One ending, at the end.
bool isover()
{
    const auto isending = [](const Token& token) {
        return token.kind == Token::Kind::endOfDocument ||
               token.kind == Token::Kind::tagWithoutName;
    };
    return std::find_if(tokens.begin(), tokens.end(), isending) == tokens.end() - 1;
}

} // namespace

void startElement(const std::string& name)
{
    tokens.push_back({Token::Kind::startTag, name});
}

void characters(const std::string& text)
{
    tokens.push_back({Token::Kind::text, text});
}

void endElement(const std::string& name)
{
    tokens.push_back({Token::Kind::endTag, name});
}

void endDocument()
{
    tokens.push_back({Token::Kind::endOfDocument, ""});
}

std::size_t tryunit(const std::string& unit, Stopwatch& watch)
{
    static const MemoryFile file;
    const std::string text = textof(unit);
    file.write(text);
    readbyreader(file.path(), watch);
    demand(!tokens.empty() && isover(), "reading comes to one end");
    const Reading expected = readbymodel(text);
    demand(tokens.size() >= expected.tokens.size() &&
               std::equal(expected.tokens.begin(), expected.tokens.end(), tokens.begin()),
           "the reader's tokens are the model's");
    demand(expected.open || tokens.size() == expected.tokens.size(),
           "the reader ends where the model does");
    return text.size();
}
