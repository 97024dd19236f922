// Configurations of any size, and what reads them beside the daemon's own reader.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "wdmonitortarget.h"

// The text of a configuration of so many targets with one dependent each, every field written out.
std::string configurationtext(std::size_t targets);

// Read the file `path` and append its targets, as a program would that uses these libraries. False
// where the file cannot be read or is not well-formed.
bool readbyexpat(const std::string& path, std::vector<wdmonitortarget>& targets);
bool readbypugixml(const std::string& path, std::vector<wdmonitortarget>& targets);

// Whether both lists hold the same services with the same texts.
bool sametargets(const std::vector<wdmonitortarget>& left,
                 const std::vector<wdmonitortarget>& right);
