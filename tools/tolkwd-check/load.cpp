#include "load.h"

namespace check {

void checkload(const daemonview& /*view*/, const std::vector<durations>& /*measured*/,
               findings& /*found*/)
{
}

} // namespace check
