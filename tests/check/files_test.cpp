#include "files.h"

#include <filesystem>
#include <fstream>
#include <string>

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

namespace {

using check::machinefiles;
using check::presence;

class Files : public testing::Test {
protected:
    Files() : folder(std::filesystem::temp_directory_path() / "files_test.XXXXXX")
    {
        EXPECT_NE(mkdtemp(folder.data()), nullptr);
    }
    ~Files() override { std::filesystem::remove_all(folder); }

    std::string make(const std::string& name, mode_t mode, const std::string& content = "")
    {
        std::string path = folder + "/" + name;
        std::ofstream(path) << content;
        EXPECT_EQ(chmod(path.c_str(), mode), 0);
        return path;
    }

    std::string folder;
    machinefiles files;
};

TEST_F(Files, TellWhatIsThere)
{
    EXPECT_EQ(files.of(folder).found, presence::kThere);
    EXPECT_TRUE(files.of(folder).folder);
    EXPECT_FALSE(files.of(folder).executable);
    EXPECT_EQ(files.of(folder).owner, geteuid());
    EXPECT_EQ(files.of(folder + "/none").found, presence::kMissing);
    EXPECT_EQ(files.of(make("plain", 0644) + "/below").found, presence::kMissing);
    EXPECT_FALSE(files.of(make("plain", 0644)).executable);
    EXPECT_TRUE(files.of(make("program", 0700)).executable);
}

TEST_F(Files, TellWhoMayWrite)
{
    const bool root = geteuid() == 0; // what another one has is open to that one
    EXPECT_EQ(files.of(make("own", 0600)).exposed, !root);
    EXPECT_TRUE(files.of(make("all", 0602)).exposed);
    const std::string group = make("group", 0620);
    if (root) {
        ASSERT_EQ(chown(group.c_str(), 0, 65534), 0);
        ASSERT_EQ(chmod(group.c_str(), 0620), 0);
        EXPECT_FALSE(files.of(make("rootsgroup", 0620)).exposed);
    }
    EXPECT_TRUE(files.of(group).exposed);
    EXPECT_TRUE(files.of("/tmp").exposed) << "sticky or not";
}

TEST_F(Files, FollowLinks)
{
    const std::string program = make("program", 0755);
    const std::string link = folder + "/link";
    std::filesystem::create_symlink(program, link);
    std::filesystem::create_symlink("nowhere", folder + "/broken");
    EXPECT_TRUE(files.of(link).executable);
    EXPECT_EQ(files.realpathof(link), std::filesystem::canonical(program));
    EXPECT_EQ(files.of(folder + "/broken").found, presence::kMissing);
    EXPECT_EQ(files.realpathof(folder + "/broken"), folder + "/broken");
}

TEST_F(Files, LookUpProgramsOnTheDaemonsPath)
{
    EXPECT_EQ(check::folderof(files.program("sh")), "/usr/bin");
    EXPECT_EQ(files.program("/bin/sh"), "/bin/sh");
    EXPECT_EQ(files.program("bin/sh"), "/bin/sh");
    EXPECT_EQ(files.program("no-such-program"), "");
    EXPECT_EQ(files.program(make("plain", 0644)), "");
    EXPECT_EQ(files.program(folder), "");
}

TEST_F(Files, TellScripts)
{
    EXPECT_TRUE(files.isscript(make("script", 0755, "#!/bin/sh\n")));
    EXPECT_FALSE(files.isscript(make("short", 0755, "#")));
    EXPECT_FALSE(files.isscript(make("empty", 0755)));
    EXPECT_FALSE(files.isscript("/bin/sh"));
    EXPECT_FALSE(files.isscript(folder));
    EXPECT_FALSE(files.isscript(folder + "/none"));
}

// A file may name thousands of programs.
TEST_F(Files, AreNotLeftOpen)
{
    const auto open = [] {
        return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {});
    };
    const auto before = open();
    EXPECT_TRUE(files.isscript(make("script", 0755, "#!/bin/sh\n")));
    EXPECT_FALSE(files.isscript(make("short", 0755, "#")));
    EXPECT_FALSE(files.isservice("no-such-service"));
    EXPECT_EQ(open(), before);
}

TEST_F(Files, KnowNoServiceOfAnInventedName)
{
    EXPECT_FALSE(files.isservice("no-such-service"));
    EXPECT_FALSE(files.isservice(".."));
    EXPECT_FALSE(files.isservice("no-such-service@1"));
}

TEST(Folder, IsWhatStandsBeforeTheLastSlash)
{
    EXPECT_EQ(check::folderof("/a/b"), "/a");
    EXPECT_EQ(check::folderof("/a"), "/");
    EXPECT_EQ(check::folderof("/a/b/"), "/a/b");
    EXPECT_EQ(check::folderof("a"), ".");
}

} // namespace
