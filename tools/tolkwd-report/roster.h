// Who is who: which services there are, by name and by the path of their program, and which thread
// watches which. Thread ids are used again; a service keeps its last few.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <memory>
#include <optional>
#include <string_view>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "tracker.h"

namespace report {

inline constexpr serviceid kNobody = static_cast<serviceid>(-1);

// Thread ids -> services, with the generation in which the thread was heard of last. An id of 0 is
// no thread. One thread.
class threadtable {
public:
    struct entry {
        std::uint64_t thread = 0;
        serviceid service = kNobody;
        std::uint32_t generation = 0;
    };

    threadtable();

    // Null where the thread is not known; valid until the next change. In constant time, mostly
    // without a second look: each line of the log asks.
    [[nodiscard]] const entry* find(std::uint64_t thread) const noexcept
    {
        std::size_t place = placeof(thread);
        while (places[place].thread != 0) {
            if (places[place].thread == thread) {
                return &places[place];
            }
            place = (place + 1) & mask();
        }
        return nullptr;
    }

    // Sets what is known of the thread, which is not 0.
    void set(const entry& known);

    void remove(std::uint64_t thread) noexcept;

private:
    // Ids are addresses: their low bits are alike. The product's high bits depend on all of them.
    [[nodiscard]] std::size_t placeof(std::uint64_t thread) const noexcept
    {
        constexpr std::uint64_t kGoldenRatio = 0x9e3779b97f4a7c15U;
        constexpr unsigned kHighHalf = 32;
        return static_cast<std::size_t>((thread * kGoldenRatio) >> kHighHalf) & mask();
    }
    [[nodiscard]] std::size_t mask() const noexcept { return places.size() - 1; }
    entry& slot(std::uint64_t thread) noexcept;
    void grow();

    std::vector<entry> places; // a power of two, never more than half of it in use
    std::size_t used = 0;
};

// One thread. Names and paths have at most 65,535 bytes.
class roster {
public:
    roster() = default;
    ~roster() = default;
    roster(const roster&) = delete;
    roster& operator=(const roster&) = delete;

    // All that can be found; none where there is no such service, or the path is that of several.
    [[nodiscard]] std::optional<serviceid> byname(std::string_view name) const;
    [[nodiscard]] std::optional<serviceid> bypath(std::string_view path) const;
    [[nodiscard]] bool knowspath(std::string_view path) const;
    [[nodiscard]] const threadtable::entry* bythread(std::uint64_t thread) const noexcept
    {
        return threads.find(thread);
    }

    // A new service; its id is the number of those before. The name must not be another's.
    serviceid add(std::string_view name);

    // A new service of which only the path is known. Until it has a name it goes by `standin`, and
    // is not found by that.
    serviceid addnameless(std::string_view standin, std::string_view path);

    // Whether there are services without a name, and whether this is one.
    [[nodiscard]] bool hasnameless() const noexcept { return nameless != 0; }
    [[nodiscard]] bool isnameless(serviceid service) const { return services.at(service).nameless; }

    // Gives it a name, which must not be another's.
    void name(serviceid service, std::string_view name);

    // Valid until its name or its path changes.
    [[nodiscard]] std::string_view nameof(serviceid service) const
    {
        const watched& one = services.at(service);
        return {one.texts.get(), one.namebytes};
    }
    [[nodiscard]] std::string_view pathof(serviceid service) const
    {
        const watched& one = services.at(service);
        return {one.texts.get() + one.namebytes, one.pathbytes};
    }
    void setpath(serviceid service, std::string_view path);

    // From now on the thread, which is not 0, watches the service.
    void tie(std::uint64_t thread, serviceid service, std::uint32_t generation);
    void untie(std::uint64_t thread);

    // How many threads that were heard of in this generation watch the service.
    [[nodiscard]] std::size_t watchers(serviceid service, std::uint32_t generation) const;

private:
    // More than one only where several targets name the same service, and of former generations.
    static constexpr std::size_t kThreadsKept = 4;

    // A log may name a million services: each text is kept once, and nothing that few of them need.
    struct watched {
        std::unique_ptr<char[]> texts; // the name, and the path behind it
        std::uint16_t namebytes = 0;
        std::uint16_t pathbytes = 0;
        bool nameless = false;
        std::uint64_t thread = 0; // the one that was tied last, and those before it
        std::unique_ptr<std::array<std::uint64_t, kThreadsKept - 1>> before;
    };

    // Finds ids by the names that the services have.
    struct namehash {
        using is_transparent = void;
        const roster* who;
        std::size_t operator()(std::string_view name) const;
        std::size_t operator()(serviceid service) const;
    };
    struct samename {
        using is_transparent = void;
        const roster* who;
        bool operator()(serviceid one, serviceid other) const { return one == other; }
        bool operator()(std::string_view name, serviceid service) const;
    };

    // How many services have a path, and all their ids, one exclusive-or the other: of one service
    // that is its id.
    struct owners {
        std::uint32_t count = 0;
        serviceid ids = 0;
    };

    std::deque<watched> services;
    std::unordered_set<serviceid, namehash, samename> names{0, namehash{this}, samename{this}};
    std::unordered_map<std::size_t, owners> paths; // by the path's hash
    threadtable threads;
    std::size_t nameless = 0;

    void settexts(watched& one, std::string_view name, std::string_view path);
};

} // namespace report
