// The ratings of status lines and of answers, against the same rules as plain tables: the first
// rule that fits decides. A unit is a byte, the exit state, and the line.

#include <algorithm>
#include <optional>

#include "fuzz.h"
#include "wdmonitorthread_linux.h"

namespace {

// Fits a line that holds all of `words` and not `without`.
struct Rule {
    std::vector<std::string> words;
    std::optional<std::string> without;
    int result;
};

const std::vector<Rule> kStatusRules{
    {{"running"}, "not", 0},      {{"RUNNING"}, "NOT", 0},     {{"stopped"}, {}, 1},
    {{"not", "running"}, {}, 1},  {{"NOT", "RUNNING"}, {}, 1}, {{"unused"}, {}, 1},
    {{"no such service"}, {}, 2}, {{"unrecognized"}, {}, 2},
};

const std::vector<Rule> kAnswerRules{
    {{"CreationClassName"}, {}, 0}, {{"running"}, "not", 0},
    {{"service:"}, {}, 0},          {{"InstanceID="}, {}, 0},
    {{"initialized"}, "not", 0},    {{"CIMException"}, {}, 1},
    {{"command not found"}, {}, 2}, {{" No such file or directory"}, {}, 2},
};

bool holds(const std::string& line, const std::string& word)
{
    return std::search(line.begin(), line.end(), word.begin(), word.end()) != line.end();
}

bool fits(const Rule& rule, const std::string& line)
{
    return std::all_of(rule.words.begin(), rule.words.end(),
                       [&](const std::string& word) { return holds(line, word); }) &&
           !(rule.without && holds(line, *rule.without));
}

// The first fitting rule's result, or `otherwise`.
int decide(const std::vector<Rule>& rules, const std::string& line, int otherwise)
{
    const auto first = std::find_if(rules.begin(), rules.end(),
                                    [&](const Rule& rule) { return fits(rule, line); });
    return first == rules.end() ? otherwise : first->result;
}

} // namespace

std::size_t tryunit(const std::string& unit, Stopwatch& watch)
{
    const int state = unit.empty() ? 0 : static_cast<signed char>(unit.front());
    const std::string line = unit.substr(std::min<std::size_t>(unit.size(), 1));
    int status = 0;
    int answer = 0;
    {
        const Stopwatch::Lap lap(watch);
        status = ratestatus(line, state);
        answer = rateanswer(line);
    }
    demand(status == decide(kStatusRules, line, state == 0 ? 0 : 3), "the status rules decide");
    demand(answer == decide(kAnswerRules, line, 3), "the answer rules decide");
    demand(isfine(answer) == (answer == 0) && isfailure(answer) == (answer != 0),
           "an answer is fine or a failure");
    demand(isfine(state) == (state == 0 || state == -1) && isfailure(state) == (state > 0),
           "nothing below -1 is fine or a failure");
    return unit.size();
}
