// Signatures on disks, as libblkid and lsblk name them, in words for people.
#pragma once

#include <string>
#include <string_view>

namespace OtxCtl::Disks {

// "ext4 file system \"DATA\"" of type "ext4" with that label; a type that is not known is told as it is.
// Both texts must be clean.
std::string SignatureInWords(std::string_view type, std::string_view label);

// Whether other devices stand on a disk with this signature: volumes, arrays, what is behind encryption.
bool IsMemberSignature(std::string_view type);

}  // namespace OtxCtl::Disks
