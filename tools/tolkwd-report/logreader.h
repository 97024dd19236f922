// Bytes of a log -> messages. Takes the file as the daemon writes it and the journal as journalctl
// prints it (its short forms, cat, and export), in pieces of any size, in constant memory. Lines
// that no tolkwd wrote, lines that are torn, and lines that go on with the message before are told
// apart; nothing of what they hold does harm.
#pragma once

#include <cstddef>
#include <cstdint>
#include <ctime>
#include <functional>
#include <memory>
#include <string>
#include <string_view>

#include "bytesource.h"
#include "message.h"

namespace report {

// What was read.
struct readcount {
    std::uint64_t bytes = 0;
    std::uint64_t lines = 0;    // all, as an editor numbers them
    std::uint64_t messages = 0; // of the daemon's
    std::uint64_t foreign = 0;  // lines of others; those that go on with a message are not counted
    std::uint64_t torn = 0;     // beginnings and ends of lines that are not whole
    std::uint64_t clockchanges = 0; // how often the clock went back by more than a minute
    instant first;                  // of the first and the last message that has a time; both 0
    instant last;                   // where there is none
};

// How much of what it reads a listener wants to hear.
enum class wanted : std::uint8_t {
    kAll,         // each message
    kWhatMatters, // what matters(); all else is counted only
};

// How feedall() reads.
struct pace {
    std::size_t blockbytes; // at once
    std::size_t alone;      // how many bytes it reads without other threads
    unsigned helpers;       // how many there are then

    // As many threads as there are processors, within reason. Any thread.
    [[nodiscard]] static pace ofmachine() noexcept;
};

class logreader {
public:
    using listener = std::function<void(const message&)>;

    // Each message goes to `hear`, in the order of the log. The zone of the process (TZ) tells when
    // the log's clock changes by an hour; read once, here.
    logreader(wanted which, listener hear);
    ~logreader();
    logreader(const logreader&) = delete;
    logreader& operator=(const logreader&) = delete;

    // The next bytes. One thread. Messages are handed on once it is sure that they are whole.
    void feed(std::string_view bytes);

    // Likewise all bytes that `read` gives. Where these are many, lines are taken apart by other
    // threads, too: then `read` is called by any of them, by one at a time. Messages are told by
    // this one. What `read` throws is thrown here; of the last bytes before, the messages may not
    // have been told.
    void feedall(const bytesource& read, const pace& how = pace::ofmachine());

    // There is nothing more for now: hands on what was held back for lines that might follow it. A
    // line without its newline stays held back.
    void pause();

    // The file ends here, another begins: a line without its newline is taken as it is.
    void endfile();

    [[nodiscard]] const readcount& count() const noexcept;

    // A moment of the machine's clock, `utc` seconds since 1970, on the log's two clocks; not
    // before the last message.
    [[nodiscard]] instant at(std::time_t utc) const;

private:
    class work;
    std::unique_ptr<work> self;
};

} // namespace report
