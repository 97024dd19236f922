#include "roster.h"

#include <algorithm>
#include <functional>
#include <utility>

namespace report {

namespace {

constexpr std::size_t kFirstPlaces = 256;

std::size_t hashof(std::string_view text)
{
    return std::hash<std::string_view>{}(text);
}

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

std::size_t roster::namehash::operator()(std::string_view name) const
{
    return hashof(name);
}

std::size_t roster::namehash::operator()(serviceid service) const
{
    return hashof(who->nameof(service));
}

bool roster::samename::operator()(std::string_view name, serviceid service) const
{
    return name == who->nameof(service);
}

std::optional<serviceid> roster::byname(std::string_view name) const
{
    const auto found = names.find(name);
    return found == names.end() ? std::nullopt : std::optional(*found);
}

std::optional<serviceid> roster::bypath(std::string_view path) const
{
    const auto found = paths.find(hashof(path));
    const bool isone = found != paths.end() && found->second.count == 1;
    return isone && pathof(found->second.ids) == path ? std::optional(found->second.ids)
                                                      : std::nullopt;
}

bool roster::knowspath(std::string_view path) const
{
    return paths.contains(hashof(path));
}

serviceid roster::add(std::string_view name)
{
    const auto result = static_cast<serviceid>(services.size());
    settexts(services.emplace_back(), name, {});
    names.insert(result);
    return result;
}

serviceid roster::addnameless(std::string_view standin, std::string_view path)
{
    const auto result = static_cast<serviceid>(services.size());
    watched& added = services.emplace_back();
    added.nameless = true;
    settexts(added, standin, {});
    ++nameless;
    setpath(result, path);
    return result;
}

void roster::name(serviceid service, std::string_view name)
{
    watched& one = services.at(service);
    if (one.nameless) {
        one.nameless = false;
        --nameless;
        settexts(one, name, pathof(service));
        names.insert(service);
    }
}

void roster::setpath(serviceid service, std::string_view path)
{
    const std::string_view known = pathof(service);
    if (known == path) {
        return;
    }
    if (const auto before = paths.find(hashof(known)); !known.empty() && before != paths.end()) {
        before->second.ids ^= service;
        if (--before->second.count == 0) {
            paths.erase(before);
        }
    }
    settexts(services.at(service), nameof(service), path);
    if (!path.empty()) {
        owners& all = paths[hashof(path)];
        ++all.count;
        all.ids ^= service;
    }
}

// The texts may be parts of those that it has.
void roster::settexts(watched& one, std::string_view name, std::string_view path)
{
    auto texts = std::make_unique_for_overwrite<char[]>(name.size() + path.size());
    path.copy(texts.get() + name.copy(texts.get(), name.size()), path.size());
    one.namebytes = static_cast<std::uint16_t>(name.size());
    one.pathbytes = static_cast<std::uint16_t>(path.size());
    one.texts = std::move(texts);
}

void roster::tie(std::uint64_t thread, serviceid service, std::uint32_t generation)
{
    const threadtable::entry* const known = threads.find(thread);
    if (known == nullptr || known->service != service) {
        untie(thread);
        watched& watcher = services.at(service);
        if (watcher.thread != 0 && !watcher.before) {
            watcher.before = std::make_unique<std::array<std::uint64_t, kThreadsKept - 1>>();
        }
        if (watcher.before) {
            auto& before = *watcher.before;
            if (before.back() != 0) {
                threads.remove(before.back());
            }
            std::shift_right(before.begin(), before.end(), 1);
            before.front() = watcher.thread;
        }
        watcher.thread = thread;
    }
    threads.set({thread, service, generation});
}

void roster::untie(std::uint64_t thread)
{
    const threadtable::entry* const known = threads.find(thread);
    if (known != nullptr) {
        watched& watcher = services.at(known->service);
        if (watcher.thread == thread) {
            watcher.thread = 0;
        } else if (watcher.before) {
            std::replace(watcher.before->begin(), watcher.before->end(), thread, std::uint64_t{0});
        }
        threads.remove(thread);
    }
}

std::size_t roster::watchers(serviceid service, std::uint32_t generation) const
{
    const watched& watcher = services.at(service);
    const auto speaks = [&](std::uint64_t thread) {
        const threadtable::entry* const known = threads.find(thread);
        return known != nullptr && known->generation == generation;
    };
    const std::ptrdiff_t others =
        watcher.before ? std::count_if(watcher.before->begin(), watcher.before->end(), speaks) : 0;
    return static_cast<std::size_t>(others) + (speaks(watcher.thread) ? 1 : 0);
}

} // namespace report
