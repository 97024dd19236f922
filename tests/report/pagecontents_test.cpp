// From a log to what the page shows: its spans, and the moments that it marks.

#include "pagecontents.h"

#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <unistd.h>

namespace report {
namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using testing::StartsWith;

// What the page shows of a log. Its file is in a folder of its own, gone at the end.
class PageContents : public testing::Test {
protected:
    PageContents()
    {
        setenv("TZ", "UTC0", 1); // each test is a process of its own
        std::string name = (fs::temp_directory_path() / "pagecontents.XXXXXX").native();
        if (mkdtemp(name.data()) == nullptr) {
            throw std::runtime_error("no temporary folder");
        }
        folder = name;
    }
    ~PageContents() override { fs::remove_all(folder); }

    [[nodiscard]] pagecontents read() const
    {
        const std::string name = folder / "tolkwd.log";
        std::ofstream(name) << log;
        return readpage({name}, false);
    }

    // What the daemon says, so many seconds after the log's beginning.
    void say(std::time_t second, std::string_view thread, std::string_view level,
             std::string_view text, std::string_view module = "wdmonitorthread")
    {
        constexpr std::time_t kBeginning = 1795273200; // Sat Nov 21 15:00:00 2026
        constexpr std::size_t kDateBytes = 24;
        const std::time_t now = kBeginning + second;
        std::tm local{};
        std::string date(2 * kDateBytes, '\0');
        date.resize(std::strftime(date.data(), date.size(), "%a %b %e %H:%M:%S %Y",
                                  localtime_r(&now, &local)));
        log.append(date).append(" ").append(level).append(" ").append(module);
        log.append("|TID").append(thread).append(" ").append(text).append("\n");
    }
    void announce(std::time_t second, std::string_view thread, const std::string& name)
    {
        say(second, thread, "INFO", "Name of the service being monitored: " + name);
        say(second, thread, "INFO", "Binary path of service being monitored: /usr/sbin/" + name);
    }
    void fail(std::time_t second, std::string_view thread, const std::string& name)
    {
        say(second, thread, "ERROR",
            "General ping failed for service " + name +
                ". Try to general ping more times now, if failed 3 times, will generally recover "
                "this service.");
    }

    // "60 web failed", of each mark.
    static std::vector<std::string> marksof(const pagecontents& contents)
    {
        std::vector<std::string> result;
        for (const pagemark& mark : contents.marks) {
            result.push_back(std::to_string(secondsbetween(contents.count.first, mark.when)) + " " +
                             contents.services.at(mark.service).figures.name + " " +
                             std::string(wordof(mark.kind)) + (mark.inferred ? "*" : ""));
        }
        return result;
    }

private:
    fs::path folder;
    std::string log;
};

TEST_F(PageContents, HaveTheMarksInTheOrderInWhichTheyHappened)
{
    announce(0, "1", "web");
    announce(0, "2", "db");
    fail(60, "1", "web");
    fail(400, "2", "db");
    fail(1000, "1", "web"); // so a retry had helped before
    EXPECT_THAT(marksof(read()), ElementsAre("60 web failed", "270 web state*", "400 db failed",
                                             "610 db state*", "1000 web failed"));
}

TEST_F(PageContents, HaveNoMarkForWhatIsRepeatedEachRound)
{
    announce(0, "1", "web");
    for (const std::time_t round : {1, 61, 121}) {
        say(round, "1", "INFO", "(/usr/sbin/web) Executing functional ping now ... ");
        say(round, "1", "ERROR", "Functionalping failed for service web, unrecognized command.");
    }
    EXPECT_THAT(marksof(read()), ElementsAre("1 web unknown"));
}

TEST_F(PageContents, TellOfAMarkWhatWasBeforeIt)
{
    announce(0, "1", "web");
    say(0, "1", "ERROR", "Failed to general recover the sevice web after try the max times.");
    const pagecontents contents = read();
    ASSERT_THAT(contents.marks, SizeIs(1));
    EXPECT_THAT(contents.marks[0].words, StartsWith("given up unasked"));
}

TEST_F(PageContents, TellThatTheConfigurationCouldNotBeLoaded)
{
    announce(0, "1", "web");
    EXPECT_FALSE(read().loadfailed);
    say(100, "3", "ERROR", "Loadservices error.", "wdmanager");
    EXPECT_TRUE(read().loadfailed);
}

TEST_F(PageContents, HaveTheSpansOfEachService)
{
    announce(0, "1", "web");
    announce(0, "2", "db");
    fail(60, "2", "db");
    const pagecontents contents = read();
    ASSERT_THAT(contents.services, SizeIs(2));
    EXPECT_EQ(contents.services[0].figures.name, "web");
    EXPECT_THAT(contents.services[0].spans, SizeIs(1));
    EXPECT_EQ(contents.services[1].figures.name, "db");
    ASSERT_THAT(contents.services[1].spans, SizeIs(1)); // the second one has no length yet
    EXPECT_EQ(contents.services[1].spans[0].what, state::kUp);
    EXPECT_EQ(contents.services[1].figures.now.what, state::kSuspect);
}

TEST_F(PageContents, OfAnEmptyLogAreNone)
{
    const pagecontents contents = read();
    EXPECT_THAT(contents.services, IsEmpty());
    EXPECT_THAT(contents.marks, IsEmpty());
}

} // namespace
} // namespace report
