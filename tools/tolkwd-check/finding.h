// What the checker has to say about a place of the file, and the collection of all that it says.
#pragma once

#include <cstddef>
#include <map>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace check {

enum class severity { note, warning, error };

// A finding that has no place of its own in the file.
inline constexpr std::size_t kNoPlace = static_cast<std::size_t>(-1);

struct finding {
    std::size_t place; // in bytes from the file's start, or kNoPlace
    severity level;
    std::string_view rule; // of rules.h
    std::string message; // one sentence or two without a full stop; may hold any bytes of the file
};

// One thread's; no lock.
class findings {
public:
    findings() = default;
    // Leaves out what these rules find.
    explicit findings(std::set<std::string, std::less<>> allowed);

    // Takes a finding of `rule`, which has to be one of rules.h. The same one at the same place is
    // taken once. Of one rule and severity the first hundred thousand are kept and the rest
    // counted: a file of nothing but mistakes must not take all memory.
    void add(std::string_view rule, severity level, std::size_t place, std::string message);

    // All of them by their place in the file, and at one place the graver ones first; those
    // without a place stand last.
    [[nodiscard]] std::vector<finding> sorted() const;

private:
    static constexpr std::size_t kMostOfARule = 100000;

    std::set<std::string, std::less<>> left;
    std::vector<finding> all;
    std::map<std::pair<std::string_view, severity>, std::size_t> counts;
};

} // namespace check
