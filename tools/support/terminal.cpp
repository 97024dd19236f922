#include "terminal.h"

#include <cstdlib>
#include <iostream>
#include <stdexcept>

#include <unistd.h>

namespace tools {

bool colourwanted()
{
    const auto set = [](const char* name) {
        const char* value = std::getenv(name);
        return value != nullptr ? std::string(value) : std::string();
    };
    return isatty(STDOUT_FILENO) != 0 && set("NO_COLOR").empty() && set("TERM") != "dumb";
}

std::string coloured(std::string_view colour, std::string_view text, bool wanted)
{
    return wanted ? std::string(colour).append(text).append(kPlain) : std::string(text);
}

int delivered(int status)
{
    std::cout.flush();
    if (!std::cout) {
        throw std::runtime_error("the output cannot be written");
    }
    return status;
}

} // namespace tools
