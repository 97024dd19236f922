#include "newfile.h"

#include <array>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fcntl.h>
#include <grp.h>
#include <sys/inotify.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

namespace report {
namespace {

namespace fs = std::filesystem;

// A folder of its own, gone at the end.
class NewFile : public testing::Test {
protected:
    NewFile()
    {
        std::string name = (fs::temp_directory_path() / "newfile.XXXXXX").native();
        if (mkdtemp(name.data()) == nullptr) {
            throw std::runtime_error("no temporary folder");
        }
        folder = name;
    }
    ~NewFile() override { fs::remove_all(folder); }

    static std::string textof(const fs::path& path)
    {
        std::ostringstream text;
        text << std::ifstream(path).rdbuf();
        return text.str();
    }

    [[nodiscard]] std::ptrdiff_t files() const
    {
        return std::distance(fs::directory_iterator(folder), fs::directory_iterator());
    }

    // A file with a text and a mode.
    fs::path made(const std::string& name, const std::string& text, mode_t mode = 0644)
    {
        const fs::path path = folder / name;
        std::ofstream(path) << text;
        EXPECT_EQ(chmod(path.c_str(), mode), 0);
        return path;
    }

    static struct stat factsof(const fs::path& path)
    {
        struct stat facts {};
        EXPECT_EQ(stat(path.c_str(), &facts), 0);
        return facts;
    }

    static mode_t modeof(const fs::path& path) { return factsof(path).st_mode & 07777U; }

    // What `path` is refused with, which leaves everything as it is; empty if it is not.
    std::string refusal(const fs::path& path, const std::vector<std::string>& inputs = {}) const
    {
        const std::ptrdiff_t before = files();
        try {
            writewhole(path, inputs, [](std::ostream& out) { out << "a page"; });
        } catch (const std::runtime_error& error) {
            EXPECT_EQ(files(), before);
            return error.what();
        }
        return {};
    }

