#include "shape.h"

#include <algorithm>
#include <array>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <vector>

#include "document.h"
#include "meaning.h"
#include "printable.h"

namespace check {

namespace {

constexpr std::size_t npos = std::string::npos;
constexpr std::size_t kFields = kFieldElements.size();

// Of what one oddity does, so much is told; the rest is counted.
constexpr std::size_t kToldHarms = 4;

std::string_view nameof(std::size_t field)
{
    return kFieldElements.at(field).name;
}

const std::string& valueof(const service& record, std::size_t field)
{
    return record.*kFieldElements.at(field).field;
}

const std::string& named(const writtenservice* written)
{
    static const std::string nothing;
    const writtenfield* name =
        written != nullptr ? written->find(fieldindex(&service::name)) : nullptr;
    return name != nullptr ? name->value : nothing;
}

// How an oddity is told where it does no harm, and under which rule.
struct telling {
    std::string_view rule;
    severity harmless;
};

telling tellingof(oddkind kind)
{
    switch (kind) {
    case oddkind::comment:
        return {"comment", severity::note};
    case oddkind::cdata:
        return {"cdata", severity::warning};
    case oddkind::doctype:
        return {"doctype", severity::warning};
    case oddkind::instruction:
        return {"declaration", severity::warning};
    case oddkind::attribute:
        return {"attribute", severity::warning};
    case oddkind::entity:
        return {"entity", severity::warning};
    case oddkind::emptytag:
        return {"empty-tag", severity::error};
    case oddkind::unknown:
        return {"unknown-element", severity::warning};
    case oddkind::lessthan:
        return {"less-than", severity::warning};
    case oddkind::brokentag:
        return {"mismatched-tag", severity::error};
    case oddkind::mismatched:
    case oddkind::strayclosing:
    case oddkind::lateclosing:
    case oddkind::unclosed:
        return {"mismatched-tag", severity::warning};
    case oddkind::misplaced:
        return {"misplaced-element", severity::error};
    case oddkind::lostfield:
        return {"misplaced-field", severity::error};
    case oddkind::straytext:
        return {"stray-text", severity::warning};
    case oddkind::unfinished:
        return {"unfinished-file", severity::error};
    case oddkind::trailing:
        break;
    }
    return {"trailing-text", severity::warning};
}

// How many letters have to be changed, added or left out to make one of the other.
std::size_t distance(std::string_view one, std::string_view other)
{
    std::vector<std::size_t> row(other.size() + 1);
    for (std::size_t j = 0; j < row.size(); ++j) {
        row[j] = j;
    }
    for (std::size_t i = 1; i <= one.size(); ++i) {
        std::size_t diagonal = std::exchange(row[0], i);
        for (std::size_t j = 1; j <= other.size(); ++j) {
            const std::size_t change = diagonal + (one[i - 1] == other[j - 1] ? 0 : 1);
            diagonal = row[j];
            row[j] = std::min({change, row[j] + 1, row[j - 1] + 1});
        }
    }
    return row.back();
}

// The element that a misspelt name stands for, or nothing.
std::string_view similar(std::string_view name)
{
    constexpr std::size_t kMostDistance = 4;
    constexpr std::size_t kLongest = 40;
    if (name.size() > kLongest) {
        return {};
    }
    std::vector<std::string_view> known{"wdtargets", "wdmonitortarget", "wdmonitorservice",
                                        "wdmondependsev"};
    for (const fieldelement& each : kFieldElements) {
        known.push_back(each.name);
    }
    std::string_view nearest;
    std::size_t least = std::min(kMostDistance, name.size() / 2) + 1;
    for (const std::string_view each : known) {
        if (const std::size_t steps = distance(name, each); steps < least) {
            least = steps;
            nearest = each;
        }
    }
    return nearest;
}

std::string tag(std::string_view name)
{
    return "<" + std::string(name) + ">";
}

std::string tellcomment(std::string_view text)
{
    return text.find('/') < text.find('>')
               ? "the daemon takes a comment with a \"/\" for the end of what is open"
               : "the daemon takes a comment for an element that never ends";
}

std::string tellunknown(const oddity& odd)
{
    const std::string_view meant = similar(odd.name);
    const std::string told = tools::inquotes(odd.name) + " is no element of this file";
    return meant.empty() ? told + " and is never closed"
                         : told + ", did you mean " + tag(meant) + "? It is never closed";
}

// What the oddity is, whatever comes of it.
std::string tell(const oddity& odd, std::string_view text)
{
    switch (odd.kind) {
    case oddkind::comment:
        return tellcomment(text.substr(odd.begin, odd.end - odd.begin));
    case oddkind::cdata:
        return "the daemon does not know CDATA sections";
    case oddkind::doctype:
        return "the daemon does not know document types";
    case oddkind::instruction:
        return "only one declaration is known, <?xml version='1.0'?> at the first byte of the file";
    case oddkind::attribute:
        return "the daemon does not know attributes: it takes the whole tag for a name";
    case oddkind::entity:
        return tools::inquotes(odd.name) + " is taken as it stands";
    case oddkind::emptytag:
        return "a tag without a name, as every tag that ends in \"/>\", makes the whole load fail: "
               "nothing is watched until the next refresh";
    case oddkind::unknown:
        return tellunknown(odd);
    case oddkind::lessthan:
        return "\"<\" begins a tag, also in a value";
    case oddkind::brokentag:
        return "the \">\" of this tag is missing";
    case oddkind::mismatched:
        return "this closes " + tag(tools::brief(odd.other)) + ", though it is named " +
               tools::inquotes(odd.name);
    case oddkind::strayclosing:
        return tools::inquotes(odd.name) + " is not open here: this closes what is open";
    case oddkind::lateclosing:
        return tools::inquotes(odd.name) + " closes here what had to end before another one began";
    case oddkind::unclosed:
        return tag(odd.name) + " is not closed";
    case oddkind::misplaced:
        return tag(odd.name) + " stands outside " + tag("wdmonitortarget");
    case oddkind::lostfield:
        return tag(odd.name) +
               " stands outside a service: the daemon takes it for one of the next dependent's";
    case oddkind::straytext:
        return "text between elements means nothing, but an empty element takes it for its value";
    case oddkind::unfinished:
        return "the file breaks off inside " + tag(odd.name);
    case oddkind::trailing:
        break;
    }
    return "nothing may follow the closing tag of the root: the daemon reads on, and watches what "
           "targets stand here";
}

constexpr std::string_view kIntoAScript = "put a command that needs \"<\" in a script";

// What to write in place of an entity.
std::string cureofentity(std::string_view name)
{
    constexpr std::array<std::pair<std::string_view, std::string_view>, 4> kMeant{
        {{"&amp;", "&"}, {"&gt;", ">"}, {"&quot;", "\""}, {"&apos;", "'"}}};
    for (const auto& [entity, character] : kMeant) {
        if (name == entity) {
            return std::string("write ").append(character);
        }
    }
    return name == "&lt;" ? std::string(kIntoAScript) : "write the character itself";
}

// What to do about it.
std::string cureof(const oddity& odd)
{
    switch (odd.kind) {
    case oddkind::comment:
        return "take the comment out";
    case oddkind::straytext:
        return "take the text out";
    case oddkind::strayclosing:
        return "take this tag out";
    case oddkind::cdata:
        return "write its text alone";
    case oddkind::doctype:
        return "leave it out";
    case oddkind::instruction:
        return "put it there, or leave it out";
    case oddkind::attribute:
        return "write " + tag(tools::brief(odd.name));
    case oddkind::emptytag:
        return "write NULL for no command, or a number";
    case oddkind::unknown:
        return similar(odd.name).empty() ? "take the element out" : "";
    case oddkind::lateclosing:
        return "move it there";
    case oddkind::mismatched:
        return "write </" + tools::brief(odd.other) + ">";
    case oddkind::unclosed:
        return "write </" + std::string(odd.name) + "> where it ends";
    case oddkind::misplaced:
        return "put it into one";
    case oddkind::lostfield:
        return "move it into its service";
    case oddkind::trailing:
        return "move it before that";
    case oddkind::entity:
        return cureofentity(odd.name);
    case oddkind::lessthan:
        return std::string(kIntoAScript);
    case oddkind::unfinished:
        return "a whole file ends with </wdtargets>";
    case oddkind::brokentag:
        break;
    }
    return "";
}

// Fields of one service that the daemon reads otherwise, and the place of the first.
struct changedfields {
    std::size_t place = 0;
    std::vector<std::string> told;
};

// So many of them as are worth reading.
std::string listed(const std::vector<std::string>& parts, std::string_view separator)
{
    std::string list;
    for (std::size_t i = 0; i < std::min(parts.size(), kToldHarms); ++i) {
        list.append(i == 0 ? "" : separator).append(parts[i]);
    }
    if (parts.size() > kToldHarms) {
        list += " and " + std::to_string(parts.size() - kToldHarms) + " more";
    }
    return list;
}

// Holds the two readings against each other.
class comparison {
public:
    comparison(const sourcetext& read, const daemonview& taken, findings& noted)
        : source(read), view(taken), found(noted), doc(readdocument(read.text())),
          harms(doc.oddities.size())
    {
    }

