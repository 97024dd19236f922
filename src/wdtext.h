// The text of one configured value. Copies share it.
//
// Every record of the configuration is held four times: in the reader's two lists, the manager's
// list and a monitor thread's own copy; and most values are the same in every service of a file.
// With a thousand targets these copies, as strings, were a quarter of the daemon's memory.
#pragma once

#include <atomic>
#include <string>
#include <string_view>
#include <utility>

// Behaves as an immutable string value that can be replaced as a whole. A single object belongs to
// one thread at a time, like a string; copies may be used, replaced and destroyed by any threads at
// once. Takes no lock.
class wdtext {
public:
    wdtext() noexcept = default; // the empty text
    explicit wdtext(std::string_view text)
        : held(text.empty() ? nullptr : new shared{{1}, std::string(text)})
    {
    }
    wdtext(const wdtext& other) noexcept : held(other.held)
    {
        if (held != nullptr) {
            held->owners.fetch_add(1, std::memory_order_relaxed);
        }
    }
    wdtext(wdtext&& other) noexcept : held(std::exchange(other.held, nullptr)) {}

    // The last owner has to see all that the others did with the text before it deletes it.
    ~wdtext()
    {
        if (held != nullptr && held->owners.fetch_sub(1, std::memory_order_acq_rel) == 1) {
            delete held;
        }
    }

    wdtext& operator=(const wdtext& other) noexcept
    {
        if (held != other.held) {
            wdtext copy(other);
            std::swap(held, copy.held);
        }
        return *this;
    }
    wdtext& operator=(wdtext&& other) noexcept
    {
        wdtext taken(std::move(other));
        std::swap(held, taken.held);
        return *this;
    }

    // Where `text` is what it holds already, it goes on sharing that with its copies.
    wdtext& operator=(std::string_view text)
    {
        if (str() != text) {
            *this = wdtext(text);
        }
        return *this;
    }

    // Valid until this object is replaced or destroyed.
    [[nodiscard]] const std::string& str() const noexcept
    {
        return held != nullptr ? held->text : kEmpty;
    }

    // Implicit: a value stands wherever a string is read.
    operator const std::string&() const noexcept { return str(); }

    friend bool operator==(const wdtext& left, const wdtext& right) noexcept
    {
        return left.held == right.held || left.str() == right.str();
    }
    friend bool operator==(const wdtext& left, std::string_view right) noexcept
    {
        return left.str() == right;
    }

private:
    struct shared {
        std::atomic<unsigned long> owners;
        const std::string text;
    };

    static inline const std::string kEmpty;

    shared* held = nullptr; // null: the empty text
};
