// The daemon's classes as a caller knows them: their records hold plain strings, and everything has
// the types that a caller's code is written for. Most of this fails by not compiling.

#include <map>
#include <set>
#include <sstream>
#include <stack>
#include <string>
#include <type_traits>
#include <unordered_map>
#include <utility>
#include <vector>

#include <pthread.h>

#include <gtest/gtest.h>

#include "ProcessStatistics_Linux.h"
#include "wdLocalLog_linux.h"
#include "wdlogbuffer.h"
#include "wdmain.h"
#include "wdmanager_linux.h"
#include "wdmonitortarget.h"
#include "wdmonitorthread_linux.h"
#include "wdsettings.h"
#include "wdxmlparserhandler.h"
#include "xmlparser.h"

namespace {

template <auto field>
constexpr bool isstringfield = std::is_same_v<decltype(field), std::string service::*>;

static_assert(isstringfield<&service::name>);
static_assert(isstringfield<&service::binarypath>);
static_assert(isstringfield<&service::startcmd>);
static_assert(isstringfield<&service::stopcmd>);
static_assert(isstringfield<&service::functionalpingcmd>);
static_assert(isstringfield<&service::genpinginterval>);
static_assert(isstringfield<&service::funpinginterval>);
static_assert(isstringfield<&service::maxattemptofwakeup>);
static_assert(isstringfield<&service::messageformat>);
static_assert(isstringfield<&service::hackmessagehandler>);
static_assert(isstringfield<&service::sendmessagehandler>);
static_assert(isstringfield<&service::MaxFPSkips>);
static_assert(isstringfield<&service::ThresholdAverageCPUUsage>);
static_assert(isstringfield<&service::ThresholdMemoryUsage>);
static_assert(isstringfield<&service::ThresholdThreadCount>);
static_assert(isstringfield<&service::ThresholdHandleCount>);
static_assert(std::is_aggregate_v<service>);
static_assert(std::is_aggregate_v<wdmonitortarget>);

// Types of everything else that has a name.
template <typename Expected, typename Actual>
constexpr bool is = std::is_same_v<Expected, Actual>;

static_assert(is<std::string, decltype(configPath)>);
static_assert(is<std::string, decltype(wdlocallogpath)>);
static_assert(is<int, decltype(globalrefresh)>);
static_assert(is<bool, decltype(debugenable)>);
static_assert(is<std::string, decltype(_tmp_file_path)>);
static_assert(is<int, decltype(globalenable)>);
static_assert(is<pthread_rwlock_t, decltype(pingreclock)>);
static_assert(is<const char[20], decltype(control)>);
static_assert(is<std::vector<service>, decltype(xmlparser::allservices)>);
static_assert(is<std::vector<wdmonitortarget>, decltype(xmlparser::alltargets)>);
static_assert(is<std::stack<std::string>, decltype(xercecstack)>);
static_assert(is<std::string, decltype(charparse)>);
static_assert(is<service, decltype(monitorservice)>);
static_assert(is<service, decltype(monservicedep)>);
static_assert(is<std::vector<service>, decltype(monservicedepends)>);
static_assert(is<wdmonitortarget, decltype(target)>);
static_assert(is<std::string, decltype(wdLocalLog::logFilePath)>);

static_assert(is<int (*)(std::string), decltype(&xmlparser::parse)>);
static_assert(is<void (*)(const std::string&), decltype(&startElement)>);
static_assert(is<void (*)(const std::string&), decltype(&characters)>);
static_assert(is<void (*)(const std::string&), decltype(&endElement)>);
static_assert(is<void (*)(), decltype(&endDocument)>);
static_assert(is<void (*)(std::string, int, std::string), decltype(&wdLocalLog::LogMessage)>);
static_assert(is<void* (*)(void*), decltype(&wdmonitorthread::threadfunc)>);
static_assert(is<int (wdmonitorthread::*)(), decltype(&wdmonitorthread::create)>);
static_assert(is<void (wdmonitorthread::*)(), decltype(&wdmonitorthread::join)>);
static_assert(is<int (wdmonitorthread::*)(int), decltype(&wdmonitorthread::generalrecover)>);
static_assert(is<int (wdmonitorthread::*)(), decltype(&wdmonitorthread::functionalping)>);
static_assert(is<int (wdmonitorthread::*)(), decltype(&wdmonitorthread::functionalrecover)>);
static_assert(is<bool (wdmonitorthread::*)(), decltype(&wdmonitorthread::IsPingable)>);
static_assert(std::is_constructible_v<wdmonitorthread, wdmonitortarget&>);
static_assert(std::is_copy_constructible_v<wdmonitorthread>);
static_assert(std::is_copy_assignable_v<wdmonitorthread>);
static_assert(std::is_invocable_r_v<int, decltype(&wdmonitorthread::generalping), wdmonitorthread&,
                                    service&>);
static_assert(std::is_constructible_v<wdmanager, std::string, std::string>);
static_assert(std::is_constructible_v<wdmanager, const char*>);
static_assert(is<void (wdmanager::*)(std::string), decltype(&wdmanager::loadservices)>);
static_assert(is<int (wdmanager::*)(), decltype(&wdmanager::refreshconfig)>);
static_assert(is<void (wdmanager::*)(), decltype(&wdmanager::wdstart)>);
static_assert(std::is_constructible_v<wdLocalLog, std::string&>);
static_assert(is<int (*)(), decltype(&isInstalledNX)>);
static_assert(is<int (*)(), decltype(&wd_postpone)>);
static_assert(is<void (*)(int, char**), decltype(&parseArg)>);
static_assert(is<int (*)(std::string, std::vector<std::string>), decltype(&findarg)>);
static_assert(is<void (*)(), decltype(&checkParsed)>);
static_assert(is<void (*)(), decltype(&set_tmp_file_path)>);
static_assert(is<int (*)(std::string, std::string&), decltype(&Utility::exec)>);
static_assert(is<std::string (*)(std::string), decltype(&Utility::pidof)>);
static_assert(is<int (*)(std::string), decltype(&Utility::str2int)>);
static_assert(is<std::vector<std::string>& (*)(const std::string&, char, std::vector<std::string>&),
                 decltype(&Utility::split2)>);
static_assert(
    is<std::vector<std::string> (*)(const std::string&, char), decltype(&Utility::split)>);
static_assert(is<void (ProcessStatistics::*)(std::string), decltype(&ProcessStatistics::SetName)>);
static_assert(is<void (ProcessStatistics::*)(), decltype(&ProcessStatistics::UpdatePID)>);
static_assert(is<int (ProcessStatistics::*)(std::vector<std::string>&),
                 decltype(&ProcessStatistics::FetchStatisticsFromSystem)>);
static_assert(is<int (ProcessStatistics::*)(), decltype(&ProcessStatistics::Refresh)>);
static_assert(is<bool (ProcessStatistics::*)(), decltype(&ProcessStatistics::IsThresholdReached)>);
static_assert(std::is_default_constructible_v<ProcessStatistics>);
static_assert(std::is_constructible_v<ProcessStatistics, std::string>);
static_assert(std::is_copy_assignable_v<ProcessStatistics>);

TEST(Client, UsesAFieldAsAnyString)
{
    service s{.name = "web"};
    std::ostringstream out;
    out << s.name;
    EXPECT_EQ(out.str(), "web");
    EXPECT_EQ(s.name + "x", "webx");
    EXPECT_EQ("x" + s.name, "xweb");
    EXPECT_STREQ(s.name.c_str(), "web");
    EXPECT_FALSE(s.name.empty());
    EXPECT_TRUE(s.startcmd.empty());
    EXPECT_EQ(s.name.substr(1).find('b'), 1U);
    s.name += "2";
    EXPECT_TRUE(s.name == "web2" && s.name != "web" && s.name < std::string("webx"));
    s.binarypath = std::move(s.name);
    EXPECT_EQ(s.binarypath, "web2");
}

TEST(Client, InsertsAFieldBehindANumber)
{
    const service s{.name = "web"};
    WDLogBuffer buffer;
    EXPECT_EQ(buffer.str(buffer << 5 << s.name), "5web");
}

TEST(Client, SeesAFieldChangeThroughAReference)
{
    service s{.name = "a name that does not fit into the string object itself"};
    const std::string& name = s.name;
    s.name = "b";
    EXPECT_EQ(name, "b");
}

TEST(Client, NamesFieldsByPointersToMembers)
{
    service s;
    std::string service::*field = &service::name;
    s.*field = "web";
    EXPECT_EQ(s.name, "web");
}

TEST(Client, KeepsRecordsInContainers)
{
    std::vector<service> services(3, service{.name = "web"});
    services.push_back({.name = "db"});
    const std::map<std::string, service> sorted{{services[3].name, services[3]}};
    const std::unordered_map<std::string, int> hashed{{services[3].name, 1}};
    const std::set<std::string> names{services[0].name, services[1].name, services[3].name};
    EXPECT_EQ(sorted.at("db").name, "db");
    EXPECT_EQ(hashed.count("db"), 1U);
    EXPECT_EQ(names, (std::set<std::string>{"db", "web"}));
}

TEST(Client, CopiesAThreadWithItsTarget)
{
    wdmonitortarget watched{.monitoredservice = {.name = "web"}, .dependentservices = {{}, {}}};
    const wdmonitorthread thread(watched);
    std::vector<wdmonitorthread> threads;
    threads.push_back(thread);
    threads.front() = thread;
    EXPECT_EQ(watched.monitoredservice.name, "web");
    EXPECT_EQ(watched.dependentservices.size(), 2U);
}

TEST(Client, KnowsTheTokenizersWhiteSpace)
{
    EXPECT_STREQ(control, "\n\r\t ");
}

} // namespace
