#include "meaning.h"

#include "daemonview.h"
#include "wdmonitorthread_linux.h"

namespace check {

namespace {

bool isone(std::size_t field, std::string service::*one)
{
    return kFieldElements.at(field).field == one;
}

std::string effectofcommand(std::size_t field, const std::string& value)
{
    if (value == kNoCommand) {
        return isone(field, &service::functionalpingcmd) ? "there is no check"
                                                         : "the service command is used";
    }
    if (value == ">") {
        return "a command that the shell does not understand";
    }
    if (!value.empty()) {
        return "";
    }
    if (isone(field, &service::functionalpingcmd)) {
        return "a check that says nothing and so fails for ever";
    }
    return isone(field, &service::startcmd) ? "nothing starts the service"
                                            : "nothing stops the service";
}

std::string effectofnumber(std::size_t field, long number)
{
    if (isone(field, &service::maxattemptofwakeup)) {
        return number == 0  ? "0: the service is given up at once and never asked"
               : number < 0 ? "the service is never asked, and a processor is kept busy"
                            : "";
    }
    if (isone(field, &service::genpinginterval)) {
        return number <= 0 ? "0: no pause between pings" : "";
    }
    if (isone(field, &service::funpinginterval)) {
        return number <= 0 ? "0: no pause after a check" : "";
    }
    if (isone(field, &service::MaxFPSkips)) {
        return number == 0 ? "0: no check is ever left out" : "";
    }
    return number <= 0 ? "0: always exceeded" : "";
}

} // namespace

bool counts(std::size_t field, bool monitored) noexcept
{
    const auto which = kFieldElements.at(field).field;
    if (which == &service::name || which == &service::startcmd || which == &service::stopcmd) {
        return true;
    }
    return monitored && which != &service::messageformat && which != &service::hackmessagehandler &&
           which != &service::sendmessagehandler && which != &service::ThresholdHandleCount;
}

std::string effectof(std::size_t field, const std::string& value)
{
    const std::string_view name = kFieldElements.at(field).name;
    if (isone(field, &service::name)) {
        return value.empty() ? "a service without a name" : "";
    }
    if (name.ends_with("cmd")) {
        return effectofcommand(field, value);
    }
    if (isone(field, &service::binarypath) || !counts(field, true)) {
        return "";
    }
    return effectofnumber(field, settingnumber(value));
}

std::string_view cureofempty(std::size_t field) noexcept
{
    const std::string_view name = kFieldElements.at(field).name;
    if (isone(field, &service::name)) {
        return "write the service's name";
    }
    if (isone(field, &service::binarypath)) {
        return "write the path of its program";
    }
    if (name.ends_with("cmd")) {
        return isone(field, &service::functionalpingcmd) ? "write NULL for no check"
                                                         : "write NULL for the service command";
    }
    return counts(field, true) || isone(field, &service::ThresholdHandleCount) ? "write a number"
                                                                               : "write NULL";
}

} // namespace check
