// Composes the text of one log message with the `<<` of output streams, cheaply: as long as only
// text goes in, the buffer is a string that grows. The first number, pointer, bool or manipulator
// makes it create a string stream, hand over the text so far and let the chain go on there. str()
// gives the finished text, whichever of the two forms the chain ended in.
//
// Most callers want wdlog() at the end of this file: composing and writing in one expression.
#pragma once

#include <memory>
#include <sstream>
#include <string>

#include "wdLocalLog_linux.h"
#include "wdsettings.h"

// A local object of one message in one thread; it takes no lock and is never copied.
class WDLogBuffer {
public:
    WDLogBuffer() = default;
    ~WDLogBuffer() = default;
    WDLogBuffer(const WDLogBuffer&) = delete;
    WDLogBuffer& operator=(const WDLogBuffer&) = delete;

    // Text. The chain stays on the buffer. A null pointer is written as "null".
    WDLogBuffer& operator<<(const char* piece);
    WDLogBuffer& operator<<(char* piece);
    WDLogBuffer& operator<<(const std::string& piece);
    WDLogBuffer& operator<<(char piece);

    // Everything that needs formatting. The chain goes on on the buffer's own stream.
    std::ostream& operator<<(void* value);
    std::ostream& operator<<(long double value);
    std::ostream& operator<<(double value);
    std::ostream& operator<<(float value);
    std::ostream& operator<<(unsigned long value);
    std::ostream& operator<<(long value);
    std::ostream& operator<<(unsigned int value);
    std::ostream& operator<<(int value);
    std::ostream& operator<<(short value);
    std::ostream& operator<<(bool value);
    std::ostream& operator<<(std::ios_base& (*manipulator)(std::ios_base&));

    // The buffer's stream, created on first use with the text so far. Owned by the buffer.
    // Implicit: a buffer stands wherever a stream is wanted.
    operator std::ostream&();

    [[nodiscard]] bool hasStream() const noexcept;

    // The finished text, valid as long as the buffer. `chainEnd` is the value of the chain of
    // insertions; its type alone tells where the text is. The second form needs hasStream().
    std::string& str(WDLogBuffer& chainEnd);
    std::string& str(std::ostream& chainEnd);

private:
    std::string text; // the message, until there is a stream; then scratch
    std::unique_ptr<std::ostringstream> stream; // once there, every insertion goes here
};

// Composes `pieces` and writes them as one line; `level` is one of loglevel. A line that will be
// dropped is not composed, but the log is opened for it all the same. Any thread; behaves as
// wdLocalLog::LogMessage does when the log cannot be opened.
template <typename... Pieces>
void wdlog(const char* module, int level, const Pieces&... pieces)
{
    if (level == kLevelDebug && !debugenable) {
        wdLocalLog::LogMessage(module, level, {});
        return;
    }
    WDLogBuffer buffer;
    wdLocalLog::LogMessage(module, level, buffer.str((buffer << ... << pieces)));
}