    void run()
    {
        if (isnotext()) {
            return;
        }
        if (view.loaded) {
            comparetargets();
            checktargetcount();
            checkending();
        } else {
            tellfailure();
        }
        for (const writtentarget& written : doc.targets) {
            checktarget(written);
        }
        telloddities();
    }

private:
    [[nodiscard]] std::string line(std::size_t place) const
    {
        return "line " + std::to_string(source.linenumber(place));
    }

    // Of a file that is no text, nothing else is worth telling.
    [[nodiscard]] bool isnotext() const
    {
        const std::size_t place = source.text().find('\0');
        if (place == npos || !view.targets.empty()) {
            return false;
        }
        found.add("not-text", severity::error, place,
                  "the file holds bytes of value 0, as UTF-16 does and no text in UTF-8: the "
                  "daemon finds no target in it; save it as UTF-8");
        return true;
    }

    // A target as operators know it.
    [[nodiscard]] std::string titleof(const writtentarget& written) const
    {
        const std::string& name = named(written.monitored());
        return (name.empty() ? "the target" : "target " + tools::inquotes(name)) + " (" +
               line(written.begin) + ")";
    }

    // Oddities that begin in [from, to).
    [[nodiscard]] std::pair<std::size_t, std::size_t> oddwithin(std::size_t from,
                                                                std::size_t to) const
    {
        const auto before = [](const oddity& odd, std::size_t place) {
            return odd.begin < place;
        };
        const auto first = std::lower_bound(doc.oddities.begin(), doc.oddities.end(), from, before);
        const auto last = std::lower_bound(first, doc.oddities.end(), to, before);
        return {static_cast<std::size_t>(first - doc.oddities.begin()),
                static_cast<std::size_t>(last - doc.oddities.begin())};
    }

