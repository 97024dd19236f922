#include "rules.h"

#include <algorithm>
#include <stdexcept>
#include <string>
#include <vector>

#include "ruletables.h"

namespace check {

namespace {

std::vector<rule> collected()
{
    std::vector<rule> all;
    for (const std::span<const rule> table :
         {shaperules(), valuerules(), machinerules(), proberules()}) {
        all.insert(all.end(), table.begin(), table.end());
    }
    std::sort(all.begin(), all.end(),
              [](const rule& one, const rule& other) { return one.name < other.name; });
    return all;
}

} // namespace

std::span<const rule> allrules() noexcept
{
    static const std::vector<rule> all = collected();
    return all;
}

bool isrule(std::string_view name) noexcept
{
    const auto rules = allrules();
    return std::any_of(rules.begin(), rules.end(),
                       [name](const rule& known) { return known.name == name; });
}

const rule& rulenamed(std::string_view name)
{
    const auto rules = allrules();
    const auto found = std::lower_bound(
        rules.begin(), rules.end(), name,
        [](const rule& known, std::string_view wanted) { return known.name < wanted; });
    if (found == rules.end() || found->name != name) {
        throw std::out_of_range("no rule is named " + std::string(name));
    }
    return *found;
}

} // namespace check