    fs::path folder;
};

constexpr uid_t kSomebody = 65534;
constexpr gid_t kSomeGroup = 65533;

// While it lives, root acts as an ordinary user.
class somebody {
public:
    somebody()
    {
        EXPECT_EQ(setgroups(0, nullptr), 0);
        EXPECT_EQ(setegid(kSomebody), 0);
        EXPECT_EQ(seteuid(kSomebody), 0);
    }
    ~somebody()
    {
        EXPECT_EQ(seteuid(0), 0);
        EXPECT_EQ(setegid(0), 0);
    }
    somebody(const somebody&) = delete;
    somebody& operator=(const somebody&) = delete;
};

// The rest needs files of several users.
class NewFileAsRoot : public NewFile {
protected:
    void SetUp() override
    {
        if (geteuid() != 0) {
            GTEST_SKIP() << "only root can make files of other users";
        }
    }
};

constexpr const char* kAccessList = "system.posix_acl_access";

// Sets an access control list: read and write for the owner, nothing for the group, and these
// rights for a user and for others. False where the file system has none.
bool setlist(const fs::path& path, const char* attribute, std::uint16_t user, std::uint16_t mask,
             std::uint16_t others)
{
    struct entry {
        std::uint16_t tag, rights;
        std::uint32_t id;
    };
    const struct {
        std::uint32_t version = 2;
        std::array<entry, 5> entries;
    } list{.entries = {{{0x01, 6, ~0U}, // owner, a user, group, mask, others
                        {0x02, user, kSomebody},
                        {0x04, 0, ~0U},
                        {0x10, mask, ~0U},
                        {0x20, others, ~0U}}}};
    return setxattr(path.c_str(), attribute, &list, sizeof list, 0) == 0;
}

void writepage(std::ostream& out)
{
    out << "a page";
}

TEST_F(NewFile, IsMadeWithTheUsualRights)
{
    umask(022);
    writewhole(folder / "page", {}, writepage);
    EXPECT_EQ(textof(folder / "page"), "a page");
    struct stat facts {};
    ASSERT_EQ(stat((folder / "page").c_str(), &facts), 0);
    EXPECT_EQ(facts.st_mode & 0777U, 0644U);
    EXPECT_EQ(files(), 1);
}

TEST_F(NewFile, TakesThePlaceOfTheOldOne)
{
    std::ofstream(folder / "page") << "an old page";
    writewhole(folder / "page", {}, [&](std::ostream& out) {
        writepage(out);
        out.flush();
        EXPECT_EQ(textof(folder / "page"), "an old page");
    });
    EXPECT_EQ(textof(folder / "page"), "a page");
    EXPECT_EQ(files(), 1);
}

TEST_F(NewFile, LeavesTheOldOneWhereItCannotBeWritten)
{
    std::ofstream(folder / "page") << "an old page";
    EXPECT_THROW(writewhole(folder / "page", {},
                            [](std::ostream& out) {
                                writepage(out);
                                out.setstate(std::ios::badbit);
                            }),
                 std::system_error);
    EXPECT_THROW(
        writewhole(folder / "page", {}, [](std::ostream&) { throw std::runtime_error("no page"); }),
        std::runtime_error);
    EXPECT_EQ(textof(folder / "page"), "an old page");
    EXPECT_EQ(files(), 1);
}

TEST_F(NewFile, LeavesASymbolicLinkOne)
{
    std::ofstream(folder / "page") << "an old page";
    fs::create_symlink("page", folder / "link");
    writewhole(folder / "link", {}, writepage);
    EXPECT_TRUE(fs::is_symlink(folder / "link"));
    EXPECT_EQ(textof(folder / "page"), "a page");
}

TEST_F(NewFile, WritesToWhatIsNoPlainFile)
{
    const fs::path pipe = folder / "pipe";
    ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    const int reader = open(pipe.c_str(), O_RDWR | O_NONBLOCK);
    ASSERT_GE(reader, 0);
    writewhole(pipe, {}, writepage);
    std::array<char, 16> text{};
    EXPECT_EQ(read(reader, text.data(), text.size()), 6);
    EXPECT_STREQ(text.data(), "a page");
    EXPECT_TRUE(fs::is_fifo(pipe));
    close(reader);
}

TEST_F(NewFile, NamesWhatItCannotWrite)
{
    const std::string name = folder / "no such folder" / "page";
    try {
        writewhole(name, {}, writepage);
        FAIL() << "it was written";
    } catch (const std::system_error& error) {
        EXPECT_EQ(error.what(), name + ": No such file or directory");
    }
    EXPECT_THROW(writewhole(folder, {}, writepage), std::system_error);
}

TEST_F(NewFile, MakesTheFileThatALinkLeadsTo)
{
    fs::create_symlink("page", folder / "link");
    writewhole(folder / "link", {}, writepage);
    EXPECT_TRUE(fs::is_symlink(folder / "link"));
    EXPECT_EQ(textof(folder / "page"), "a page");
}

TEST_F(NewFile, FollowsLinksThroughFolders)
{
    fs::create_directories(folder / "one" / "two");
    fs::create_directory_symlink(folder / "one", folder / "absolute");
    fs::create_directory_symlink("../../absolute/./two", folder / "one" / "two" / "relative");
    writewhole(folder / "absolute" / "two" / "relative" / ".." / "two" / "page", {}, writepage);
    EXPECT_EQ(textof(folder / "one" / "two" / "page"), "a page");
}

TEST_F(NewFile, RefusesLinksThatLeadNowhere)
{
    fs::create_symlink("other", folder / "one");
    fs::create_symlink("one", folder / "other");
    fs::create_symlink("/", folder / "root");
    const std::string file = made("file", "");
    EXPECT_EQ(refusal(folder / "one"),
              (folder / "one").native() + ": Too many levels of symbolic links");
    EXPECT_EQ(refusal(folder / "root"), (folder / "root").native() + ": Is a directory");
    EXPECT_EQ(refusal(file + "/page"), file + "/page: Not a directory");
    EXPECT_EQ(refusal(folder / "new/"), (folder / "new/").native() + ": Is a directory");
    EXPECT_EQ(refusal("."), ".: Is a directory");
    EXPECT_EQ(refusal(""), ": No such file or directory");
}

TEST_F(NewFile, IsNoneOfTheInputsUnderAnyName)
{
    const fs::path log = made("log", "a log");
    fs::create_hard_link(log, folder / "hard");
    fs::create_symlink(log, folder / "soft");
    for (const char* const name : {"log", "hard", "soft", "./log"}) {
        const fs::path path = folder / name;
        EXPECT_EQ(refusal(path, {"no such log", folder / "soft"}),
                  path.native() + ": the output is also an input");
    }
    EXPECT_EQ(textof(log), "a log");
    EXPECT_EQ(refusal(made("page", "an old page"), {log}), "");
    EXPECT_EQ(textof(folder / "page"), "a page");
}

TEST_F(NewFile, IsNotTheFileThatIsStandardInput)
{
    const fs::path log = made("log", "a log");
    const int before = dup(STDIN_FILENO);
    const int fd = open(log.c_str(), O_RDONLY | O_CLOEXEC);
    ASSERT_GE(dup2(fd, STDIN_FILENO), 0);
    EXPECT_EQ(refusal(log, {"-"}), log.native() + ": the output is also an input");
    dup2(before, STDIN_FILENO);
    close(before);
    close(fd);
    EXPECT_EQ(textof(log), "a log");
}

TEST_F(NewFile, MayBeTheDeviceThatTheLogComesFrom)
{
    EXPECT_EQ(refusal("/dev/null", {"/dev/null"}), "");
}

TEST_F(NewFile, KeepsTheModeOfTheOldOne)
{
    umask(022);
    for (const mode_t mode : {0600U, 0640U, 0664U, 0400U}) {
        const fs::path page = made("page", "an old page", mode);
        writewhole(page, {}, writepage);
        EXPECT_EQ(textof(page), "a page");
        EXPECT_EQ(modeof(page), mode);
        fs::remove(page);
    }
}

TEST_F(NewFile, DropsTheSetUserBit)
{
    const fs::path page = made("page", "an old page", 04755);
    writewhole(page, {}, writepage);
    EXPECT_EQ(modeof(page), 0755U);
}

TEST_F(NewFile, IsReadByItsOwnerOnlyUntilItIsWhole)
{
    umask(0);
    writewhole(folder / "page", {}, [&](std::ostream& out) {
        writepage(out);
        ASSERT_EQ(files(), 1);
        EXPECT_EQ(modeof(fs::directory_iterator(folder)->path()), 0600U);
    });
    EXPECT_EQ(modeof(folder / "page"), 0666U);
}

TEST_F(NewFile, LeavesTheOldContentsToOtherHardLinks)
{
    const fs::path page = made("page", "an old page");
    fs::create_hard_link(page, folder / "hard");
    writewhole(page, {}, writepage);
    EXPECT_EQ(textof(folder / "hard"), "an old page");
    EXPECT_EQ(textof(page), "a page");
}

// What is opened again by its name may be another file by then. Of two openings in a row inotify
// tells one, so while the file is open its descriptors are looked at.
TEST_F(NewFile, IsOpenedOnce)
{
    const int watch = inotify_init1(IN_NONBLOCK | IN_CLOEXEC);
    ASSERT_GE(inotify_add_watch(watch, folder.c_str(), IN_OPEN | IN_CLOSE), 0);
    int descriptors = 0;
    writewhole(folder / "page", {}, [&](std::ostream& out) {
        writepage(out);
        out.flush();
        for (const auto& each : fs::directory_iterator("/proc/self/fd")) {
            std::error_code gone; // the iterator's own
            if (fs::read_symlink(each, gone).parent_path() == fs::canonical(folder)) {
                const int fd = std::stoi(each.path().filename());
                EXPECT_EQ(lseek(fd, 0, SEEK_CUR), 6); // one opening has one position
                ++descriptors;
            }
        }
    });
    EXPECT_GT(descriptors, 0);
    alignas(inotify_event) std::array<char, 4096> events{};
    const ssize_t size = read(watch, events.data(), events.size());
    close(watch);
    int opened = 0;
    for (ssize_t place = 0; place < size;) {
        inotify_event event{};
        std::memcpy(&event, events.data() + place, sizeof event);
        opened += (event.mask & IN_OPEN) != 0 ? 1 : 0;
        place += static_cast<ssize_t>(sizeof event + event.len);
    }
    EXPECT_EQ(opened, 1);
}

// Who may read a file may be said by an access control list: then its mode means something else.
TEST_F(NewFile, WithoutTheOldAccessControlListIsItsOwnersAlone)
{
    for (const std::uint16_t rights :
         std::array<std::uint16_t, 2>{6, 0}) { // the list gives or denies somebody something
        const fs::path page = made("page", "an old page", 0644);
        if (!setlist(page, kAccessList, rights, 4, 4)) {
            GTEST_SKIP() << "no access control lists in " << folder;
        }
        writewhole(page, {}, writepage);
        EXPECT_EQ(modeof(page), 0600U);
    }
}

TEST_F(NewFileAsRoot, KeepsOwnerAndGroupOfTheOldOne)
{
    const fs::path page = made("page", "an old page", 0640);
    ASSERT_EQ(chown(page.c_str(), kSomebody, kSomeGroup), 0);
    writewhole(page, {}, writepage);
    EXPECT_EQ(factsof(page).st_uid, kSomebody);
    EXPECT_EQ(factsof(page).st_gid, kSomeGroup);
    EXPECT_EQ(modeof(page), 0640U);
}

TEST_F(NewFileAsRoot, OfAnotherUserGivesNobodyMore)
{
    ASSERT_EQ(chmod(folder.c_str(), 0777), 0);
    const std::vector<std::pair<mode_t, mode_t>> modes = {{0644, 0644}, {0664, 0644}, {0640, 0600},
                                                          {0604, 0600}, {0600, 0600}, {0777, 0777}};
    for (const auto& [before, behind] : modes) {
        const fs::path page = made("page", "an old page", before);
        ASSERT_EQ(chown(page.c_str(), 0, kSomeGroup), 0);
        {
            const somebody user;
            writewhole(page, {}, writepage);
        }
        EXPECT_EQ(factsof(page).st_uid, kSomebody);
        EXPECT_EQ(factsof(page).st_gid, kSomebody);
        EXPECT_EQ(modeof(page), behind) << std::oct << before;
        fs::remove(page);
    }
}

TEST_F(NewFileAsRoot, OfTheSameGroupKeepsItAndTheMode)
{
    ASSERT_EQ(chmod(folder.c_str(), 0777), 0);
    const fs::path page = made("page", "an old page", 0660);
    ASSERT_EQ(chown(page.c_str(), 0, kSomebody), 0);
    {
        const somebody user;
        writewhole(page, {}, writepage);
    }
    EXPECT_EQ(factsof(page).st_gid, kSomebody);
    EXPECT_EQ(modeof(page), 0660U);
}

TEST_F(NewFileAsRoot, IsNotWhereALinkOfAnotherUserLeads)
{
    fs::create_directory(folder / "real");
    const fs::path page = made("real/page", "an old page");
    fs::create_symlink(page, folder / "theirs");
    fs::create_symlink("theirs", folder / "chain");
    fs::create_symlink("missing", folder / "dangling");
    fs::create_directory_symlink("real", folder / "way");
    fs::create_directory_symlink("way", folder / "detour");
    for (const char* const link : {"theirs", "dangling", "way"}) {
        ASSERT_EQ(lchown((folder / link).c_str(), kSomebody, kSomebody), 0);
    }
    for (const char* const name : {"theirs", "chain", "dangling", "way/page", "detour/page"}) {
        const fs::path path = folder / name;
        EXPECT_EQ(refusal(path), path.native() + ": a symbolic link of another user");
    }
    EXPECT_EQ(textof(page), "an old page");
}

TEST_F(NewFileAsRoot, IsNoneOfAnotherUserInASharedFolder)
{
    const fs::path page = made("page", "an old page");
    ASSERT_EQ(chown(page.c_str(), kSomebody, kSomebody), 0);
    ASSERT_EQ(chmod(folder.c_str(), 01777), 0);
    EXPECT_EQ(refusal(page), page.native() + ": a file of another user in a shared folder");
    ASSERT_EQ(chown(folder.c_str(), kSomebody, kSomebody), 0);
    EXPECT_EQ(refusal(page), "");
    EXPECT_EQ(factsof(page).st_uid, kSomebody);
}

TEST_F(NewFileAsRoot, TakesNoAccessControlListOfItsFolder)
{
    const fs::path page = made("page", "an old page", 0640);
    if (!setlist(folder, "system.posix_acl_default", 6, 5, 5)) {
        GTEST_SKIP() << "no access control lists in " << folder;
    }
    writewhole(page, {}, writepage);
    EXPECT_LT(getxattr(page.c_str(), kAccessList, nullptr, 0), 0);
    EXPECT_EQ(modeof(page), 0640U);
}

TEST_F(NewFileAsRoot, MayBeWhereALinkLeadsForOthers)
{
    ASSERT_EQ(chmod(folder.c_str(), 0777), 0);
    fs::create_symlink("page", folder / "link");
    {
        const somebody user;
        writewhole(folder / "link", {}, writepage);
    }
    EXPECT_EQ(textof(folder / "page"), "a page");
}

} // namespace
} // namespace report