    // Puts what the daemon does otherwise down to an oddity. Without any the two readings should be
    // the same; where they are not, that is told for itself.
    void harm(std::size_t odd, std::size_t place, std::string what)
    {
        if (odd != npos) {
            harms[odd].push_back(std::move(what));
        } else {
            found.add("mismatched-tag", severity::error, place, std::move(what));
        }
    }

    // The oddity to blame for a target that is lost: what stays open inside it; else whatever is
    // inside it; else whatever is before.
    [[nodiscard]] std::size_t blamefortarget(const writtentarget& written) const
    {
        const auto [first, last] = oddwithin(written.begin, written.end);
        for (std::size_t i = first; i < last; ++i) {
            if (std::binary_search(view.neverclosed.begin(), view.neverclosed.end(),
                                   doc.oddities[i].begin)) {
                return i;
            }
        }
        if (first < last) {
            return first;
        }
        return first > 0 ? first - 1 : npos;
    }

    // The oddity to blame for something at [begin, end) of a target: inside it, else the last one
    // before it, else the first one behind it.
    [[nodiscard]] std::size_t blame(std::size_t begin, std::size_t end,
                                    const writtentarget& written) const
    {
        const auto [first, last] = oddwithin(begin, end);
        if (first < last) {
            return first;
        }
        if (first > 0 && doc.oddities[first - 1].begin >= written.begin) {
            return first - 1;
        }
        if (last < doc.oddities.size() && doc.oddities[last].begin < written.end) {
            return last;
        }
        return first > 0 ? first - 1 : npos;
    }

