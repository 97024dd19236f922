// The rules' texts, kept beside the checks that they belong to.
#pragma once

#include <span>

#include "rules.h"

namespace check {

std::span<const rule> shaperules() noexcept;   // the file's form: shape.cpp
std::span<const rule> valuerules() noexcept;   // what its values say: values.cpp
std::span<const rule> machinerules() noexcept; // what is on this machine: machine.cpp
std::span<const rule> proberules() noexcept;   // what a probe found: probe.cpp

} // namespace check
