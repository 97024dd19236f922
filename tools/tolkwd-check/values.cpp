#include "values.h"

#include "valuechecks.h"

namespace check {

void checkvalues(const daemonview& view, findings& found)
{
    for (const targetview& target : view.targets) {
        checkcommands(target.monitored, true, found);
        checknumbers(target.monitored, found);
        for (const serviceview& dependent : target.dependents) {
            checkcommands(dependent, false, found);
        }
    }
    checknames(view, found);
}

} // namespace check
