#include "newfile.h"

#include <array>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <string>
#include <system_error>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/stat.h>
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

    fs::path folder;
};

void writepage(std::ostream& out)
{
    out << "a page";
}

TEST_F(NewFile, IsMadeWithTheUsualRights)
{
    umask(022);
    writewhole(folder / "page", writepage);
    EXPECT_EQ(textof(folder / "page"), "a page");
    struct stat facts {};
    ASSERT_EQ(stat((folder / "page").c_str(), &facts), 0);
    EXPECT_EQ(facts.st_mode & 0777U, 0644U);
    EXPECT_EQ(files(), 1);
}

TEST_F(NewFile, TakesThePlaceOfTheOldOne)
{
    std::ofstream(folder / "page") << "an old page";
    writewhole(folder / "page", [&](std::ostream& out) {
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
    EXPECT_THROW(writewhole(folder / "page",
                            [](std::ostream& out) {
                                writepage(out);
                                out.setstate(std::ios::badbit);
                            }),
                 std::system_error);
    EXPECT_THROW(
        writewhole(folder / "page", [](std::ostream&) { throw std::runtime_error("no page"); }),
        std::runtime_error);
    EXPECT_EQ(textof(folder / "page"), "an old page");
    EXPECT_EQ(files(), 1);
}

TEST_F(NewFile, LeavesASymbolicLinkOne)
{
    std::ofstream(folder / "page") << "an old page";
    fs::create_symlink("page", folder / "link");
    writewhole(folder / "link", writepage);
    EXPECT_TRUE(fs::is_symlink(folder / "link"));
    EXPECT_EQ(textof(folder / "page"), "a page");
}

TEST_F(NewFile, WritesToWhatIsNoPlainFile)
{
    const fs::path pipe = folder / "pipe";
    ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    const int reader = open(pipe.c_str(), O_RDWR | O_NONBLOCK);
    ASSERT_GE(reader, 0);
    writewhole(pipe, writepage);
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
        writewhole(name, writepage);
        FAIL() << "it was written";
    } catch (const std::system_error& error) {
        EXPECT_EQ(error.what(), name + ": No such file or directory");
    }
    EXPECT_THROW(writewhole(folder, writepage), std::system_error);
}

} // namespace
} // namespace report
