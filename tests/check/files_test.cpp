#include "files.h"

#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

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

// On the way to a file; only root can make files of others, and has a way of root's folders.
class Ways : public Files {
protected:
    void SetUp() override
    {
        if (geteuid() != 0) {
            GTEST_SKIP() << "only root can make files of other users";
        }
    }

    // A folder of these rights, and of this owner and group.
    std::string makefolder(const std::string& name, mode_t mode, uid_t owner = 0, gid_t group = 0)
    {
        std::string path = folder + "/" + name;
        std::filesystem::create_directories(path);
        EXPECT_EQ(chown(path.c_str(), owner, group), 0);
        EXPECT_EQ(chmod(path.c_str(), mode), 0);
        return path;
    }

    // A link of this owner.
    std::string makelink(const std::string& name, const std::string& to, uid_t owner = 0)
    {
        std::string path = folder + "/" + name;
        std::filesystem::create_symlink(to, path);
        EXPECT_EQ(lchown(path.c_str(), owner, owner), 0);
        return path;
    }

    static constexpr uid_t kOther = 65534;
};

using paths = std::vector<std::string>;

TEST_F(Ways, ToAFileEndAtTheFile)
{
    EXPECT_EQ(files.writableon(make("own", 0600)), paths{});
    EXPECT_EQ(files.writableon(make("all", 0602)), paths{folder + "/all"});
    const std::string group = make("group", 0620);
    EXPECT_EQ(files.writableon(group), paths{}) << "root's group";
    ASSERT_EQ(chown(make("others", 0600).c_str(), kOther, 0), 0);
    EXPECT_EQ(files.writableon(folder + "/others"), paths{folder + "/others"});
    EXPECT_EQ(files.writableon(folder + "/none"), paths{});
}

TEST_F(Ways, BeginAtTheRoot)
{
    const std::string top = makefolder("top", 0755, kOther);
    const std::string middle = makefolder("top/middle", 0775, 0, kOther);
    makefolder("top/middle/low", 0755);
    const std::string file = make("top/middle/low/program", 0755);
    EXPECT_EQ(files.writableon(file), (paths{top, middle}));
    EXPECT_EQ(files.writableon(folder + "/top/./middle//../none"), (paths{top, middle, top}));
}

TEST_F(Ways, PassAStickyFolderWhereTheyGoOnToRootsFiles)
{
    const std::string shared = makefolder("shared", 01777);
    EXPECT_EQ(files.writableon(make("shared/roots", 0755)), paths{});
    ASSERT_EQ(chown(make("shared/others", 0755).c_str(), kOther, 0), 0);
    EXPECT_EQ(files.writableon(shared + "/others"), paths{shared + "/others"});
    EXPECT_EQ(files.writableon(shared), paths{shared}) << "anybody can add to it";
    EXPECT_EQ(files.writableon(makefolder("others", 01777, kOther) + "/none"),
              paths{folder + "/others"})
        << "its owner can replace what is in it";
}

TEST_F(Ways, FollowLinks)
{
    makefolder("open", 0777);
    make("open/program", 0755);
    const paths open{folder + "/open"};
    EXPECT_EQ(files.writableon(makelink("near", "open/program")), open);
    EXPECT_EQ(files.writableon(makelink("far", folder + "/open/program")), open);
    EXPECT_EQ(files.writableon(makelink("folder", "open") + "/program"), open);
    EXPECT_EQ(files.writableon(makelink("open/back", "../own", kOther)), open);
    EXPECT_EQ(files.writableon(makelink("ring", "ring")), paths{});
}

// Whoever owns a link cannot have it lead elsewhere but by putting another in its place.
TEST_F(Ways, PassAnothersLinkWhereHeCannotReplaceIt)
{
    make("program", 0755);
    EXPECT_EQ(files.writableon(makelink("others", "program", kOther)), paths{});
    makefolder("shared", 01777);
    EXPECT_EQ(files.writableon(makelink("shared/roots", "../program")), paths{});
    EXPECT_EQ(files.writableon(makelink("shared/others", "../program", kOther)),
              paths{folder + "/shared/others"});
}

TEST_F(Ways, TellWhetherOthersMayRead)
{
    makefolder(".", 0755);
    EXPECT_TRUE(files.isreadable(make("all", 0604)));
    EXPECT_FALSE(files.isreadable(make("own", 0600)));
    EXPECT_FALSE(files.isreadable(make("rootsgroup", 0640)));
    const std::string group = make("group", 0640);
    ASSERT_EQ(chown(group.c_str(), 0, kOther), 0);
    EXPECT_TRUE(files.isreadable(group));
    makefolder("closed/open", 0755);
    makefolder("closed", 0700);
    EXPECT_FALSE(files.isreadable(make("closed/open/all", 0644)));
    EXPECT_FALSE(files.isreadable(makelink("link", "closed/open/all")));
    makefolder("unlisted", 0711);
    EXPECT_TRUE(files.isreadable(make("unlisted/all", 0644)));
    EXPECT_FALSE(files.isreadable(folder + "/none"));
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