    // The target as written in which `place` stands, or null.
    [[nodiscard]] const writtentarget* targetat(std::size_t place) const
    {
        const auto behind = std::upper_bound(
            doc.targets.begin(), doc.targets.end(), place,
            [](std::size_t wanted, const writtentarget& each) { return wanted < each.begin; });
        if (behind == doc.targets.begin() || place >= std::prev(behind)->end) {
            return nullptr;
        }
        return &*std::prev(behind);
    }

    void comparetargets()
    {
        std::map<const writtentarget*, const targetview*> taken;
        for (const targetview& each : view.targets) {
            const writtentarget* written = targetat(each.begin);
            if (written == nullptr || !taken.emplace(written, &each).second) {
                const std::size_t before = oddwithin(0, each.end).second;
                harm(before > 0 ? before - 1 : npos, each.begin,
                     "a service named " + tools::inquotes(each.monitored.record->name) +
                         " is watched, which nobody meant");
            }
        }
        for (const writtentarget& written : doc.targets) {
            const auto each = taken.find(&written);
            if (each == taken.end()) {
                harm(blamefortarget(written), written.begin,
                     titleof(written) + " is lost: it is not watched");
            } else {
                comparetarget(written, *each->second);
            }
        }
    }

    void comparetarget(const writtentarget& written, const targetview& taken)
    {
        const writtenservice* monitored = written.monitored();
        if (monitored == nullptr) {
            tellmissingservice(written, taken);
        } else {
            compareservice(written, *monitored, taken.monitored);
        }
        std::unordered_map<std::size_t, const serviceview*> dependents;
        for (const serviceview& each : taken.dependents) {
            dependents.emplace(each.begin, &each);
        }
        std::size_t matched = 0;
        for (const writtenservice& each : written.services) {
            const auto same = dependents.find(each.begin);
            if (each.monitored) {
                continue;
            }
            if (same == dependents.end()) {
                harm(blame(each.begin, each.end, written), each.begin,
                     "dependent " + tools::inquotes(named(&each)) + " of " + titleof(written) +
                         " is lost: no recovery restarts it");
            } else {
                ++matched;
                compareservice(written, each, *same->second);
            }
        }
        if (matched < taken.dependents.size()) {
            harm(blame(written.begin, written.end, written), written.begin,
                 titleof(written) + " gets a dependent that nobody meant");
        }
    }

