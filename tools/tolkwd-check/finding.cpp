#include "finding.h"

#include <algorithm>
#include <tuple>
#include <utility>

#include "rules.h"

namespace check {

findings::findings(std::set<std::string, std::less<>> allowed) : left(std::move(allowed)) {}

void findings::add(std::string_view rule, severity level, std::size_t place, std::string message)
{
    const std::string_view name = rulenamed(rule).name; // lives as long as the program
    if (left.contains(name)) {
        return;
    }
    std::size_t& count = counts[{name, level}];
    if (++count <= kMostOfARule) {
        all.push_back({place, level, name, std::move(message)});
    }
}

std::vector<finding> findings::sorted() const
{
    const auto order = [](const finding& one) {
        return std::make_tuple(one.place, -static_cast<int>(one.level), one.rule,
                               std::string_view(one.message));
    };
    std::vector<finding> result = all;
    for (const auto& [kind, count] : counts) {
        if (count > kMostOfARule) {
            result.push_back({kNoPlace, kind.second, kind.first,
                              std::to_string(count - kMostOfARule) + " more are not kept"});
        }
    }
    std::sort(result.begin(), result.end(), [&order](const finding& one, const finding& other) {
        return order(one) < order(other);
    });
    const auto same = [&order](const finding& one, const finding& other) {
        return order(one) == order(other);
    };
    result.erase(std::unique(result.begin(), result.end(), same), result.end());
    return result;
}

} // namespace check
