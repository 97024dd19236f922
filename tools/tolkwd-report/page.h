// The picture: one self-contained HTML page.
#pragma once

#include <ostream>
#include <string>
#include <vector>

#include "logreader.h"
#include "tracker.h"

namespace report {

// What the page shows of one service.
struct pageservice {
    account figures;
    std::vector<span> spans; // in order
};

// A moment that the page marks on a service's time line.
struct pagemark {
    serviceid service = 0;
    eventkind kind = eventkind::kStep;
    instant when;
    bool inferred = false;
    std::string words; // what happened, in plain words
};

struct pagecontents {
    std::vector<std::string> files; // the logs' names, as they were given
    readcount count;
    std::vector<pageservice> services;
    bool loadfailed = false;     // the last load of the configuration, so that nothing is watched
    std::vector<pagemark> marks; // recoveries, give-ups and the like, in order
};

// Writes the page. It needs nothing but itself: no network, no other file. One thread.
void writepage(std::ostream& out, const pagecontents& contents);

} // namespace report
