// kovactl host: descriptions of hosts, made and checked.
#pragma once

#include <cstdint>
#include <iosfwd>
#include <string>

#include "kovactl/ExitStatus.h"

namespace Kovactl {

struct ImportOptions {
  std::string file;  // output of lsblk --json -O -b; "-": standard input
  std::string name = "imported";
  std::int64_t minimumDiskBytes = std::int64_t{1} << 30;
  std::string output = {};  // file to write; empty: standard output
};

// Prints a host description of the machine that the text was captured on, or writes it to its file; and what
// was taken over and left out, and why: to `err` if the description goes to `out`. Throws BadInput that names
// the file and the path in it.
ExitStatus RunHostImport(const ImportOptions& options, std::istream& in, std::ostream& out,
                         std::ostream& err);

// Reads a description and says in a line what it holds. Throws BadInput that names the file and the path in
// it.
ExitStatus RunHostCheck(const std::string& file, std::ostream& out);

}  // namespace Kovactl
