#include "ProcessStatistics_Linux.h"

#include <cerrno>
#include <cstdint>
#include <ctime>
#include <sstream>
#include <utility>

#include "wdlogbuffer.h"

namespace {

constexpr const char* kModule = "ProcessStatistics";

// What a command prints is taken in pieces: a line, or so many characters of a longer one.
constexpr std::size_t kPieceCharacters = 127;

// Places of the figures in /proc/PID/stat, counted from 0.
constexpr std::size_t kUserTimeField = 13;
constexpr std::size_t kThreadCountField = 19;
constexpr std::size_t kResidentPagesField = 23;
constexpr std::size_t kLeastFields = kResidentPagesField + 1;

// (ticks * 1000) / seconds in 32 bits. Wraps where that overflows: clocks are stepped and tick
// counts wrap, and neither may be undefined behaviour.
int ticksperkilosecond(int fromTicks, int toTicks, int fromTime, int toTime)
{
    const auto difference = [](int from, int to) {
        return static_cast<std::uint32_t>(to) - static_cast<std::uint32_t>(from);
    };
    const auto ticks = static_cast<std::int32_t>(difference(fromTicks, toTicks) * 1000U);
    const auto seconds = static_cast<std::int32_t>(difference(fromTime, toTime));
    return static_cast<std::int32_t>(std::int64_t{ticks} / seconds);
}

constexpr int kFetchFailed = 1;

void logfetchfailure(const std::string& name)
{
    wdlog(kModule, kLevelError, "(", name, ") Unable to fetch stats of process from system");
}

// All that the pipe delivers, of each piece what stands before a NUL byte. Reads on after an
// interruption and stops at any other error. Not fgets: when it is interrupted, what it has read of
// the piece is lost.
std::string readpieces(std::FILE* pipe)
{
    std::string text;
    std::string piece;
    for (;;) {
        const int c = std::getc(pipe);
        if (c == EOF && std::ferror(pipe) != 0 && errno == EINTR) {
            std::clearerr(pipe);
            continue;
        }
        if (c != EOF) {
            piece += static_cast<char>(c);
        }
        if (c == EOF || c == '\n' || piece.size() == kPieceCharacters) {
            text.append(piece, 0, piece.find('\0'));
            piece.clear();
        }
        if (c == EOF) {
            return text;
        }
    }
}

// A byte of value 0xFF ends the reading like the end of the file does. It is narrowed to a signed
// char on purpose, so that this is so, and the loop ends, on machines whose char is unsigned too.
std::string readstat(std::FILE* file)
{
    std::string content;
    for (auto c = static_cast<signed char>(std::getc(file)); c != EOF;
         c = static_cast<signed char>(std::getc(file))) {
        content += static_cast<char>(c);
    }
    return content;
}

} // namespace

int Utility::exec(std::string command, std::string& output)
{
    // "e": close-on-exec, so that no service started meanwhile keeps this pipe open.
    std::FILE* pipe = popen(command.c_str(), "re");
    if (pipe == nullptr) {
        return 1;
    }
    output = readpieces(pipe);
    pclose(pipe);
    return 0;
}

std::string Utility::pidof(std::string program)
{
    std::string output;
    exec("pidof " + program, output);
    if (output.empty()) {
        exec("pidof `basename " + program + "`", output);
    }
    return output;
}

int Utility::str2int(std::string text)
{
    int value = 0;
    std::istringstream(text) >> value;
    return value;
}

std::vector<std::string>& Utility::split2(const std::string& text, char separator,
                                          std::vector<std::string>& pieces)
{
    std::istringstream stream(text);
    for (std::string piece; std::getline(stream, piece, separator);) {
        pieces.push_back(piece);
    }
    return pieces;
}

std::vector<std::string> Utility::split(const std::string& text, char separator)
{
    std::vector<std::string> pieces;
    split2(text, separator, pieces);
    return pieces;
}

void Utility::StreamCloser::operator()(std::FILE* stream) const noexcept
{
    (void)std::fclose(stream); // only read from: nothing can be lost
}

Utility::InputFile Utility::OpenToRead(const std::string& path)
{
    return InputFile(std::fopen(path.c_str(), "re"));
}

