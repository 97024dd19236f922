#include "valuechecks.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdint>
#include <string>
#include <string_view>
#include <system_error>

#include <unistd.h>

#include "ProcessStatistics_Linux.h"
#include "fields.h"
#include "units.h"
#include "wdmonitorthread_linux.h"

namespace check {

namespace {

enum class numberkind { kPause, kAttempts, kSkips, kThreshold, kNothing };

struct numberfield {
    field which;
    numberkind kind;
    std::string_view zero; // what 0 does
    std::string_view cure;
};

constexpr std::string_view kSeconds = "write a number of seconds";

constexpr std::array kNumberFields = {
    numberfield{&service::genpinginterval, numberkind::kPause,
                "no pause at the end of a round and after a recovery", kSeconds},
    numberfield{&service::funpinginterval, numberkind::kPause, "no pause after a check", kSeconds},
    numberfield{&service::maxattemptofwakeup, numberkind::kAttempts,
                "the service is never asked and given up at once", "write 2 or more"},
    numberfield{&service::MaxFPSkips, numberkind::kSkips,
                "no check is left out, and the thresholds are not looked at",
                "write a number of checks"},
    numberfield{&service::ThresholdAverageCPUUsage, numberkind::kThreshold,
                "the service counts as busy from its first tick on",
                "write a number, 1000 for each per cent of a processor"},
    numberfield{&service::ThresholdMemoryUsage, numberkind::kThreshold,
                "the service always counts as busy", "write a number of pages"},
    numberfield{&service::ThresholdThreadCount, numberkind::kThreshold,
                "the service always counts as busy", "write a number of threads"},
    numberfield{&service::ThresholdHandleCount, numberkind::kNothing, "", ""},
};

constexpr std::int64_t kSecondsInYear = 31556952;
constexpr int kPercentAtMost = 100;
constexpr std::int64_t kMebibyte = std::int64_t{1} << 20;
constexpr std::int64_t kTebibyte = std::int64_t{1} << 40;
constexpr const char* kNeverReached = "2147483647";

// The value's text, cut as strtol and a stream cut it.
struct written {
    std::string_view digits; // empty: no number
    std::string_view rest;   // behind them
    bool fits = true;        // into an int
};

written cut(std::string_view text)
{
    std::size_t begin = std::min(text.find_first_not_of(" \t\n\v\f\r"), text.size());
    if (begin < text.size() && (text[begin] == '-' || text[begin] == '+')) {
        ++begin;
    }
    const std::size_t end = std::min(text.find_first_not_of("0123456789", begin), text.size());
    written result{text.substr(begin, end - begin), text.substr(end)};
    int value = 0;
    const auto* const last = result.digits.data() + result.digits.size();
    result.fits =
        std::from_chars(result.digits.data(), last, value).ec != std::errc::result_out_of_range;
    return result;
}

// What the daemon takes it for.
std::int64_t numberof(const serviceview& view, const numberfield& known)
{
    const std::string& text = view.record->*known.which;
    return known.kind == numberkind::kPause || known.kind == numberkind::kAttempts
               ? settingnumber(text)
               : Utility::str2int(text);
}

// Whether the daemon does anything with it.
bool isused(const service& record, const numberfield& known)
{
    switch (known.kind) {
    case numberkind::kPause:
        return known.which == &service::genpinginterval || ischecked(record);
    case numberkind::kAttempts:
        return true;
    case numberkind::kSkips:
        return ischecked(record);
    case numberkind::kThreshold:
        return looksatthresholds(record);
    case numberkind::kNothing:
        break;
    }
    return false;
}

// At least one number; the daemon reads the digits at its beginning.
class numbercheck {
public:
    numbercheck(const serviceview& checked, const numberfield& looked, findings& collected)
        : view(checked), known(looked), found(collected), number(numberof(checked, looked)),
          text(cut(checked.record->*looked.which))
    {
    }

    void run()
    {
        if (!isused(*view.record, known)) {
            checkunused();
            return;
        }
        if (text.digits.empty()) {
            add("not-a-number", severity::error,
                ", which has no number at its beginning and so is 0: " + std::string(known.zero) +
                    "; " + std::string(known.cure));
            return;
        }
        if (!text.rest.empty()) {
            add("not-a-number", severity::warning,
                ", of which the daemon takes " + std::to_string(number) +
                    " and ignores the rest; " + std::string(known.cure));
        }
        if (!text.fits && number > 0) {
            checkrange();
        } else {
            checkvalue();
        }
    }

private:
    void add(std::string_view rule, severity level, const std::string& message)
    {
        found.add(rule, level, placeof(view, known.which), valueof(view, known.which) + message);
    }

