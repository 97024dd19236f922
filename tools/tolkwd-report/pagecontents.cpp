#include "pagecontents.h"

#include <algorithm>
#include <utility>

#include "overview.h"
#include "words.h"

namespace report {

namespace {

// What stands out on a time line; its colours tell the rest.
bool ismarked(const event& what) noexcept
{
    switch (what.kind) {
    case eventkind::kFailed:
    case eventkind::kRecoveryTried:
    case eventkind::kRecovered:
    case eventkind::kGaveUp:
        return true;
    case eventkind::kState:
    case eventkind::kUnknown:
        return what.became.has_value();
    default:
        return false;
    }
}

// Collects what happens, service by service.
class collector {
public:
    witness ears()
    {
        return {.happened = [this](const event& what) { note(what); },
                .ended =
                    [this](serviceid service, const span& over) {
                        spans.resize(std::max<std::size_t>(spans.size(), service + std::size_t{1}));
                        spans[service].push_back(over);
                    }};
    }

    pagecontents contents(overview seen) &&
    {
        spans.resize(seen.services);
        pagecontents result;
        result.files = std::move(seen.files);
        result.count = seen.count;
        result.loadfailed = seen.loadfailed;
        result.services.reserve(seen.services);
        for (serviceid service = 0; service < seen.services; ++service) {
            result.services.push_back({seen.accountof(service), std::move(spans[service])});
        }
        // An inferred event is told later than it happened.
        std::stable_sort(marks.begin(), marks.end(),
                         [](const pagemark& one, const pagemark& other) {
                             return secondsbetween(one.when, other.when) > 0;
                         });
        result.marks = std::move(marks);
        return result;
    }

private:
    void note(const event& what)
    {
        if (what.service && ismarked(what)) {
            marks.push_back(
                {*what.service, what.kind, what.when, what.inferred, story.wordsof(what)});
        } else {
            story.passover(what);
        }
    }

    narrator story;
    std::vector<std::vector<span>> spans; // by service
    std::vector<pagemark> marks;
};

} // namespace

pagecontents readpage(const std::vector<std::string>& names, bool asofnow)
{
    collector all;
    overview seen = readoverview(names, asofnow, all.ears());
    return std::move(all).contents(std::move(seen));
}

} // namespace report
