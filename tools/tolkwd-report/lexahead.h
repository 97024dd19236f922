// Takes a log's lines apart ahead of the one who reads them, by several threads. The log is read in
// blocks of whole lines; each block is read, then taken apart, by whoever has nothing else to do,
// the reader's own thread included; the reader gets them in order. As many blocks as there are in
// memory are taken anew as soon as the reader is done with them, so memory does not grow.
#pragma once

#include <condition_variable>
#include <cstddef>
#include <exception>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "bytesource.h"
#include "linelexer.h"

namespace report {

class lexahead {
public:
    struct settings {
        bool all = false;           // as linelexer's
        std::size_t blockbytes = 0; // how much is read at once
        unsigned helpers = 0;       // how many threads there are besides the caller's, at most
    };

    // `read` is called by any of the threads, by one at a time, in order.
    lexahead(const settings& how, bytesource read);

    // Waits for what is being read.
    ~lexahead();
    lexahead(const lexahead&) = delete;
    lexahead& operator=(const lexahead&) = delete;

    // The next block; null at the end. It begins where the one before ended, and ends with a line
    // unless that is longer than a block or the last one. Valid until the next call. What `read`
    // throws is thrown here, in its turn. One thread.
    const lexedbytes* next();

private:
    struct block {
        std::unique_ptr<char[]> bytes;
        lexedbytes lines;
        bool ready = false;
        std::exception_ptr failure;
    };

    const std::size_t blockbytes;
    const bytesource source;

    // Of whoever reads: isreading says that somebody does.
    std::string beginning; // of a line, whose end was not in the block before

    // The numbers count blocks; the place of one is its number modulo their count.
    std::mutex mutex;
    std::condition_variable changed;
    std::size_t begun = 0; // have been read or are being read
    std::size_t taken = 0; // the reader is done with
    bool isreading = false;
    bool ended = false; // there is nothing more to read
    std::vector<block> blocks;

    linelexer own;
    bool given = false; // the reader has a block
    std::vector<std::thread> helpers;

    [[nodiscard]] bool mayread() const noexcept;
    void help(bool all);
    void prepare(std::unique_lock<std::mutex>& lock, linelexer& lexer);
    std::size_t fill(block& into);
    void stop();
};

} // namespace report