    void compareservice(const writtentarget& target, const writtenservice& written,
                        const serviceview& taken)
    {
        std::vector<std::size_t> unused;
        std::map<std::size_t, changedfields> changed; // by the oddity to blame
        for (std::size_t field = 0; field < kFields; ++field) {
            const writtenfield* each = written.find(field);
            const std::string& value = valueof(*taken.record, field);
            if (each != nullptr && !each->value.empty() && each->value == value) {
                continue;
            }
            if (each == nullptr && !counts(field, written.monitored)) {
                unused.push_back(field);
            } else if (each == nullptr) {
                tellmissing(written, field, taken);
            } else if (each->value.empty()) {
                tellempty(*each, written, value);
            } else {
                auto& [place, told] = changed[blame(each->begin, each->end, target)];
                place = told.empty() ? each->begin : place;
                told.push_back(std::string(nameof(field)) + " becomes " + tools::inquotes(value));
            }
        }
        for (const auto& [odd, fields] : changed) {
            harm(odd, fields.place,
                 "in " + tools::inquotes(named(&written)) + " " + listed(fields.told, ", "));
        }
        if (!unused.empty()) {
            tellunused(written, unused);
        }
    }

    // From whom a value comes that a service does not have itself.
    [[nodiscard]] std::string sourceof(std::size_t element, bool monitored) const
    {
        if (const writtentarget* target = targetat(element); target != nullptr) {
            const auto behind = std::upper_bound(
                target->services.begin(), target->services.end(), element,
                [](std::size_t wanted, const auto& each) { return wanted < each.begin; });
            if (behind != target->services.begin() && element < std::prev(behind)->end) {
                return tools::inquotes(named(&*std::prev(behind))) + " (" + line(element) + ")";
            }
        }
        return std::string(monitored ? "the service" : "the dependent") + " before it (" +
               line(element) + ")";
    }

    void tellmissing(const writtenservice& written, std::size_t field, const serviceview& taken)
    {
        const std::string& value = valueof(*taken.record, field);
        const origin& from = taken.origins.at(field);
        const std::string effect = effectof(field, value);
        std::string message = std::string(nameof(field)) + " is missing in " +
                              tools::inquotes(named(&written)) + ": ";
        if (from.element != kNoPlace) {
            message += "it is " + tools::inquotes(value) + ", as in " +
                       sourceof(from.element, written.monitored) +
                       (effect.empty() ? "" : ": " + effect);
        } else {
            const service& last = written.monitored ? monitorservice : monservicedep;
            const std::string& later = valueof(last, field);
            message += "at the start it is empty" + (effect.empty() ? "" : " (" + effect + ")");
            if (!later.empty()) {
                message += ", after a refresh " + tools::inquotes(later) + ", as in the last " +
                           (written.monitored ? "service" : "dependent") + " of the file";
            }
        }
        found.add("missing-field", severity::error, written.begin, message + "; write it here");
    }

    void tellunused(const writtenservice& written, const std::vector<std::size_t>& fields)
    {
        std::string names;
        for (const std::size_t field : fields) {
            names += (names.empty() ? "" : ", ") + std::string(nameof(field));
        }
        found.add("missing-field", severity::note, written.begin,
                  tools::inquotes(named(&written)) + " leaves out " + names +
                      ", which have no effect here");
    }

    void tellempty(const writtenfield& written, const writtenservice& in, const std::string& value)
    {
        std::string message = std::string(nameof(written.field)) + " of " +
                              tools::inquotes(named(&in)) +
                              " is empty: the daemon takes the text before it, " +
                              (value.empty() ? "and here there is none" : tools::inquotes(value));
        if (const std::string effect = effectof(written.field, value); !effect.empty()) {
            message += ": " + effect;
        }
        message += "; " + std::string(cureofempty(written.field));
        const bool used = counts(written.field, in.monitored);
        found.add("empty-field", used ? severity::error : severity::warning, written.begin,
                  std::move(message));
    }

    void tellmissingservice(const writtentarget& written, const targetview& taken)
    {
        const std::string& name = taken.monitored.record->name;
        found.add("missing-service", severity::error, written.begin,
                  "the target has no " + tag("wdmonitorservice") +
                      (name.empty() ? ": it watches a service without a name"
                                    : ": it watches " + tools::inquotes(name) +
                                          ", the service of the target before, once more"));
    }

