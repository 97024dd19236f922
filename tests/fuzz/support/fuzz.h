// What every fuzzer here is made of: a target tries one unit, an input of any bytes; whatever must
// hold is demanded; and no unit may take longer than in proportion to what it makes the daemon do.
// A broken demand ends the run, upon which the fuzzer keeps the unit and names its file.
#pragma once

#include <string>
#include <vector>

// Ends the run unless `holds`. `what` says what should have held.
void demand(bool holds, const char* what);

// Adds up the processor time that this thread spends in the code under test.
class Stopwatch {
public:
    [[nodiscard]] double seconds() const noexcept { return sum; }

    // Counts from its construction to its end.
    class Lap {
    public:
        explicit Lap(Stopwatch& stopwatch);
        ~Lap();
        Lap(const Lap&) = delete;
        Lap& operator=(const Lap&) = delete;

    private:
        Stopwatch& watch;
        const double start;
    };

private:
    double sum = 0;
};

// Each target defines this: tries `unit` from the state of a fresh process, times the code under
// test with laps of `watch`, and returns the number of bytes that this code had to deal with.
std::size_t tryunit(const std::string& unit, Stopwatch& watch);

// `text` cut at every `separator`, the last piece being what is left: never no piece at all.
std::vector<std::string> cut(const std::string& text, char separator);
