#include "probe.h"

#include <nlohmann/json.hpp>

namespace check {

std::vector<targetprobe> probetargets(const daemonview& view, findings& /*found*/)
{
    return std::vector<targetprobe>(view.targets.size());
}

std::vector<durations> durationsof(const std::vector<targetprobe>& probes)
{
    return std::vector<durations>(probes.size());
}

void writeprobe(std::ostream& /*out*/, const std::vector<targetprobe>& /*probes*/, bool /*colour*/)
{
}

nlohmann::ordered_json probejson(const std::vector<targetprobe>& /*probes*/)
{
    return nlohmann::ordered_json::array();
}

} // namespace check
