// Texts of lsblk as its versions write them. Part of LsblkImport.
#pragma once

#include <string>
#include <string_view>

namespace OtxCtl::Sim {

// "\x20" stands for a byte in texts of old versions. The bytes are put in, and the whole is cleaned.
std::string CleanLsblkText(std::string_view text);

// Old versions write "\x20" into JSON, which has no such escape: it becomes "\\x20", for CleanLsblkText to
// read. Anything else stays, right or wrong.
std::string WithSoundEscapes(std::string_view json);

// "sda" of "/dev/sda", "vg-root" of "/dev/mapper/vg-root", "cciss/c0d0" of "/dev/cciss/c0d0" or "cciss!c0d0".
std::string WithoutFolder(std::string name);

}  // namespace OtxCtl::Sim
