// Does one kind of the daemon's work so many times, for compare.py to count the instructions of.
//
//   bench_counts --describe           the units, and what this program was built with, as JSON
//   bench_counts --prepare            what the units need, in the current folder
//   bench_counts UNIT REPETITIONS     in that folder, with "." first in PATH
//
// Ends with an error where the work was not done as expected. To look at that costs the same for
// any number of repetitions, or next to nothing.
#include <algorithm>
#include <array>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iostream>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include <gnu/libc-version.h>
#include <pthread.h>

#include <nlohmann/json.hpp>

#include "ProcessStatistics_Linux.h"
#include "steady.h"
#include "wdlogbuffer.h"
#include "wdmonitorthread_linux.h"
#include "wdsettings.h"
#include "xmlparser.h"

namespace {

using nlohmann::json;

constexpr const char* kModule = "wdmonitorthread";
constexpr const char* kLog = "log";

// Pings and checks of one monitor are a minute apart.
constexpr int kInterval = 60;

void expect(bool condition, const char* otherwise)
{
    if (!condition) {
        throw std::runtime_error(otherwise);
    }
}

void writefile(const std::string& path, std::string_view text)
{
    expect(bool(std::ofstream(path) << text << std::flush), "cannot write");
}

void writecommand(const std::string& path, const std::string& body)
{
    writefile(path, "#!/bin/sh\n" + body + "\n");
    std::filesystem::permissions(path, std::filesystem::perms::owner_all);
}

wdmonitorthread makemonitor()
{
    wdmonitortarget watched;
    watched.monitoredservice.name = "web";
    watched.monitoredservice.functionalpingcmd = "service web status";
    return wdmonitorthread(watched);
}

std::uintmax_t logbytes()
{
    return std::filesystem::file_size(kLog);
}

// Runs `write` so many times; all lines must have been written, and be of one length.
void writelines(int repetitions, const std::function<void()>& write)
{
    write();
    const std::uintmax_t linebytes = logbytes();
    for (int i = 1; i < repetitions; ++i) {
        write();
    }
    expect(linebytes > 0 && logbytes() == linebytes * static_cast<unsigned>(repetitions),
           "a log line is missing");
}

void writetext(int repetitions)
{
    writelines(repetitions, [] {
        wdlog(kModule, kLevelInfo, "Name of the service being monitored: ", "redis-server");
    });
}

void writenumber(int repetitions)
{
    writelines(repetitions, [] { wdlog(kModule, kLevelInfo, "General ping sleep ", 60L); });
}

void leaveout(int repetitions)
{
    for (int i = 0; i < repetitions; ++i) {
        wdlog(kModule, kLevelDebug, "General ping successful!");
    }
    expect(logbytes() == 0, "a line was written that should have been left out");
}

void pinggenerally(int repetitions)
{
    wdmonitorthread monitor = makemonitor();
    service asked;
    asked.name = "web";
    for (int i = 0; i < repetitions; ++i) {
        expect(monitor.generalping(asked) == kServiceRunning, "a ping failed");
        passseconds(kInterval);
    }
}

void pingfunctionally(int repetitions)
{
    wdmonitorthread monitor = makemonitor();
    for (int i = 0; i < repetitions; ++i) {
        expect(monitor.functionalping() == kAnswerCorrect, "a check failed");
        passseconds(kInterval);
    }
}

void checkthresholds(int repetitions)
{
    ProcessStatistics statistics("/usr/bin/redis-server");
    statistics.SetThresholdAverageCPUUsage("90000");
    statistics.SetThresholdMemoryUsage("262144");
    statistics.SetThresholdThreadCount("200");
    for (int i = 0; i < repetitions; ++i) {
        expect(!statistics.IsThresholdReached(), "a threshold is reached");
        passseconds(kInterval);
    }
    expect(figuresopened() == repetitions, "the figures are not read by open() or fopen()");
    expect(logbytes() == 0, "the figures could not be read");
}

// A configuration for each number of targets.
std::string configurationof(int targets)
{
    return "configuration." + std::to_string(targets);
}

void load(int repetitions)
{
    xmlparser::parse(configurationof(repetitions));
    expect(xmlparser::alltargets.size() == static_cast<std::size_t>(repetitions) &&
               xmlparser::allservices.size() == 2 * static_cast<std::size_t>(repetitions),
           "a target is missing");
}

struct Unit {
    const char* name;
    const char* title;
    int repetitions;
    void (*work)(int repetitions);
};

constexpr auto kUnits = std::to_array<Unit>({
    {"log-text", "a log line, text only", 500, writetext},
    {"log-number", "a log line with a number", 500, writenumber},
    {"log-left-out", "a DEBUG line that is left out", 500, leaveout},
    {"ping", "a general ping", 10, pinggenerally},
    {"check", "a functional ping", 10, pingfunctionally},
    {"thresholds", "a look at the thresholds", 10, checkthresholds},
    {"load", "loading a target with one dependent", 100, load},
});

std::string fieldsof(const std::string& name)
{
    const auto field = [](const std::string& key, const std::string& value) {
        return "      <" + key + ">" + value + "</" + key + ">\n";
    };
    return field("name", name) + field("binarypath", "/usr/sbin/" + name) +
           field("startcmd", "timeout 60 service " + name + " start") +
           field("stopcmd", "timeout 60 service " + name + " stop") +
           field("functionalpingcmd", kNoCommand) + field("genpinginterval", "60") +
           field("funpinginterval", "60") + field("maxattemptofwakeup", "3") +
           field("messageformat", "plain") + field("hackmessagehandler", kNoCommand) +
           field("sendmessagehandler", kNoCommand) + field("MaxFPSkips", "5") +
           field("ThresholdAverageCPUUsage", "90000") + field("ThresholdMemoryUsage", "262144") +
           field("ThresholdThreadCount", "200") + field("ThresholdHandleCount", "1000");
}

void writeconfiguration(int targets)
{
    constexpr int kFirst = 1000; // names of one length
    std::string text = "<?xml version='1.0'?>\n<wdtargets>\n";
    for (int i = kFirst; i < kFirst + targets; ++i) {
        text += "  <wdmonitortarget>\n    <wdmonitorservice>\n";
        text += fieldsof("web" + std::to_string(i));
        text += "    </wdmonitorservice>\n    <wdmondependsev>\n";
        text += fieldsof("dep" + std::to_string(i));
        text += "    </wdmondependsev>\n  </wdmonitortarget>\n";
    }
    writefile(configurationof(targets), text + "</wdtargets>\n");
}

void prepare()
{
    writecommand("service", "echo running");
    writecommand("pidof", std::string("echo ") + kWatchedProcess);
    writefile(kFigures, std::string(kWatchedProcess) +
                            " (redis-server) S 1 4242 4242 0 -1 4194560 2894 1207 12 0 1523 842 0 "
                            "0 20 0 5 0 3124518 64823296 2301 18446744073709551615 94251046690816 "
                            "94251047815485 140724603453440 0 0 0 0 4097 17610 0 0 0 17 1 0 0 0 0 "
                            "0 94251048296144 94251048480472 94251065618432 140724603455214 "
                            "140724603455244 140724603455244 140724603457508 0\n");
    for (const Unit& unit : kUnits) {
        if (unit.work == load) {
            writeconfiguration(unit.repetitions);
            writeconfiguration(2 * unit.repetitions);
        }
    }
}

json describe()
{
    json units = json::array();
    for (const Unit& unit : kUnits) {
        units.push_back(
            {{"name", unit.name}, {"title", unit.title}, {"repetitions", unit.repetitions}});
    }
    return {{"units", units},
            {"built",
             {{"compiler", __VERSION__},
              {"libc", gnu_get_libc_version()},
              {"libstdc++", std::to_string(__GLIBCXX__)},
              {"build type", BUILD_TYPE}}}};
}

void work(const std::string& name, int repetitions)
{
    const auto* const unit = std::find_if(kUnits.begin(), kUnits.end(),
                                          [&](const Unit& known) { return known.name == name; });
    expect(unit != kUnits.end(), "no such unit");
    wdLocalLog::logFilePath = kLog;
    writefile(kLog, "");
    _tmp_file_path = "./";
    pthread_rwlock_init(&pingreclock, nullptr);
    unit->work(repetitions);
}

} // namespace

int main(int argc, char** argv)
{
    const std::vector<std::string> arguments(argv + 1, argv + argc);
    try {
        if (arguments == std::vector<std::string>{"--describe"}) {
            std::cout << describe().dump() << '\n';
        } else if (arguments == std::vector<std::string>{"--prepare"}) {
            prepare();
        } else {
            expect(arguments.size() == 2, "usage: bench_counts UNIT REPETITIONS");
            work(arguments[0], std::stoi(arguments[1]));
        }
    } catch (const std::exception& fault) {
        std::cerr << fault.what() << '\n';
        return EXIT_FAILURE;
    }
    return EXIT_SUCCESS;
}
