// launch PROGRAM ARGUMENT...: records the moment and becomes the program. The sandbox around it is
// ready by then, so a start-up time counted from here is the program's alone.

#include <cstdio>

#include <unistd.h>

#include "record.h"

int main(int argc, char** argv)
{
    if (argc < 2) {
        dprintf(STDERR_FILENO, "usage: launch PROGRAM ARGUMENT...\n");
        return 2;
    }
    if (!record("launch", "exec", "-")) {
        std::perror(kRecordFile);
        return 2;
    }
    execvp(argv[1], &argv[1]);
    std::perror(argv[1]);
    return 127;
}
