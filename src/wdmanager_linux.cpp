#include "wdmanager_linux.h"

#include <atomic>
#include <stdexcept>
#include <utility>

#include <pthread.h>
#include <unistd.h>

#include "wdlogbuffer.h"
#include "wdsettings.h"
#include "xmlparser.h"

namespace {

constexpr const char* kModule = "wdmanager";
constexpr unsigned kTickSeconds = 1;

void* const kNoLock = reinterpret_cast<void*>(1); // NOLINT(performance-no-int-to-ptr): exit value

void enablemonitoring(bool enable)
{
    std::atomic_ref(globalenable).store(enable ? 1 : 0);
}

// 0 on success. An empty tag raises out of the reader; to the manager that is a load that failed,
// for a typing error in a configuration must not end a watchdog.
int readconfiguration(const std::string& path)
{
    try {
        return xmlparser::parse(path);
    } catch (const std::out_of_range&) {
        return 1;
    }
}

} // namespace

wdmanager::wdmanager(std::string config, std::string log)
    : configfile(std::move(config)), locallog(new wdLocalLog(log)), logpath(std::move(log))
{
    loadservices(configfile);
    enablemonitoring(true);
}

wdmanager::wdmanager(const char* config) : configfile(config)
{
    loadservices(configfile);
    enablemonitoring(true);
}

void wdmanager::loadservices(std::string path)
{
    if (readconfiguration(path) != 0) {
        wdlog(kModule, kLevelError, "Loadservices error.");
        return;
    }
    targets = xmlparser::alltargets;
}

int wdmanager::refreshconfig()
{
    targets.clear();
    xmlparser::alltargets.clear();
    loadservices(configfile);
    return 1;
}

void wdmanager::wdstart()
{
    int ticks = 0;
    for (;;) {
        if (ticks == globalrefresh) {
            stopgeneration();
            refreshconfig();
            ticks = 0;
            continue;
        }
        ++ticks;
        sleep(kTickSeconds);
        if (ticks == 1) {
            startgeneration();
        }
    }
}

void wdmanager::startgeneration()
{
    enablemonitoring(true);
    threads.clear();
    threads.reserve(targets.size());
    // The threads take the records over: the manager reads its list no more before the next load,
    // and with a thousand targets it would be a tenth of the daemon's memory.
    for (wdmonitortarget& watched : targets) {
        threads.emplace_back(std::move(watched));
    }
    std::vector<wdmonitortarget>().swap(targets);
    if (pthread_rwlock_init(&pingreclock, nullptr) != 0) {
        wdlog(kModule, kLevelError, "Failed to init the pingreclock.");
        pthread_exit(kNoLock);
    }
    for (wdmonitorthread& thread : threads) {
        thread.create();
    }
}

// Each thread ends at the top of its next cycle; until then all the retries and recoveries of an
// outage may pass.
void wdmanager::stopgeneration()
{
    enablemonitoring(false);
    wdlog(kModule, kLevelDebug, "After globalrefresh times refreshconfig,join threadas*");
    for (wdmonitorthread& thread : threads) {
        wdlog(kModule, kLevelDebug, "before join......");
        thread.join();
        wdlog(kModule, kLevelDebug, "after join......");
    }
    pthread_rwlock_destroy(&pingreclock);
}