    void checkunused()
    {
        if (text.digits.empty() || !text.rest.empty()) {
            add("not-a-number", severity::note,
                ", which is not a number alone; here the daemon does nothing with it");
        }
    }

    void checkrange()
    {
        if (known.kind == numberkind::kAttempts) {
            add("number-range", severity::warning,
                ", which is so large a number that the service is never given up");
            return;
        }
        std::string becomes = std::to_string(number);
        if (known.kind == numberkind::kPause) {
            const unsigned pause = pauseseconds(number);
            becomes = "a pause of " + std::to_string(pause) + " seconds, " +
                      std::to_string(pause / kSecondsInYear) + " years";
        }
        add("number-range", severity::error,
            ", which is too large a number: the daemon makes it " + becomes);
    }

    void checkvalue()
    {
        switch (known.kind) {
        case numberkind::kPause:
            checkpause();
            break;
        case numberkind::kAttempts:
            checkattempts();
            break;
        case numberkind::kSkips:
            checkskips();
            break;
        case numberkind::kThreshold:
            checkthreshold();
            break;
        case numberkind::kNothing:
            break;
        }
    }

    void checkpause()
    {
        if (number < 0) {
            add("negative-number", severity::warning,
                ", and a negative interval is 0: " + std::string(known.zero));
        }
        const service& record = *view.record;
        if (number == 0 && known.which == &service::genpinginterval &&
            (!ischecked(record) || settingnumber(record.funpinginterval) <= 0)) {
            add("interval-zero", severity::warning,
                ", and there is no other pause: one ping follows the other without end; "
                "write the seconds between two of them");
        }
    }

    void checkattempts()
    {
        if (number == 0) {
            add("attempts-zero", severity::error,
                ": the service is never asked and given up at once; write 2 or more");
        } else if (number == 1) {
            add("attempts-one", severity::warning,
                ": after its only recovery the service is given up without another look, even if "
                "it runs again; write 2 to rely on one recovery, 3 to rely on two");
        } else if (number < 0) {
            add("attempts-negative", severity::error,
                ": the service is never asked, and its monitor keeps a processor busy; write 2 or "
                "more");
        }
    }

    void checkskips()
    {
        if (number < 0) {
            add("skips-negative", severity::warning,
                ": while the service is busy its check is left out without end; write how many "
                "checks in a row may be left out");
        }
    }

    void checkthreshold()
    {
        if (!text.rest.empty()) {
            return; // another number is meant
        }
        if (number < 0) {
            add("negative-number", severity::warning,
                ", and every figure is above it: the service always counts as busy, and checks are "
                "left out");
        } else if (number == 0) {
            add("threshold-zero", severity::warning,
                ", which does not switch it off: " + std::string(known.zero) +
                    ", and checks are left out; to leave this figure out, write " + kNeverReached);
        } else if (known.which == &service::ThresholdAverageCPUUsage) {
            checkprocessor();
        } else if (known.which == &service::ThresholdMemoryUsage) {
            checkmemory();
        }
    }

    void checkprocessor()
    {
        if (number > kPercentAtMost) {
            return;
        }
        const auto perpercent = std::int64_t{10} * sysconf(_SC_CLK_TCK);
        add("threshold-unit", severity::warning,
            ", which is " + shortnumber(processorpercent(static_cast<double>(number))) +
                " % of one processor; " + std::to_string(number) + " % would be " +
                std::to_string(number * perpercent));
    }

    void checkmemory()
    {
        const std::int64_t page = sysconf(_SC_PAGESIZE);
        if (number <= kPercentAtMost) {
            add("threshold-unit", severity::warning,
                ", and counts pages, not per cent: " + std::to_string(number * page / 1024) +
                    " KiB, which most processes have; 1 GiB would be " +
                    std::to_string((kMebibyte << 10) / page));
        } else if (number * page >= kTebibyte && number % kMebibyte == 0) {
            add("threshold-unit", severity::warning,
                ", and counts pages, not bytes: " +
                    shortnumber(static_cast<double>(number * page) /
                                static_cast<double>(kTebibyte)) +
                    " TiB; " + std::to_string(number / kMebibyte) + " MiB would be " +
                    std::to_string(number / page));
        }
    }

    const serviceview& view;
    const numberfield& known;
    findings& found;
    std::int64_t number;
    written text;
};

} // namespace

void checknumbers(const serviceview& view, findings& found)
{
    for (const numberfield& known : kNumberFields) {
        if (isown(view, known.which)) {
            numbercheck(view, known, found).run();
        }
    }
}

} // namespace check
