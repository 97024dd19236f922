#include "sources.h"

#include <array>
#include <cstddef>
#include <filesystem>
#include <fstream>
#include <functional>
#include <string>
#include <system_error>
#include <thread>
#include <utility>
#include <vector>

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

namespace {

using report::followlog;
using report::logreader;
using report::readlogs;
using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

// A line of the log that names a service; each `name` makes another.
std::string line(const std::string& name, const std::string& second = "37")
{
    return "Sat Nov 21 15:39:" + second +
           " 2026 INFO wdmonitorthread|TID1 Name of the service being monitored: " + name + "\n";
}

std::string lines(int count, const std::string& second = "37")
{
    std::string text;
    for (int number = 0; number < count; ++number) {
        text += line("s" + std::to_string(number), second);
    }
    return text;
}

class Sources : public testing::Test {
protected:
    Sources() : folder(std::filesystem::temp_directory_path() / "sources_test.XXXXXX")
    {
        EXPECT_NE(mkdtemp(folder.data()), nullptr);
        log = folder + "/tolkwd.log";
    }
    ~Sources() override { std::filesystem::remove_all(folder); }

    void write(const std::string& text) const { std::ofstream(log) << text; }
    void append(const std::string& text) const { std::ofstream(log, std::ios::app) << text; }
    // As the daemon does it: the same file goes on.
    void empty() const { EXPECT_EQ(truncate(log.c_str(), 0), 0); }
    void renameaway() const { std::filesystem::rename(log, log + ".1"); }

    // Follows the log; in the pause behind each look the next of these things happens, behind the
    // last of them comes one more look than the log may need to be given up for another.
    void follow(const std::vector<std::function<void()>>& happenings)
    {
        std::size_t looks = 0;
        followlog(
            log, reader, [this] { heard.emplace_back("."); },
            [&] { return looks < happenings.size() + 2; },
            [&] {
                if (looks < happenings.size()) {
                    happenings[looks]();
                }
                ++looks;
            });
    }

    // The refusal's words.
    static std::string refusalof(const std::function<void()>& action, std::errc reason)
    {
        try {
            action();
        } catch (const std::system_error& failure) {
            EXPECT_EQ(failure.code(), reason);
            return failure.what();
        }
        ADD_FAILURE() << "not refused";
        return "";
    }

    std::string folder;
    std::string log;
    std::vector<std::string> heard; // names of services, and "." where it had caught up
    logreader reader{report::wanted::kAll, [this](const report::message& said) {
                         heard.emplace_back(said.first);
                     }};
};

// Standard input, while it lives.
class StandardInput {
public:
    explicit StandardInput(int fd) : before(dup(STDIN_FILENO)) { dup2(fd, STDIN_FILENO); }
    ~StandardInput()
    {
        dup2(before, STDIN_FILENO);
        close(before);
    }
    StandardInput(const StandardInput&) = delete;
    StandardInput& operator=(const StandardInput&) = delete;

private:
    int before;
};

// A pipe that holds `text`, and its writing end, -1 where it was closed.
struct Pipe {
    Pipe(const std::string& text, bool closed)
    {
        EXPECT_EQ(pipe(ends.data()), 0);
        put(text);
        if (closed) {
            finish();
        }
    }
    ~Pipe()
    {
        close(ends[0]);
        finish();
    }
    Pipe(const Pipe&) = delete;
    Pipe& operator=(const Pipe&) = delete;

    void put(const std::string& text) const
    {
        EXPECT_EQ(::write(ends[1], text.data(), text.size()), static_cast<ssize_t>(text.size()));
    }
    void finish()
    {
        if (ends[1] >= 0) {
            close(std::exchange(ends[1], -1));
        }
    }

