#include "wdinputfile.h"

#include <array>

#include <fcntl.h>
#include <unistd.h>

#include "daemontest.h"

namespace {

class InputFile : public DaemonTest {
protected:
    InputFile() : DaemonTest("m") {}

    // All of it, in pieces of at most four bytes.
    static std::string readall(wdinputfile& file)
    {
        std::array<char, 4> block{};
        std::string text;
        for (auto piece = file.read(block); !piece.empty(); piece = file.read(block)) {
            text += piece;
        }
        return text;
    }
};

TEST_F(InputFile, MissingFileIsNotOpenAndGivesNothing)
{
    wdinputfile file(folder.path("missing"));
    EXPECT_FALSE(file.isopen());
    EXPECT_EQ(readall(file), "");
}

TEST_F(InputFile, IsReadPieceByPiece)
{
    const std::string content("ten\0bytes\n", 10);
    folder.write("file", content);
    wdinputfile file(folder.path("file"));
    EXPECT_TRUE(file.isopen());
    EXPECT_EQ(readall(file), content);
}

TEST_F(InputFile, FolderOpensAndGivesNothing)
{
    wdinputfile file(folder.path());
    EXPECT_TRUE(file.isopen());
    EXPECT_EQ(readall(file), "");
}

TEST_F(InputFile, MayBeAPipe)
{
    std::array<int, 2> ends{};
    ASSERT_EQ(pipe(ends.data()), 0);
    ASSERT_EQ(write(ends[1], "through", 7), 7);
    close(ends[1]);
    wdinputfile file("/proc/self/fd/" + std::to_string(ends[0]));
    EXPECT_EQ(readall(file), "through");
    close(ends[0]);
}

TEST_F(InputFile, NoServiceInheritsItAndNothingStaysOpen)
{
    const int next = dup(STDOUT_FILENO);
    close(next);
    folder.write("file", "x");
    {
        const wdinputfile file(folder.path("file"));
        EXPECT_EQ(fcntl(next, F_GETFD), FD_CLOEXEC);
    }
    EXPECT_EQ(fcntl(next, F_GETFD), -1);
}

} // namespace
