#include "lexahead.h"

#include <cstring>
#include <string_view>
#include <system_error>
#include <utility>

namespace report {

namespace {

constexpr std::size_t kBlocksEach = 2; // more would not stay in the processor's cache

} // namespace

lexahead::lexahead(const settings& how, bytesource read)
    : blockbytes(how.blockbytes), source(std::move(read)), blocks(kBlocksEach * (how.helpers + 1)),
      own(how.all)
{
    for (block& each : blocks) {
        each.bytes = std::make_unique_for_overwrite<char[]>(blockbytes);
    }
    try {
        for (unsigned helper = 0; helper < how.helpers; ++helper) {
            helpers.emplace_back([this, all = how.all] { help(all); });
        }
    } catch (const std::system_error&) { // NOLINT(bugprone-empty-catch): fewer will do
    }
}

lexahead::~lexahead()
{
    stop();
    for (std::thread& helper : helpers) {
        helper.join();
    }
}

const lexedbytes* lexahead::next()
{
    std::unique_lock lock(mutex);
    if (std::exchange(given, false)) {
        blocks[taken % blocks.size()].ready = false;
        ++taken;
        changed.notify_all();
    }
    for (;;) {
        block& due = blocks[taken % blocks.size()];
        if (due.ready) {
            if (due.failure) {
                std::rethrow_exception(due.failure);
            }
            given = true;
            return &due.lines;
        }
        if (ended && taken == begun) {
            return nullptr;
        }
        if (mayread()) {
            prepare(lock, own);
        } else {
            changed.wait(lock);
        }
    }
}

bool lexahead::mayread() const noexcept
{
    return !ended && !isreading && begun - taken < blocks.size();
}

// What a helper does.
void lexahead::help(bool all)
{
    linelexer lexer(all);
    std::unique_lock lock(mutex);
    for (;;) {
        changed.wait(lock, [this] { return ended || mayread(); });
        if (ended) {
            return;
        }
        prepare(lock, lexer);
    }
}

// Reads the next block and takes it apart. The lock is held before and behind it.
void lexahead::prepare(std::unique_lock<std::mutex>& lock, linelexer& lexer)
{
    block& mine = blocks[begun % blocks.size()];
    ++begun;
    isreading = true;
    lock.unlock();
    std::size_t size = 0;
    try {
        size = fill(mine);
    } catch (...) {
        mine.failure = std::current_exception();
    }
    lock.lock();
    isreading = false;
    if (size == 0) {
        ended = true; // its block is the last one, and empty
    }
    changed.notify_all();
    lock.unlock();
    try {
        lexer.lex({mine.bytes.get(), size}, mine.lines);
    } catch (...) {
        mine.failure = std::current_exception();
    }
    lock.lock();
    mine.ready = true;
    changed.notify_all();
}

// Returns how many bytes the block has; what stands behind its last newline is left to the next.
std::size_t lexahead::fill(block& into)
{
    char* const bytes = into.bytes.get();
    std::size_t size = beginning.copy(bytes, beginning.size());
    beginning.clear();
    std::size_t got = 1;
    while (size < blockbytes && got > 0) {
        got = source(bytes + size, blockbytes - size);
        size += got;
    }
    const std::string_view all(bytes, size);
    const std::size_t newline = all.rfind('\n');
    if (got > 0 && newline != std::string_view::npos) {
        beginning = all.substr(newline + 1);
        return newline + 1;
    }
    return size;
}

void lexahead::stop()
{
    const std::lock_guard lock(mutex);
    ended = true;
    changed.notify_all();
}

} // namespace report
