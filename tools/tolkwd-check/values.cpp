#include "values.h"

namespace check {

void checkvalues(const daemonview& /*view*/, findings& /*found*/) {}

} // namespace check
