#include "history.h"

#include "overview.h"
#include "sources.h"

namespace report {

namespace {

// Reader and tracker, and what they tell.
class chain {
public:
    chain(wanted which, const eventlistener& told)
        : model({.happened = [this, &told](const event& what) { told(what, nameof(what)); },
                 .ended = {}}),
          lines(which, [this](const message& said) { model.hear(said); })
    {
    }

    logreader& reader() noexcept { return lines; }

    const tracker& conclude()
    {
        model.conclude(lines.count().last, true);
        return model;
    }

private:
    const std::string* nameof(const event& what)
    {
        if (!what.service) {
            return nullptr;
        }
        name = model.nameof(*what.service);
        return &name;
    }

    tracker model;
    logreader lines;
    std::string name; // of the event that is told
};

} // namespace

void readhistory(const std::vector<std::string>& names, wanted which, const eventlistener& told,
                 const std::function<void(std::string_view)>& named)
{
    chain all(which, told);
    readingalog([&] { readlogs(names, all.reader()); });
    const tracker& model = all.conclude();
    for (serviceid service = 0; service < model.services(); ++service) {
        named(model.nameof(service));
    }
}

void followhistory(const std::vector<std::string>& names, wanted which, const eventlistener& told,
                   const std::function<void()>& caughtup, const std::function<bool()>& proceed)
{
    chain all(which, told);
    bool tillend = true; // nobody has ended it before
    const auto asked = [&] {
        tillend = proceed();
        return tillend;
    };
    readingalog([&] {
        readlogs({names.begin(), names.end() - 1}, all.reader());
        followlog(names.back(), all.reader(), caughtup, asked);
    });
    if (tillend) {
        all.conclude();
    }
}

} // namespace report
