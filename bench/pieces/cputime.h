// The processor time of this thread and of the commands that it has run.
#pragma once

// Both in seconds, since the thread or the process began.
struct cputime {
    double own;
    double children; // those waited for

    static cputime now();
    [[nodiscard]] cputime since(const cputime& before) const;
};
