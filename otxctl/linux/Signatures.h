// What stands on a disk, by what is written there: file systems, members of arrays and pools, swap space,
// encryption, tables of partitions.
//
// All of it, not the first thing found: a disk may have been used twice. A damaged signature counts, for who
// damaged it may want it back. Only reads.
//
// Threads: any; nothing is kept. Errors: whatever cannot be read makes all of it unknown.
#pragma once

#include <string>
#include <vector>

#include "otxctl/disks/Fact.h"

namespace OtxCtl::Linux {

struct Signatures {
  Disks::Fact<std::vector<std::string>> all;  // in words, each once
  Disks::Fact<std::string> partitionTable;    // its kind; empty: none
};

// `descriptor` is open for reading; `name` is told in messages.
Signatures ReadSignatures(int descriptor, const std::string& name);

}  // namespace OtxCtl::Linux
