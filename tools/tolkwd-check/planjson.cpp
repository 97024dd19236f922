#include "plan.h"

#include <nlohmann/json.hpp>

#include "textjson.h"

namespace check {

namespace {

using nlohmann::ordered_json;

ordered_json timejson(const plannedtime& time)
{
    return {{"seconds", time.seconds}, {"checks", time.checks}, {"recoveries", time.recoveries}};
}

ordered_json timejson(const std::optional<plannedtime>& time)
{
    return time ? timejson(*time) : ordered_json(nullptr);
}

std::string_view wordof(watching state)
{
    switch (state) {
    case watching::givenup:
        return "given up";
    case watching::spinning:
        return "spinning";
    case watching::kept:
        break;
    }
    return "watched";
}

std::string_view wordof(busyness busy)
{
    switch (busy) {
    case busyness::overthreshold:
        return "over threshold";
    case busyness::always:
        return "always";
    case busyness::never:
        break;
    }
    return "never";
}

ordered_json checkjson(const std::optional<checkplan>& check)
{
    if (!check) {
        return nullptr;
    }
    return {{"command", tools::textjson(check->command)},
            {"every", timejson(check->every)},
            {"skips", check->skips < 0 ? ordered_json(nullptr) : ordered_json(check->skips)},
            {"busy", wordof(check->busy)},
            {"unnoticed", timejson(check->unnoticed)},
            {"thresholds",
             {{"processorpercent", check->processorpercent},
              {"memorybytes", check->memorybytes},
              {"threads", check->threads}}}};
}

ordered_json stepjson(const recoverystep& step)
{
    return {{"service", tools::textjson(step.service)},
            {"does", step.stops ? "stop" : "start"},
            {"command", tools::textjson(step.command)},
            {"unless", step.unlessdown ? ordered_json("down") : ordered_json(nullptr)}};
}

template <typename Items, typename Make>
ordered_json listjson(const Items& items, Make make)
{
    ordered_json list = ordered_json::array();
    for (const auto& item : items) {
        list.push_back(make(item));
    }
    return list;
}

ordered_json recoveryjson(const recoveryplan& recovery)
{
    return {{"number", recovery.number},
            {"noticed", timejson(recovery.noticed)},
            {"retries",
             listjson(recovery.retries, [](const plannedtime& retry) { return timejson(retry); })},
            {"begins", timejson(recovery.begins)},
            {"again", timejson(recovery.again)},
            {"recovered", timejson(recovery.recovered)}};
}

ordered_json outagejson(const outageplan& outage)
{
    return {{"kind", outage.functional ? "functional" : "general"},
            {"noticed", timejson(outage.noticed)},
            {"round", timejson(outage.round)},
            {"recoveries", listjson(outage.recoveries, recoveryjson)},
            {"givenup", timejson(outage.givenup)},
            {"unproven", outage.unproven},
            {"log",
             {{"noticed", tools::textjson(outage.log.noticed)},
              {"begins", tools::textjson(outage.log.begins)},
              {"recovered", tools::textjson(outage.log.recovered)},
              {"givenup", tools::textjson(outage.log.givenup)}}}};
}

ordered_json targetjson(const targetplan& plan)
{
    return {{"name", tools::textjson(plan.name)},
            {"program", tools::textjson(plan.program)},
            {"state", wordof(plan.state)},
            {"attempts", plan.attempts},
            {"status",
             {{"command", tools::textjson(plan.statuscommand)}, {"every", timejson(plan.every)}}},
            {"check", checkjson(plan.check)},
            {"recovery", listjson(plan.recovery, stepjson)},
            {"outages", listjson(plan.outages, outagejson)},
            {"refresh", {{"seconds", plan.refresh}, {"others", plan.othersround.value_or(0)}}}};
}

} // namespace

ordered_json planjson(const std::vector<targetplan>& plan)
{
    return listjson(plan, targetjson);
}

} // namespace check
