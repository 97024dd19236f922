// Stories for the tracker: who says what and when, as data, and what became of it, as text.
#pragma once

#include <algorithm>
#include <cstdint>
#include <string>
#include <vector>

#include "tracker.h"

namespace report {

// One message: seconds since the story's begin, the thread, and the first value.
struct line {
    std::int64_t at;
    std::uint64_t thread;
    messageid id;
    std::string first{};
};

// The level that the daemon gives to a message.
inline loglevel levelof(messageid id)
{
    switch (id) {
    case messageid::kServiceFailed:
    case messageid::kServiceUnknown:
    case messageid::kRecoveryTried:
    case messageid::kGaveUp:
    case messageid::kCheckFailed:
    case messageid::kCheckNotRecognised:
    case messageid::kFunctionalRecoveryTried:
    case messageid::kFunctionalGaveUp:
    case messageid::kLoadFailed:
    case messageid::kNoLock:
    case messageid::kNoTarget:
    case messageid::kNotConfigured:
    case messageid::kNoFigures:
        return loglevel::kError;
    case messageid::kServiceNamed:
    case messageid::kBinaryPathNamed:
    case messageid::kRecovered:
    case messageid::kFunctionallyRecovered:
    case messageid::kCheckBegins:
    case messageid::kCheckSkipped:
    case messageid::kCannotSkip:
        return loglevel::kInfo;
    case messageid::kConfigurationUnreadable:
    case messageid::kNoLog:
    case messageid::kCommandLineRefused:
        return loglevel::kStandardError;
    default:
        return loglevel::kDebug;
    }
}

inline instant at(std::int64_t seconds)
{
    constexpr std::int64_t kBegin = 1795275577;
    return {kBegin + seconds, seconds};
}

// Plays a story, and keeps what the tracker tells.
class story {
public:
    story()
        : told({[this](const event& one) { events.push_back(one), sources.push_back(one.source); },
                [this](serviceid service, const span& one) {
                    spans.resize(std::max<std::size_t>(spans.size(), service + 1U));
                    spans[service].push_back(one);
                }})
    {
    }
    explicit story(const std::vector<line>& lines) : story() { play(lines); }

    void play(const std::vector<line>& lines)
    {
        for (const line& each : lines) {
            hear(each, at(each.at));
        }
    }

    void hear(const line& each, const instant& when)
    {
        message said;
        said.id = each.id;
        said.level = levelof(each.id);
        said.thread = each.thread;
        said.when = when;
        said.first = each.first;
        said.line = ++heard;
        told.hear(said);
    }

    // "up* 0-30, suspect 30-": the spans of a service that have ended and the one that lasts, at
    // `end`; * is inferred. The story is over then.
    std::string finish(const std::string& name, std::int64_t end)
    {
        told.conclude(at(end), true);
        return spansof(name);
    }

    std::string spansof(const std::string& name) const
    {
        std::string result;
        const std::size_t service = idof(name);
        if (service < spans.size()) {
            for (const span& each : spans[service]) {
                result +=
                    (result.empty() ? "" : ", ") + shown(each) + std::to_string(each.to.elapsed);
            }
        }
        return result;
    }

    // "up* 0-": the state that a service is in, as known at `when`; the story may go on.
    std::string now(const std::string& name, std::int64_t when)
    {
        told.conclude(at(when), false);
        return shown(of(name).now);
    }

    account of(const std::string& name) const { return told.accountof(idof(name)); }

    // All services, in the order in which the log names them.
    std::vector<account> accounts() const
    {
        std::vector<account> result;
        for (serviceid service = 0; service < told.services(); ++service) {
            result.push_back(told.accountof(service));
        }
        return result;
    }

    // The names, in order.
    std::vector<std::string> names() const
    {
        std::vector<std::string> result;
        for (serviceid service = 0; service < told.services(); ++service) {
            result.emplace_back(told.nameof(service));
        }
        return result;
    }

    // "30 web failed suspect": the events of these kinds; * is inferred, - no service.
    std::vector<std::string> happened(const std::vector<eventkind>& kinds) const
    {
        std::vector<std::string> result;
        for (const event& each : events) {
            if (std::find(kinds.begin(), kinds.end(), each.kind) != kinds.end()) {
                result.push_back(shown(each));
            }
        }
        return result;
    }

    tracker& teller() { return told; }
    const std::vector<event>& allevents() const { return events; }
    const std::vector<std::vector<span>>& allspans() const { return spans; }

private:
    serviceid idof(const std::string& name) const
    {
        const std::vector<std::string> all = names();
        const auto found = std::find(all.begin(), all.end(), name);
        return static_cast<serviceid>(found - all.begin());
    }

    static std::string shown(const span& one)
    {
        return std::string(wordof(one.what)) + (one.inferred ? "* " : " ") +
               std::to_string(one.from.elapsed) + "-";
    }

    std::string shown(const event& one) const
    {
        std::string result = std::to_string(one.when.elapsed) + " ";
        result += one.service ? told.nameof(*one.service) : "-";
        result += " " + std::string(wordof(one.kind));
        if (one.became) {
            result += " " + std::string(wordof(*one.became));
        }
        return result + (one.inferred ? "*" : "");
    }

    std::vector<event> events; // their sources are dead
    std::vector<const message*> sources;
    std::vector<std::vector<span>> spans;
    std::uint64_t heard = 0;
    tracker told;
};

} // namespace report
