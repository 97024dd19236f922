# cmake -D PAGE=.. -D STYLE=.. -D SCRIPTS=.. -D LIBRARY=.. -D LICENCE=.. -D SCRIPT_OUTPUT=..
#       -D SOURCE_OUTPUT=.. -P embed.cmake
#
# Puts the page together from its parts and writes it as a C++ source, SOURCE_OUTPUT: the two
# functions of pagetext.h. SCRIPTS, a list, become one script in their order, in a scope of their own; it
# is also written to SCRIPT_OUTPUT, to be looked at by itself.
cmake_minimum_required(VERSION 3.25)

# What a policy of the page calls the text between two tags: its SHA-256, in base64.
function(source_hash text result)
  set(digits ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/)
  string(SHA256 hash "${text}")
  set(encoded)
  # 32 bytes are ten times three, each four digits of 6 bits, and two more.
  foreach(place RANGE 0 54 6)
    string(SUBSTRING ${hash} ${place} 6 triple)
    foreach(shift 18 12 6 0)
      math(EXPR digit "(0x${triple} >> ${shift}) & 63")
      string(SUBSTRING ${digits} ${digit} 1 digit)
      string(APPEND encoded ${digit})
    endforeach()
  endforeach()
  string(SUBSTRING ${hash} 60 4 rest)
  foreach(shift 12 6 0)
    math(EXPR digit "((0x${rest} << 2) >> ${shift}) & 63")
    string(SUBSTRING ${digits} ${digit} 1 digit)
    string(APPEND encoded ${digit})
  endforeach()
  set(${result} "'sha256-${encoded}='" PARENT_SCOPE)
endfunction()

# The bytes of a text as the elements of an array, some to the line.
function(as_bytes text result)
  string(HEX "${text}" bytes)
  string(REGEX REPLACE "(..)" "0x\\1," bytes "${bytes}")
  set(five ".....")
  string(REGEX REPLACE "(${five}${five}${five}${five}${five}${five}${five}${five})" "\\1\n"
    bytes "${bytes}")
  set(${result} "${bytes}" PARENT_SCOPE)
endfunction()

file(READ "${PAGE}" page)
file(READ "${STYLE}" style)
file(READ "${LIBRARY}" library)
file(READ "${LICENCE}" licence)

set(script "(() => {\n'use strict';\n")
foreach(part IN LISTS SCRIPTS)
  file(READ "${part}" text)
  string(APPEND script "\n${text}")
endforeach()
string(APPEND script "})();\n")
file(WRITE "${SCRIPT_OUTPUT}" "${script}")

# A script that ended its own element would go on as text of the page.
foreach(text "${script}" "${library}")
  if(text MATCHES "</[Ss][Cc][Rr][Ii][Pp][Tt]|<!--")
    message(FATAL_ERROR "a script of the page would end too early")
  endif()
endforeach()

source_hash("${style}" style_hash)
source_hash("${library}" library_hash)
source_hash("${script}" script_hash)
foreach(part style library licence script style_hash library_hash script_hash)
  string(REPLACE "{{${part}}}" "${${part}}" page "${page}")
endforeach()

string(FIND "${page}" "{{data}}" place)
if(place EQUAL -1)
  message(FATAL_ERROR "the page has no place for the data")
endif()
string(SUBSTRING "${page}" 0 ${place} before)
string(LENGTH "{{data}}" length)
math(EXPR place "${place} + ${length}")
string(SUBSTRING "${page}" ${place} -1 after)
as_bytes("${before}" before)
as_bytes("${after}" after)

file(WRITE "${SOURCE_OUTPUT}" "\
// Made by page/embed.cmake.
#include \"pagetext.h\"

namespace report {

namespace {

// NOLINTBEGIN(modernize-avoid-c-arrays): bytes, thousands of them
constexpr unsigned char kBefore[] = {
${before}};
constexpr unsigned char kAfter[] = {
${after}};
// NOLINTEND(modernize-avoid-c-arrays)

std::string_view text(const unsigned char* bytes, std::size_t length) noexcept
{
    return {reinterpret_cast<const char*>(bytes), length};
}

} // namespace

std::string_view pagebeforedata() noexcept
{
    return text(kBefore, sizeof kBefore);
}

std::string_view pageafterdata() noexcept
{
    return text(kAfter, sizeof kAfter);
}

} // namespace report
")
