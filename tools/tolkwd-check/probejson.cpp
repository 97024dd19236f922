#include "probe.h"

#include <nlohmann/json.hpp>

#include "textjson.h"
#include "wdmonitorthread_linux.h"

namespace check {

namespace {

using nlohmann::ordered_json;

std::string_view statusword(int result)
{
    switch (result) {
    case kServiceRunning:
        return "running";
    case kServiceNotRunning:
        return "not running";
    case kServiceUnknown:
        return "unknown";
    default:
        return "unclear";
    }
}

std::string_view checkword(int result)
{
    switch (result) {
    case kAnswerCorrect:
        return "works";
    case kAnswerException:
        return "exception";
    case kCommandNotFound:
        return "missing";
    default:
        return "unclear";
    }
}

ordered_json commandjson(const commandprobe& tried, std::string_view result)
{
    return {{"command", tools::textjson(tried.command)},
            {"line", tools::textjson(tried.firstline)},
            {"readable", tried.readable},
            {"exit-status", tried.state < 0 ? ordered_json() : ordered_json(tried.state)},
            {"seconds", tried.seconds},
            {"result", result},
            {"reason", tried.reason}};
}

ordered_json figurejson(const figureprobe& figure)
{
    return {{"value", figure.value ? ordered_json(*figure.value) : ordered_json()},
            {"threshold", figure.threshold}};
}

ordered_json processjson(const processprobe& process)
{
    return {{"pid", process.pid != 0 ? ordered_json(process.pid) : ordered_json()},
            {"counts", process.counts},
            {"busy", process.busy()},
            {"threads", figurejson(process.threads)},
            {"memory", figurejson(process.memory)},
            {"processor", figurejson(process.processor)}};
}

} // namespace

ordered_json probejson(const std::vector<targetprobe>& probes)
{
    ordered_json list = ordered_json::array();
    for (const targetprobe& probe : probes) {
        list.push_back(
            {{"name", tools::textjson(probe.name)},
             {"status", commandjson(probe.status, statusword(probe.status.result))},
             {"check", probe.check ? commandjson(*probe.check, checkword(probe.check->result))
                                   : ordered_json()},
             {"process", processjson(probe.process)}});
    }
    return list;
}

} // namespace check
