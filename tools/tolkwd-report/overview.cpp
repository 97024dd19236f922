#include "overview.h"

#include <ctime>
#include <memory>
#include <system_error>
#include <utility>

#include "printable.h"
#include "sources.h"

namespace report {

overview readoverview(const std::vector<std::string>& names, bool asofnow, witness told)
{
    const auto model = std::make_shared<tracker>(std::move(told));
    logreader reader(wanted::kWhatMatters, [&model](const message& said) { model->hear(said); });
    readingalog([&] { readlogs(names, reader); });
    overview result{.files = names, .count = reader.count(), .asofnow = asofnow};
    result.present = reader.at(std::time(nullptr));
    result.judged = asofnow ? result.present : result.count.last;
    model->conclude(result.judged, true);
    result.services = model->services();
    result.nameof = [model](serviceid service) {
        return model->nameof(service);
    };
    result.accountof = [model](serviceid service) {
        return model->accountof(service);
    };
    result.loadfailed = model->loadfailed();
    return result;
}

void readingalog(const std::function<void()>& reading)
{
    try {
        reading();
    } catch (const std::system_error& error) {
        throw unreadablelog(tools::printable(error.what()));
    }
}

} // namespace report
