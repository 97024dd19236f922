// load FILE [--unlisted]: does what the daemon does to load FILE when it starts, debug lines off
// and the log in /dev/null, and prints how many targets it will watch. --unlisted: without the
// listing of the whole configuration that ends the reading.
#include <cstdio>
#include <span>
#include <string_view>

#include "wdmanager_linux.h"
#include "wdxmlparserhandler.h"
#include "xmlparser.h"

namespace {

bool listing = true;

} // namespace

extern "C" {

void __real__Z11endDocumentv();

void __wrap__Z11endDocumentv()
{
    if (listing) {
        __real__Z11endDocumentv();
    } else {
        collectservices();
    }
}

} // extern "C"

int main(int argc, char** argv)
{
    const std::span<char*> words(argv, static_cast<std::size_t>(argc));
    if (words.size() < 2) {
        return 2;
    }
    listing = words.size() == 2 || std::string_view(words[2]) != "--unlisted";
    const wdmanager manager(words[1], "/dev/null");
    return std::printf("%zu\n", xmlparser::alltargets.size()) > 0 ? 0 : 1;
}