    // What is wrong with a target whatever the daemon makes of it.
    void checktarget(const writtentarget& written)
    {
        const writtenservice* first = nullptr;
        for (const writtenservice& each : written.services) {
            checkduplicates(each);
            if (each.monitored && first != nullptr) {
                found.add("second-service", severity::error, each.begin,
                          "a second " + tag("wdmonitorservice") + " in the target of " +
                              tools::inquotes(named(first)) + ": only " +
                              tools::inquotes(named(&each)) +
                              " is watched; give it a target of its own");
            }
            first = each.monitored && first == nullptr ? &each : first;
        }
        if (first == nullptr && !view.loaded) {
            found.add("missing-service", severity::error, written.begin,
                      "the target has no " + tag("wdmonitorservice"));
        }
    }

    void checkduplicates(const writtenservice& written)
    {
        std::array<const writtenfield*, kFields> seen{};
        for (const writtenfield& each : written.fields) {
            const writtenfield*& before = seen.at(each.field);
            if (before != nullptr) {
                found.add("duplicate-field", severity::warning, each.begin,
                          std::string(nameof(each.field)) + " of " +
                              tools::inquotes(named(&written)) +
                              " stands twice: this one counts, not that of " + line(before->begin));
            }
            before = &each;
        }
    }

    void checktargetcount()
    {
        if (doc.targets.empty() && view.targets.empty()) {
            found.add("no-target", severity::error, 0,
                      source.text().empty() ? "the file is empty: nothing is watched"
                                            : "there is no target: nothing is watched");
        }
    }

    void checkending()
    {
        const std::size_t last = source.text().find_last_not_of("\n\r\t ");
        if (doc.rootend && doc.rootclosing != "wdtargets") {
            found.add("unfinished-file", severity::warning, *doc.rootend,
                      "the daemon takes this for the end of the file only without blanks: "
                      "</wdtargets>");
        } else if (!doc.rootopened && last != npos) {
            found.add("unfinished-file", severity::error, last,
                      "<wdtargets> and </wdtargets> are missing around it all");
        }
    }

    // The load ends at the first tag without a name. Where this reading saw none there, the daemon
    // saw one in something that is no tag.
    void tellfailure()
    {
        const auto [first, last] = oddwithin(view.failure, view.failure + 1);
        const auto failed = [this](std::size_t odd) {
            return doc.oddities[odd].kind == oddkind::emptytag;
        };
        for (std::size_t odd = first; odd < last; ++odd) {
            if (failed(odd)) {
                return;
            }
        }
        const std::string message =
            "the daemon finds a tag without a name here, upon which the whole load fails: nothing "
            "is watched until the next refresh";
        found.add("empty-tag", severity::error, view.failure, message);
    }

    void telloddities()
    {
        bool trailed = false;
        for (std::size_t i = 0; i < doc.oddities.size(); ++i) {
            const oddity& odd = doc.oddities[i];
            // One for all that follows the root, unless it does harm of its own.
            const bool again = odd.kind == oddkind::trailing && std::exchange(trailed, true);
            if (again && harms[i].empty()) {
                continue;
            }
            const telling as = tellingof(odd.kind);
            std::string message = tell(odd, source.text());
            if (!harms[i].empty()) {
                message += ": " + listed(harms[i], "; ");
            } else if (odd.kind == oddkind::comment && view.loaded) {
                message += ", which would lose a target that it stands in; here it does no harm";
            }
            if (const std::string cure = cureof(odd); !cure.empty()) {
                message += "; " + cure;
            }
            found.add(as.rule, harms[i].empty() ? as.harmless : severity::error, odd.begin,
                      std::move(message));
        }
    }

    const sourcetext& source;
    const daemonview& view;
    findings& found;
    const document doc;
    std::vector<std::vector<std::string>> harms; // of each oddity
};

} // namespace

void checkshape(const sourcetext& source, const daemonview& view, findings& found)
{
    comparison(source, view, found).run();
}

} // namespace check
