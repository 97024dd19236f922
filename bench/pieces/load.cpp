// Reading a configuration: tokenizer and handler against two XML libraries that fill the same
// records from the same file, and the whole load, whose time has to grow as the file does.
#include <filesystem>

#include <benchmark/benchmark.h>

#include "configuration.h"
#include "surroundings.h"
#include "wdxmlparserhandler.h"
#include "xmlparser.h"

namespace {

bool listing = false;

using reader = bool (*)(const std::string& path, std::vector<wdmonitortarget>& targets);

bool readbydaemon(const std::string& path, std::vector<wdmonitortarget>& /*alltargets*/)
{
    return xmlparser::parse(path) == 0;
}

std::string configurationfile(std::size_t targets)
{
    std::string path = "configuration." + std::to_string(targets);
    if (!std::filesystem::exists(path)) {
        writefile(path, configurationtext(targets));
    }
    return path;
}

bool readsame(const std::string& path, reader peer)
{
    std::vector<wdmonitortarget> targets;
    return readbydaemon(path, xmlparser::alltargets) && peer(path, targets) &&
           sametargets(targets, xmlparser::alltargets);
}

void readrecords(benchmark::State& state, reader read, std::vector<wdmonitortarget>& targets)
{
    listing = false;
    const std::string path = configurationfile(static_cast<std::size_t>(state.range(0)));
    if (read != readbydaemon && !readsame(path, read)) {
        state.SkipWithError("it does not read what the daemon reads");
        return;
    }
    for ([[maybe_unused]] auto _ : state) {
        targets.clear();
        benchmark::DoNotOptimize(read(path, targets));
    }
    targets.clear();
    targets.shrink_to_fit();
}

void load(benchmark::State& state)
{
    prepare("/dev/null");
    listing = true;
    const std::string path = configurationfile(static_cast<std::size_t>(state.range(0)));
    for ([[maybe_unused]] auto _ : state) {
        benchmark::DoNotOptimize(xmlparser::parse(path));
    }
    if (xmlparser::allservices.size() != 2 * static_cast<std::size_t>(state.range(0))) {
        state.SkipWithError("not all services were found");
    }
}

} // namespace

// The end of the document lists the whole configuration in the log, which no library does.
extern "C" {

void __real__Z11endDocumentv();

void __wrap__Z11endDocumentv()
{
    if (listing) {
        __real__Z11endDocumentv();
    }
}

} // extern "C"

void registerload(bool brief)
{
    static std::vector<wdmonitortarget> peertargets;
    const std::vector<std::int64_t> sizes =
        brief ? std::vector<std::int64_t>{1, 10}
              : std::vector<std::int64_t>{1, 100, 1000, 10000, 20000};
    for (const std::int64_t size : sizes) {
        const auto add = [size](const char* name, reader read, auto& targets) {
            benchmark::RegisterBenchmark(name, readrecords, read, std::ref(targets))
                ->Arg(size)
                ->Unit(benchmark::kMicrosecond);
        };
        add("records/tolkwd", readbydaemon, xmlparser::alltargets);
        add("records/expat", readbyexpat, peertargets);
        add("records/pugixml", readbypugixml, peertargets);
        benchmark::RegisterBenchmark("load/tolkwd", load)->Arg(size)->Unit(benchmark::kMicrosecond);
    }
}
