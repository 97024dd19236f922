// What the shell would make of a command's text, as far as it can be told without running it: which
// programs it names, and where a redirection behind it would go.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace check {

struct program {
    std::string name; // as it is looked up
    // By timeout, env or the like, which say themselves when there is none.
    bool started = false;
    bool argument = false; // a script that an interpreter is given
};

struct shelltext {
    // In the order of the text, without builtins of the shell and without what an expansion makes.
    std::vector<program> programs;

    bool bounded = false;  // timeout is one of them, or stands in the text of a `sh -c`
    bool compound = false; // several commands in a row, in no parentheses, braces or keywords
    bool openend = false; // ends in a comment or in a separator, so that nothing takes what follows

    // False: it may get by without one of them, for it has another one for its place, looks whether
    // it is there, or changes where it is looked up.
    bool needed = true;

    bool sure = true; // false: holds what is not understood here, and all of the above may lack
};

// Any thread, no lock.
shelltext splitshell(std::string_view text);

} // namespace check
