#include "otxctl/disks/SignatureWords.h"

#include <algorithm>
#include <array>

namespace OtxCtl::Disks {
namespace {

struct Words {
  std::string_view type;
  std::string_view words;
  bool isMember;
};
constexpr std::array<Words, 10> knownTypes = {{
    {"LVM2_member", "LVM physical volume", true},
    {"LVM1_member", "LVM physical volume", true},
    {"crypto_LUKS", "LUKS encrypted volume", true},
    {"BitLocker", "BitLocker encrypted volume", true},
    {"zfs_member", "member of a ZFS pool", true},
    {"bcache", "bcache device", true},
    {"drbd", "DRBD device", true},
    {"swap", "swap space", false},
    {"swsuspend", "swap space with a suspended system", false},
    {"mpath_member", "path of a multipath device", true},
}};
constexpr std::string_view raidMember = "_raid_member";

// Types that are no file systems, though not in the table: told with "signature" behind.
constexpr std::array<std::string_view, 22> fileSystems = {
    "ext2",    "ext3", "ext4", "xfs",     "btrfs", "f2fs",     "vfat",   "exfat", "ntfs", "jfs",   "reiserfs",
    "iso9660", "udf",  "hfs",  "hfsplus", "apfs",  "squashfs", "nilfs2", "ocfs2", "gfs2", "minix", "ufs"};

bool EndsWith(std::string_view text, std::string_view end) {
  return text.size() >= end.size() && text.substr(text.size() - end.size()) == end;
}

}  // namespace

std::string SignatureInWords(std::string_view type, std::string_view label) {
  const auto known = std::find_if(knownTypes.begin(), knownTypes.end(),
                                  [type](const Words& words) { return words.type == type; });
  std::string words;
  if (known != knownTypes.end()) {
    words = known->words;
  } else if (EndsWith(type, raidMember)) {
    words = "member of a RAID array (" + std::string(type) + ")";
  } else if (std::find(fileSystems.begin(), fileSystems.end(), type) != fileSystems.end()) {
    words = std::string(type) + " file system";
  } else {
    words = std::string(type) + " signature";
  }
  return label.empty() ? words : words + " \"" + std::string(label) + "\"";
}

bool IsMemberSignature(std::string_view type) {
  return EndsWith(type, "_member") ||
         std::any_of(knownTypes.begin(), knownTypes.end(),
                     [type](const Words& words) { return words.isMember && words.type == type; });
}

}  // namespace OtxCtl::Disks
