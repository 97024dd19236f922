#include "roster.h"

#include <algorithm>

namespace report {

namespace {

constexpr std::size_t kFirstPlaces = 256;

} // namespace

threadtable::threadtable() : places(kFirstPlaces) {}

void threadtable::set(const entry& known)
{
    entry& there = slot(known.thread);
    if (there.thread != 0) {
        there = known;
        return;
    }
    if ((used + 1) * 2 > places.size()) {
        grow();
    }
    slot(known.thread) = known;
    ++used;
}

// Those that stand behind it because its place was taken move up.
void threadtable::remove(std::uint64_t thread) noexcept
{
    auto hole = static_cast<std::size_t>(&slot(thread) - places.data());
    if (places[hole].thread == 0) {
        return;
    }
    for (std::size_t place = (hole + 1) & mask(); places[place].thread != 0;
         place = (place + 1) & mask()) {
        const std::size_t wanted = placeof(places[place].thread);
        if (((place - wanted) & mask()) >= ((place - hole) & mask())) {
            places[hole] = places[place];
            hole = place;
        }
    }
    places[hole] = {};
    --used;
}

threadtable::entry& threadtable::slot(std::uint64_t thread) noexcept
{
    std::size_t place = placeof(thread);
    while (places[place].thread != 0 && places[place].thread != thread) {
        place = (place + 1) & mask();
    }
    return places[place];
}

void threadtable::grow()
{
    std::vector<entry> before(places.size() * 2);
    before.swap(places);
    for (const entry& each : before) {
        if (each.thread != 0) {
            slot(each.thread) = each;
        }
    }
}

std::optional<serviceid> roster::byname(std::string_view name) const
{
    const auto found = names.find(name);
    return found == names.end() ? std::nullopt : std::optional(found->second);
}

std::optional<serviceid> roster::bypath(std::string_view path) const
{
    const auto found = paths.find(path);
    return found == paths.end() || found->second.count != 1 ? std::nullopt
                                                            : std::optional(found->second.ids);
}

bool roster::knowspath(std::string_view path) const
{
    return paths.find(path) != paths.end();
}

serviceid roster::add(std::string_view name)
{
    const auto result = static_cast<serviceid>(services.size());
    services.emplace_back();
    names.emplace(name, result);
    return result;
}

serviceid roster::addnameless(std::string_view path)
{
    const auto result = static_cast<serviceid>(services.size());
    services.emplace_back().nameless = true;
    ++nameless;
    setpath(result, path);
    return result;
}

void roster::name(serviceid service, std::string_view name)
{
    if (services.at(service).nameless) {
        services.at(service).nameless = false;
        --nameless;
        names.emplace(name, service);
    }
}

void roster::setpath(serviceid service, std::string_view path)
{
    std::string& known = services.at(service).path;
    if (known == path) {
        return;
    }
    if (const auto before = paths.find(known); before != paths.end()) {
        before->second.ids ^= service;
        if (--before->second.count == 0) {
            paths.erase(before);
        }
    }
    known = path;
    if (!path.empty()) {
        owners& all = paths[known];
        ++all.count;
        all.ids ^= service;
    }
}

void roster::tie(std::uint64_t thread, serviceid service, std::uint32_t generation)
{
    const threadtable::entry* const known = threads.find(thread);
    if (known == nullptr || known->service != service) {
        untie(thread);
        watched& watcher = services.at(service);
        std::uint64_t& kept = watcher.threads.at(watcher.next);
        watcher.next = (watcher.next + 1) % kThreadsKept;
        if (kept != 0) {
            threads.remove(kept);
        }
        kept = thread;
    }
    threads.set({thread, service, generation});
}

void roster::untie(std::uint64_t thread)
{
    const threadtable::entry* const known = threads.find(thread);
    if (known != nullptr) {
        auto& kept = services.at(known->service).threads;
        std::replace(kept.begin(), kept.end(), thread, std::uint64_t{0});
        threads.remove(thread);
    }
}

std::size_t roster::watchers(serviceid service, std::uint32_t generation) const
{
    const auto& kept = services.at(service).threads;
    return static_cast<std::size_t>(
        std::count_if(kept.begin(), kept.end(), [&](std::uint64_t thread) {
            const threadtable::entry* const known = threads.find(thread);
            return known != nullptr && known->generation == generation;
        }));
}

} // namespace report