    std::array<int, 2> ends{-1, -1};
};

TEST_F(Sources, AreReadInOrder)
{
    write(line("one") + line("two"));
    renameaway();
    write(line("three"));
    readlogs({log + ".1", log}, reader);
    EXPECT_THAT(heard, ElementsAre("one", "two", "three"));
    EXPECT_EQ(reader.count().lines, 3U);
}

TEST_F(Sources, LastLineWithoutItsEndIsKeptApartFromTheNextFile)
{
    write(line("one") + "a word of others");
    renameaway();
    write(line("two") + "another");
    readlogs({log + ".1", log}, reader);
    EXPECT_THAT(heard, ElementsAre("one", "two"));
    EXPECT_EQ(reader.count().foreign, 2U);
    EXPECT_EQ(reader.count().torn, 0U);
}

TEST_F(Sources, LongFilesAreReadWhole)
{
    const std::string text = lines(30000);
    write(text);
    readlogs({log}, reader);
    EXPECT_EQ(reader.count().bytes, text.size());
    EXPECT_EQ(reader.count().messages, 30000U);
    ASSERT_EQ(heard.size(), 30000U);
    EXPECT_EQ(heard.back(), "s29999");
}

TEST_F(Sources, NoneAndEmptyOnesAreNothing)
{
    write("");
    readlogs({}, reader);
    readlogs({log}, reader);
    EXPECT_THAT(heard, IsEmpty());
    EXPECT_EQ(reader.count().bytes, 0U);
}

TEST_F(Sources, StandardInputIsReadToItsEnd)
{
    const Pipe pipe(line("one") + line("two"), true);
    const StandardInput input(pipe.ends[0]);
    write(line("three"));
    readlogs({"-", log}, reader);
    EXPECT_THAT(heard, ElementsAre("one", "two", "three"));
}

TEST_F(Sources, StandardInputThatDoesNotWaitIsWaitedFor)
{
    Pipe pipe("", false);
    ASSERT_EQ(fcntl(pipe.ends[0], F_SETFL, O_NONBLOCK), 0);
    const StandardInput input(pipe.ends[0]);
    std::thread writer([&] {
        pipe.put(line("one"));
        pipe.finish();
    });
    readlogs({"-"}, reader);
    writer.join();
    EXPECT_THAT(heard, ElementsAre("one"));
}

TEST_F(Sources, NamedPipeIsReadToItsEnd)
{
    ASSERT_EQ(mkfifo(log.c_str(), 0600), 0);
    std::thread writer([this] { append(line("one") + line("two")); });
    readlogs({log}, reader);
    writer.join();
    EXPECT_THAT(heard, ElementsAre("one", "two"));
}

TEST_F(Sources, WhatCannotBeReadIsRefusedByName)
{
    EXPECT_THAT(
        refusalof([this] { readlogs({log}, reader); }, std::errc::no_such_file_or_directory),
        AllOf(HasSubstr(log), HasSubstr("No such file")));
    EXPECT_THAT(refusalof([this] { readlogs({folder}, reader); }, std::errc::is_a_directory),
                HasSubstr(folder));
    EXPECT_THAT(refusalof([this] { followlog(log, reader, {}, [] { return true; }); },
                          std::errc::no_such_file_or_directory),
                HasSubstr(log));
    EXPECT_THAT(refusalof([this] { followlog(folder, reader, {}, [] { return true; }); },
                          std::errc::is_a_directory),
                HasSubstr(folder));
}

TEST_F(Sources, StandardInputThatIsWriteOnlyIsRefusedByName)
{
    write("");
    const int fd = open(log.c_str(), O_WRONLY | O_CLOEXEC);
    ASSERT_GE(fd, 0);
    {
        const StandardInput input(fd);
        EXPECT_THAT(refusalof([this] { readlogs({"-"}, reader); }, std::errc::bad_file_descriptor),
                    HasSubstr("standard input"));
    }
    close(fd);
}

TEST_F(Sources, FilesBeforeTheOneThatCannotBeReadAreRead)
{
    write(line("one"));
    EXPECT_THROW(readlogs({log, log + ".1"}, reader), std::system_error);
    EXPECT_THAT(heard, ElementsAre("one"));
}

TEST_F(Sources, FollowedAreReadAsTheyGrow)
{
    write(line("one"));
    follow({[this] { append(line("two") + line("three")); }, [] {},
            [this] {
                append(line("four"));
            }});
    EXPECT_THAT(heard, ElementsAre("one", ".", "two", "three", ".", "four", "."));
}

// A configured command may hold line breaks: it is held back for them no longer than a look.
TEST_F(Sources, FollowedAreHeardAtOnce)
{
    write("Sat Nov 21 15:39:37 2026 DEBUG wdmonitorthread|TID1 Executing stop command stop one\n");
    follow({[this] {
        append(line("two"));
    }});
    EXPECT_THAT(heard, ElementsAre("stop one", ".", "two", "."));
}

TEST_F(Sources, FollowedAreLookedAtOnlyAsLongAsAsked)
{
    write(line("one"));
    followlog(
        log, reader, [this] { heard.emplace_back("."); }, [] { return false; });
    EXPECT_THAT(heard, IsEmpty());
}

TEST_F(Sources, FollowedThatIsEmptyTellsNothing)
{
    write("");
    follow({[] {
    }});
    EXPECT_THAT(heard, IsEmpty());
}

TEST_F(Sources, TornLastLineWaitsForItsRest)
{
    const std::string second = line("two");
    write(line("one") + second.substr(0, 30));
    follow({[&] { append(second.substr(30, 60)); },
            [&] {
                append(second.substr(90));
            }});
    EXPECT_THAT(heard, ElementsAre("one", ".", ".", "two", "."));
    EXPECT_EQ(reader.count().torn, 0U);
}

TEST_F(Sources, EmptiedIsReadFromItsBeginning)
{
    write(line("one") + line("two"));
    follow({[this] {
        empty();
        append(line("three", "38"));
    }});
    EXPECT_THAT(heard, ElementsAre("one", "two", ".", "three", "."));
}

TEST_F(Sources, EmptiedAndNotYetWrittenIsReadFromItsBeginning)
{
    write(line("one"));
    follow({[this] { empty(); },
            [this] {
                append(line("two", "38"));
            }});
    EXPECT_THAT(heard, ElementsAre("one", ".", ".", "two", "."));
}

TEST_F(Sources, EmptiedAndAsLongAsBeforeIsReadFromItsBeginning)
{
    write(line("one"));
    follow({[this] {
        empty();
        append(line("two"));
    }});
    EXPECT_THAT(heard, ElementsAre("one", ".", "two", "."));
}

TEST_F(Sources, EmptiedAndLongerThanBeforeIsReadFromItsBeginning)
{
    write(lines(30));
    follow({[this] {
        empty();
        append(lines(40, "38"));
    }});
    EXPECT_EQ(reader.count().messages, 70U);
    EXPECT_EQ(reader.count().torn, 0U);
}

TEST_F(Sources, EmptiedThatBeginsAsBeforeIsReadFromItsBeginning)
{
    write(lines(20) + lines(20, "38"));
    follow({[this] {
        empty();
        append(lines(20) + lines(30, "39"));
    }});
    EXPECT_EQ(reader.count().messages, 90U);
}

TEST_F(Sources, EmptiedThatIsTheSameWhereReadingEndedIsReadFromItsBeginning)
{
    write(lines(20) + lines(20, "38"));
    follow({[this] {
        empty();
        append(lines(20, "39") + lines(20, "38"));
    }});
    EXPECT_EQ(reader.count().messages, 80U);
}

TEST_F(Sources, EmptiedTimeAndAgainIsReadFromItsBeginning)
{
    write(lines(10));
    follow({[this] {
                empty();
                append(line("one", "38"));
            },
            [this] {
                empty();
                append(line("two", "39") + line("three", "39"));
            },
            [this] {
                append(line("four", "40"));
            }});
    heard.erase(heard.begin(), heard.begin() + 10);
    EXPECT_THAT(heard, ElementsAre(".", "one", ".", "two", "three", ".", "four", "."));
}

TEST_F(Sources, LastLineWithoutItsEndIsKeptApartFromWhatFollowsWhereItWasEmptied)
{
    write(line("one") + "a word of others");
    follow({[this] {
        empty();
        append(line("two", "38"));
    }});
    EXPECT_THAT(heard, ElementsAre("one", ".", "two", "."));
    EXPECT_EQ(reader.count().foreign, 1U);
    EXPECT_EQ(reader.count().torn, 0U);
}

TEST_F(Sources, LastLineWithoutItsEndIsKeptApartFromTheOtherFile)
{
    write(line("one") + "a word of others");
    follow({[this] {
        renameaway();
        write(line("two"));
    }});
    EXPECT_THAT(heard, ElementsAre("one", ".", "two", "."));
    EXPECT_EQ(reader.count().foreign, 1U);
    EXPECT_EQ(reader.count().torn, 0U);
}

TEST_F(Sources, ReplacedIsReadToItsEndAndThenTheOtherOne)
{
    write(line("one"));
    follow({[this] {
        append(line("two"));
        renameaway();
        write(line("three"));
    }});
    EXPECT_THAT(heard, ElementsAre("one", ".", "two", ".", "three", "."));
}

TEST_F(Sources, LastWordsToTheReplacedOneAreRead)
{
    write(line("one"));
    follow({[this] {
                renameaway();
                write(line("three"));
            },
            [this] {
                std::ofstream(log + ".1", std::ios::app) << line("two");
            }});
    EXPECT_THAT(heard, ElementsAre("one", ".", "two", "three", "."));
}

TEST_F(Sources, ReplacedByALongerOneIsReadFromItsBeginning)
{
    write(lines(10));
    follow({[this] {
                renameaway();
                write(lines(20));
            },
            [] {},
            [this] {
                append(line("last"));
            }});
    EXPECT_EQ(reader.count().messages, 31U);
}

TEST_F(Sources, VanishedIsWaitedFor)
{
    write(line("one"));
    follow({[this] { std::filesystem::remove(log); }, [] {}, [] {}, [this] { write(line("two")); },
            [] {},
            [this] {
                append(line("three"));
            }});
    EXPECT_THAT(heard, ElementsAre("one", ".", "two", ".", "three", "."));
}

TEST_F(Sources, VanishedThatComesBackGoesOn)
{
    write(line("one"));
    follow({[this] { renameaway(); }, [] {},
            [this] {
                std::filesystem::rename(log + ".1", log);
                append(line("two"));
            }});
    EXPECT_THAT(heard, ElementsAre("one", ".", "two", "."));
}

TEST_F(Sources, LastWordsAreReadAlsoAfterItHasComeBack)
{
    write(line("one"));
    follow({[this] { renameaway(); }, [this] { std::filesystem::rename(log + ".1", log); },
            [this] {
                renameaway();
                write(line("three"));
            },
            [this] {
                std::ofstream(log + ".1", std::ios::app) << line("two");
            }});
    EXPECT_THAT(heard, ElementsAre("one", ".", "two", "three", "."));
}

TEST_F(Sources, LinkThatIsSwitchedLeadsToTheOtherOne)
{
    const std::string other = folder + "/other.log";
    write(line("one"));
    renameaway();
    std::filesystem::create_symlink(log + ".1", log);
    std::ofstream(other) << line("two");
    follow({[&] {
        std::filesystem::create_symlink(other, log + ".new");
        std::filesystem::rename(log + ".new", log);
    }});
    EXPECT_THAT(heard, ElementsAre("one", ".", "two", "."));
}

TEST_F(Sources, WhatIsNoFileInItsPlaceIsWaitedOut)
{
    write(line("one"));
    follow({[this] {
                renameaway();
                std::filesystem::create_directory(log);
            },
            [] {},
            [this] {
                std::filesystem::remove(log);
                EXPECT_EQ(mkfifo(log.c_str(), 0600), 0);
            },
            [] {},
            [this] {
                std::filesystem::remove(log);
                write(line("two"));
            }});
    EXPECT_THAT(heard, ElementsAre("one", ".", "two", "."));
}

TEST_F(Sources, FollowedStandardInputIsReadToItsEnd)
{
    const Pipe pipe(line("one") + line("two"), true);
    const StandardInput input(pipe.ends[0]);
    log = "-";
    follow({});
    ASSERT_GE(heard.size(), 3U);
    EXPECT_EQ(heard.back(), ".");
    EXPECT_EQ(reader.count().messages, 2U);
}

TEST_F(Sources, FollowedStandardInputIsHeardAsItComes)
{
    Pipe pipe(line("one"), false);
    const StandardInput input(pipe.ends[0]);
    followlog(
        "-", reader,
        [&] {
            // Only what was heard brings what is next.
            if (heard.back() == "one") {
                pipe.put(line("two"));
            } else {
                pipe.finish();
            }
        },
        [] { return true; });
    EXPECT_THAT(heard, ElementsAre("one", "two"));
}

TEST_F(Sources, FollowedStandardInputIsGivenUpWhenAsked)
{
    const Pipe pipe("", false);
    const StandardInput input(pipe.ends[0]);
    int asked = 0;
    followlog("-", reader, {}, [&] { return ++asked < 3; });
    EXPECT_EQ(asked, 3);
}

TEST_F(Sources, FollowedFileAsStandardInputIsReadToItsEnd)
{
    write(line("one"));
    const int fd = open(log.c_str(), O_RDONLY | O_CLOEXEC);
    ASSERT_GE(fd, 0);
    {
        const StandardInput input(fd);
        followlog(
            "-", reader, [] {}, [] { return true; });
    }
    close(fd);
    EXPECT_THAT(heard, ElementsAre("one"));
}

} // namespace
