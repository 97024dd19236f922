#include "daemonview.h"

#include <algorithm>
#include <cerrno>
#include <string>
#include <system_error>

#include <sys/mman.h>
#include <unistd.h>

#include "xmlparser.h"
#include "xmlscan.h"

namespace check {

namespace {

// A file that lies in memory: the daemon opens what it reads, and what is read has to be what is
// reported on, also when somebody writes to the file meanwhile.
class memoryfile {
public:
    explicit memoryfile(std::string_view text) : fd(memfd_create("configuration", MFD_CLOEXEC))
    {
        if (fd < 0) {
            throw std::system_error(errno, std::generic_category(), "memory for the file");
        }
        while (!text.empty()) {
            const ssize_t written = write(fd, text.data(), text.size());
            if (written < 0) {
                const int reason = errno;
                close(fd);
                throw std::system_error(reason, std::generic_category(), "memory for the file");
            }
            text.remove_prefix(static_cast<std::size_t>(written));
        }
        if (access(path().c_str(), R_OK) != 0) {
            const int reason = errno;
            close(fd);
            throw std::system_error(reason, std::generic_category(), "/proc/self/fd");
        }
    }
    ~memoryfile() { close(fd); }
    memoryfile(const memoryfile&) = delete;
    memoryfile& operator=(const memoryfile&) = delete;

    // For this process only.
    [[nodiscard]] std::string path() const { return "/proc/self/fd/" + std::to_string(fd); }

private:
    int fd;
};

// The state of the handler in a daemon that has just started.
void resethandler()
{
    xercecstack = {};
    charparse.clear();
    monitorservice = {};
    monservicedep = {};
    monservicedepends.clear();
    target = {};
    xmlparser::alltargets.clear();
    xmlparser::allservices.clear();
}

// Hands the tokens on to the handler and notes what it does with each.
class observer {
public:
    explicit observer(daemonview& noted) : view(noted) {}

    void operator()(const xmltoken& token)
    {
        switch (token.what) {
        case xmltoken::kStartTag:
            open(token);
            break;
        case xmltoken::kText:
            lasttext = token.place;
            characters(std::string(token.content));
            break;
        case xmltoken::kEndTag:
            close(token);
            break;
        }
    }

    // Unknown names are never closed.
    void finish()
    {
        for (std::size_t i = 0; i < opened.size(); ++i) {
            if (unknown[i]) {
                view.neverclosed.push_back(opened[i]);
            }
        }
    }

private:
    static bool isknown(std::string_view name)
    {
        return name == "wdtargets" || name == "wdmonitortarget" || name == "wdmonitorservice" ||
               name == "wdmondependsev" || fieldindex(name) != kFieldElements.size();
    }

    void open(const xmltoken& token)
    {
        if (token.content == "wdmonitortarget") {
            dependents.clear();
            monitored.begin = kNoPlace;
        } else if (token.content == "wdmonitorservice") {
            monitored.begin = token.place;
        } else if (token.content == "wdmondependsev") {
            dependent.begin = token.place;
        }
        opened.push_back(token.place);
        unknown.push_back(!isknown(token.content));
        startElement(std::string(token.content));
    }

    void close(const xmltoken& token)
    {
        // An unknown name stays on the stack, so it need not be kept; and it may be very long.
        const std::string name = opened.empty() || unknown.back() ? "" : xercecstack.top();
        const std::size_t depth = xercecstack.size();
        const std::size_t targets = xmlparser::alltargets.size();
        endElement(std::string(token.content));
        if (xercecstack.size() == depth) {
            return;
        }
        const std::size_t begin = opened.back();
        opened.pop_back();
        unknown.pop_back();
        if (const std::size_t field = fieldindex(name); field != kFieldElements.size()) {
            const bool inmonitored =
                !xercecstack.empty() && xercecstack.top() == "wdmonitorservice";
            (inmonitored ? monitored : dependent).origins.at(field) = {begin, lasttext};
        } else if (name == "wdmonitorservice") {
            monitored.end = token.place;
        } else if (name == "wdmondependsev") {
            dependent.end = token.place;
            dependent.begin = begin;
            dependents.push_back(dependent);
        } else if (xmlparser::alltargets.size() > targets) {
            view.targets.push_back({begin, token.place, monitored, dependents});
        }
    }

    daemonview& view;
    std::vector<std::size_t> opened; // places of the start tags on xercecstack
    std::vector<bool> unknown;
    std::size_t lasttext = kNoPlace;
    serviceview monitored;
    serviceview dependent;
    std::vector<serviceview> dependents;
};

// Only now do the records stay where they are.
void pointtorecords(daemonview& view)
{
    for (std::size_t i = 0; i < view.targets.size(); ++i) {
        const wdmonitortarget& made = xmlparser::alltargets.at(i);
        view.targets[i].monitored.record = &made.monitoredservice;
        for (std::size_t j = 0; j < view.targets[i].dependents.size(); ++j) {
            view.targets[i].dependents[j].record = &made.dependentservices.at(j);
        }
    }
}

} // namespace

std::size_t fieldindex(std::string_view name) noexcept
{
    const auto* const found =
        std::find_if(kFieldElements.begin(), kFieldElements.end(),
                     [name](const fieldelement& known) { return known.name == name; });
    return static_cast<std::size_t>(found - kFieldElements.begin());
}

std::size_t fieldindex(std::string service::*field) noexcept
{
    const auto* const found =
        std::find_if(kFieldElements.begin(), kFieldElements.end(),
                     [field](const fieldelement& known) { return known.field == field; });
    return static_cast<std::size_t>(found - kFieldElements.begin());
}

daemonview readasdaemon(std::string_view text)
{
    resethandler();
    daemonview view;
    const memoryfile file(text);
    observer watching(view);
    try {
        scanfile(file.path(), std::ref(watching));
        collectservices();
    } catch (const emptytag& failure) {
        view.loaded = false;
        view.failure = failure.place;
    }
    watching.finish();
    pointtorecords(view);
    return view;
}

} // namespace check
