// The entry: names all pieces and runs those that the arguments choose. Works in the current
// folder, where `shm` is a folder in memory and `service` is first in PATH.
#include "surroundings.h"

#include <cstdlib>
#include <fstream>
#include <iostream>
#include <string_view>

#include <benchmark/benchmark.h>

#include "wdLocalLog_linux.h"
#include "wdsettings.h"

void prepare(const std::string& logpath)
{
    wdLocalLog::logFilePath = logpath;
    debugenable = false;
    _tmp_file_path = "./";
}

void writefile(const std::string& path, const std::string& text)
{
    std::ofstream file(path, std::ios::binary);
    file << text << std::flush;
    if (!file) {
        std::cerr << "cannot write " << path << '\n';
        std::exit(1);
    }
}

// --brief goes first; the rest are Google Benchmark's own.
int main(int argc, char** argv)
{
    const bool brief = argc > 1 && std::string_view(argv[1]) == "--brief";
    if (brief) {
        argv[1] = argv[0];
        --argc;
        ++argv;
    }
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv)) {
        return 1;
    }
    registerload(brief);
    registerlog(brief);
    registerping(brief);
    benchmark::RunSpecifiedBenchmarks();
}
