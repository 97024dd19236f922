#include "xmlparser.h"

#include "wdxmlparserhandler.h"

std::vector<service> xmlparser::allservices;
std::vector<wdmonitortarget> xmlparser::alltargets;

namespace {

// Hands tokens to the handler, as strings of its own. Most end tags have the name of the tag
// before, and most texts behind an end tag are its bracket.
class handing {
public:
    void operator()(const xmltoken& token)
    {
        switch (token.what) {
        case xmltoken::kStartTag:
            startElement(keep(name, token.content));
            break;
        case xmltoken::kEndTag:
            endElement(keep(name, token.content));
            break;
        case xmltoken::kText:
            characters(isbracket(token.content) ? bracket : keep(value, token.content));
            break;
        }
    }

private:
    static bool isbracket(std::string_view text) { return text.size() == 1 && text.front() == '>'; }

    static const std::string& keep(std::string& kept, std::string_view content)
    {
        if (kept != content) {
            kept.assign(content);
        }
        return kept;
    }

    std::string name;
    std::string value;
    const std::string bracket = ">";
};

} // namespace

int xmlparser::parse(std::string path)
{
    allservices.clear();
    alltargets.clear();
    scanfile(path, handing());
    endDocument();
    return 0;
}
