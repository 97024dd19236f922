#include "wdmonitortarget.h"

#include <array>

#include <gtest/gtest.h>

namespace {

constexpr std::array<std::string service::*, 16> kTexts{
    &service::name,
    &service::binarypath,
    &service::startcmd,
    &service::stopcmd,
    &service::functionalpingcmd,
    &service::genpinginterval,
    &service::funpinginterval,
    &service::maxattemptofwakeup,
    &service::messageformat,
    &service::hackmessagehandler,
    &service::sendmessagehandler,
    &service::MaxFPSkips,
    &service::ThresholdAverageCPUUsage,
    &service::ThresholdMemoryUsage,
    &service::ThresholdThreadCount,
    &service::ThresholdHandleCount,
};

TEST(Records, DefaultServiceHoldsSixteenEmptyTexts)
{
    const service fresh;
    for (const auto text : kTexts) {
        EXPECT_EQ(fresh.*text, "");
    }
}

TEST(Records, CommandNeverGivenIsEmptyNotNull)
{
    const service fresh;
    EXPECT_NE(fresh.functionalpingcmd, kNoCommand);
    EXPECT_EQ(fresh.functionalpingcmd, "");
}

TEST(Records, CopyCarriesEveryTextAndTheStatistics)
{
    service original;
    for (std::size_t i = 0; i < kTexts.size(); ++i) {
        original.*kTexts.at(i) = "value " + std::to_string(i);
    }
    original.statistics.SetThresholdThreadCount("12");
    const service copy = original;
    for (std::size_t i = 0; i < kTexts.size(); ++i) {
        EXPECT_EQ(copy.*kTexts.at(i), "value " + std::to_string(i));
    }
    EXPECT_EQ(copy.statistics.GetThresholdThreadCount(), 12);
}

TEST(Records, DefaultTargetHasNoDependents)
{
    const wdmonitortarget fresh;
    EXPECT_EQ(fresh.monitoredservice.name, "");
    EXPECT_TRUE(fresh.dependentservices.empty());
}

TEST(Records, CopiedTargetHasDependentsOfItsOwn)
{
    wdmonitortarget source;
    source.dependentservices.resize(3);
    source.dependentservices[1].name = "before";
    wdmonitortarget copy = source;
    copy.dependentservices[1].name = "after";
    EXPECT_EQ(copy.dependentservices.size(), 3U);
    EXPECT_EQ(source.dependentservices[1].name, "before");
}

} // namespace
