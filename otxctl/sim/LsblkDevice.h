// One block device as `lsblk --json -O -b` shows it, with its types put straight. Part of LsblkImport.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace OtxCtl::Sim {

struct LsblkDevice {
  std::string name;        // the kernel's, cleaned
  std::string type;        // "disk", "part", "lvm", ...
  std::string parent;      // kernel name of the device below; empty for a whole disk
  std::string transport;   // "usb", "nvme", "sata", ...; empty if lsblk says nothing
  std::string subsystems;  // "block:scsi:usb:pci"
  std::string wwn;
  std::string vendor;
  std::string model;
  std::string serial;
  std::string fileSystem;  // on the device itself
  std::int64_t bytes = 0;
  std::int64_t blockSize = 0;
  bool isRotational = false;
  bool isReadOnly = false;
  bool isMounted = false;  // the device itself, or as swap
};

// Every device of the text, each before those that stand on it. Reads the nested form and the flat one, and
// the texts that old versions write for numbers and flags. Throws HostDescriptionError with the path.
std::vector<LsblkDevice> ReadLsblk(std::string_view lsblkJson);

}  // namespace OtxCtl::Sim