ProcessStatistics::ProcessStatistics(std::string program) : name(std::move(program)) {}

void ProcessStatistics::SetName(std::string program)
{
    name = std::move(program);
}

void ProcessStatistics::SetThresholdAverageCPUUsage(std::string text)
{
    thresholdAverageCPUUsage = Utility::str2int(std::move(text));
}

void ProcessStatistics::SetThresholdThreadCount(std::string text)
{
    thresholdThreadCount = Utility::str2int(std::move(text));
}

void ProcessStatistics::SetThresholdMemoryUsage(std::string text)
{
    thresholdMemoryUsage = Utility::str2int(std::move(text));
}

int ProcessStatistics::GetThresholdAverageCPUUsage() const noexcept
{
    return thresholdAverageCPUUsage;
}

int ProcessStatistics::GetThresholdThreadCount() const noexcept
{
    return thresholdThreadCount;
}

int ProcessStatistics::GetThresholdMemoryUsage() const noexcept
{
    return thresholdMemoryUsage;
}

int ProcessStatistics::GetAverageCPUUsage() const noexcept
{
    return averageCPUUsage;
}

int ProcessStatistics::GetNumberOfThreads() const noexcept
{
    return numberOfThreads;
}

int ProcessStatistics::GetMemoryUsage() const noexcept
{
    return memoryUsage;
}

void ProcessStatistics::UpdatePID()
{
    const int found = Utility::str2int(Utility::pidof(name));
    if (found == pid) {
        return;
    }
    wdlog(kModule, kLevelDebug, "(", name, ") PID changed (old = ", pid, ", new = ", found, ")");
    pid = found;
    // Only the baseline goes: the old CPU figure stands until two refreshes of the new process.
    lastRefreshTime = 0;
}

int ProcessStatistics::FetchStatisticsFromSystem(std::vector<std::string>& fields)
{
    const auto file = Utility::OpenToRead("/proc/" + std::to_string(pid) + "/stat");
    if (!file) {
        logfetchfailure(name);
        return kFetchFailed;
    }
    // Cut at every blank. A blank within the program's name shifts the fields behind it; that is
    // known, and which figures a check then compares must not change under an operator's feet.
    fields = Utility::split(readstat(file.get()), ' ');
    return 0;
}

int ProcessStatistics::Refresh()
{
    std::vector<std::string> fields;
    if (const int failure = FetchStatisticsFromSystem(fields); failure != 0) {
        return failure;
    }
    if (fields.size() < kLeastFields) {
        logfetchfailure(name);
        return kFetchFailed;
    }
    const auto now = static_cast<int>(time(nullptr));
    const int userTime = Utility::str2int(fields[kUserTimeField]);
    numberOfThreads = Utility::str2int(fields[kThreadCountField]);
    memoryUsage = Utility::str2int(fields[kResidentPagesField]);
    if (lastRefreshTime != 0) {
        if (now != lastRefreshTime) {
            averageCPUUsage = ticksperkilosecond(lastUserTime, userTime, lastRefreshTime, now);
        } else {
            wdlog(kModule, kLevelDebug, "Refresh called twice in zero time interval");
        }
    }
    lastRefreshTime = now;
    lastUserTime = userTime;
    return 0;
}

bool ProcessStatistics::IsThresholdReached()
{
    UpdatePID();
    Refresh();
    wdlog(kModule, kLevelDebug, "(", name, ") averageCPUUsage/Threshold:", averageCPUUsage, "/",
          thresholdAverageCPUUsage);
    wdlog(kModule, kLevelDebug, "(", name, ") numberOfThreads/Threshold:", numberOfThreads, "/",
          thresholdThreadCount);
    wdlog(kModule, kLevelDebug, "(", name, ") memoryUsage/Threshold:", memoryUsage, "/",
          thresholdMemoryUsage);
    if (averageCPUUsage > thresholdAverageCPUUsage || numberOfThreads > thresholdThreadCount ||
        memoryUsage > thresholdMemoryUsage) {
        wdlog(kModule, kLevelDebug, "(", name, ") Threshold is reached");
        return true;
    }
    wdlog(kModule, kLevelDebug, "(", name, ") Threshold is not reached");
    return false;
}
