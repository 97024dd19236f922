// A stranger's text as JSON, which knows no text but UTF-8.
#pragma once

#include <string_view>

#include <nlohmann/json_fwd.hpp>

namespace tools {

// `text` as a string, or where it is not UTF-8, an object with its bytes in hexadecimal digits as
// "hex". Any thread.
nlohmann::ordered_json textjson(std::string_view text);

} // namespace tools
