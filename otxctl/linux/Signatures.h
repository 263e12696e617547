// What stands on a disk, by what is written there: file systems, members of arrays and pools, swap space,
// encryption, tables of partitions.
//
// All of it, not the first thing found: a disk may have been used twice. A damaged signature counts, for who
// damaged it may want it back. Only reads.
//
// Threads: any; nothing is kept. Errors: whatever cannot be read makes all of it unknown.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "otxctl/disks/Fact.h"

namespace OtxCtl::Linux {

struct Signatures {
  Disks::Fact<std::vector<std::string>> all;  // in words, each once
  Disks::Fact<std::string> partitionTable;    // its kind; empty: none
};

// `descriptor` is open for reading; `name` is told in messages.
Signatures ReadSignatures(int descriptor, const std::string& name);

// "ext4 file system \"DATA\"" of "ext4", "filesystem" and "DATA". Any text may come from the disk.
std::string SignatureInWords(std::string_view type, std::string_view usage, std::string_view label);

}  // namespace OtxCtl::Linux
