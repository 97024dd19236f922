#include "daemontest.h"

#include <iostream>
#include <utility>

#include "wdLocalLog_linux.h"
#include "wdmonitorthread_linux.h"
#include "wdsettings.h"
#include "wdxmlparserhandler.h"
#include "xmlparser.h"

namespace {

void resetstate()
{
    configPath.clear();
    wdlocallogpath.clear();
    globalrefresh = 0;
    debugenable = true;
    globalenable = 0;
    xmlparser::allservices.clear();
    xmlparser::alltargets.clear();
    xercecstack = {};
    charparse.clear();
    monitorservice = {};
    monservicedep = {};
    monservicedepends.clear();
    target = {};
}

} // namespace

DaemonTest::DaemonTest(std::string module) : homemodule(std::move(module)) {}

void DaemonTest::SetUp()
{
    resetstate();
    _tmp_file_path = folder.path();
    wdLocalLog::logFilePath = folder.path("log");
    world.reset(folder.path(), homemodule);
    ::testing::internal::CaptureStdout();
}

void DaemonTest::TearDown()
{
    const std::string output = ::testing::internal::GetCapturedStdout();
    if (HasFailure()) {
        std::cout << output;
    }
}

std::string DaemonTest::takestdout()
{
    std::string output = ::testing::internal::GetCapturedStdout();
    ::testing::internal::CaptureStdout();
    return output;
}
