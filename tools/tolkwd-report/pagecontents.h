// From logs to the page's contents.
#pragma once

#include "page.h"

namespace report {

// Reads the logs of these names for the page, judged as of their last line or, `asofnow`, the
// present. Throws unreadablelog. One thread.
pagecontents readpage(const std::vector<std::string>& names, bool asofnow);

} // namespace report
