// One block device as `lsblk --json -O -b` shows it, with its types put straight. Part of LsblkImport.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace OtxCtl::Sim {

// How a capture is made, for messages.
inline constexpr const char* lsblkCommand = "lsblk --json -O -b";

// Texts are cleaned. An empty text, or nothing in an optional, is the null of lsblk: it looked, and there is
// none; what it did not look at stands in `missingColumns`.
struct LsblkDevice {
  std::string path;  // "blockdevices[3].children[0]"
  std::string name;  // without the folder that lsblk -p puts in front
  std::string kernelName;
  std::string type;                  // "disk", "part", "lvm", ...
  std::vector<std::string> parents;  // kernel names of the devices below; none for one that stands by itself
  std::string transport;             // "usb", "nvme", "sata", ...
  std::string subsystems;            // "block:scsi:usb:pci"
  std::string worldWideName;
  std::string vendor;
  std::string model;
  std::string serial;
  std::string fileSystem;  // on the device itself
  std::string label;
  std::string uuid;
  std::string partitionTable;
  std::vector<std::string> otherTraces;  // columns that only what is in use has: "FSVER 1.0"
  std::string state;
  std::string zones;
  std::vector<std::string> mounts;  // "[SWAP]" for a swap area
  std::optional<std::int64_t> bytes;
  std::optional<std::int64_t> blockSize;
  std::optional<bool> isRotational;
  std::optional<bool> isReadOnly;
  std::optional<bool> isRemovable;
  std::optional<bool> isHotPlug;
  // Of those that tell whether a disk is free, in the order of lsblk's own list: "FSTYPE".
  std::vector<std::string> missingColumns;
};

// Every device of the text, once, each before those that stand on it. Reads the nested form and the flat one,
// names with and without folders, and the texts that old versions write. Of a device that is shown more than
// once each showing counts: it is as used as the worst of them, and what they do not agree on is unknown.
// Throws HostDescriptionError with the path.
std::vector<LsblkDevice> ReadLsblk(std::string_view lsblkJson);

}  // namespace OtxCtl::Sim
