// How findings are shown on a terminal: as compilers show theirs.
#pragma once

#include <ostream>
#include <string>
#include <vector>

#include "finding.h"
#include "sourcetext.h"

namespace check {

// Writes the findings, each with its line of the file and a caret below its place. `name` is the
// file's, as it was given; `colour`: with the terminal's colours. Of one rule's the first thousand
// are shown and the rest counted. One thread.
void writefindings(std::ostream& out, const std::string& name, const sourcetext& source,
                   const std::vector<finding>& found, bool colour);

// The exit status that findings lead to: 2 with an error among them, else 1 with a warning, else 0.
int statusof(const std::vector<finding>& found) noexcept;

} // namespace check
