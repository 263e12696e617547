// What the kernel says is mounted or swapped to, line by line.
//
// Pure: text in, values out. A line that is not understood makes the whole text so: it may be the one that
// tells of a disk in use.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "otxctl/disks/Fact.h"

namespace OtxCtl::Linux {

// Octal escapes are decoded, texts otherwise as they are: nobody vouches for them.
struct MountEntry {
  std::string number;  // "8:1"; of a file system on several devices, one of its own: "0:42"
  std::string source;
  std::string type;
  std::string where;
};

Disks::Fact<std::vector<MountEntry>> ParseMountInfo(std::string_view text);

struct SwapEntry {
  std::string source;
  bool isFile = false;  // on a file system, which is mounted
};

Disks::Fact<std::vector<SwapEntry>> ParseSwaps(std::string_view text);

// "a b" of "a\040b"
std::string DecodeOctal(std::string_view text);

}  // namespace OtxCtl::Linux
