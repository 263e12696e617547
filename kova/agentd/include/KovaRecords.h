// The records that the plug-in exchanges with the kernel provider.
//
// Plain values: whoever holds one owns it. None of them is guarded; a record that several threads
// read must not be written meanwhile.
#pragma once

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace HostCtl::Kova {

// What the service may do with a disk. A kernel newer than this code may send other values.
enum class DiskState : std::int32_t {
  InUse = 0,
  Eligible = 1,
  Ineligible = 2,
};

// Why a disk is ineligible. A kernel newer than this code may send other values.
enum class DiskReason : std::int32_t {
  None = 0,
  NonLocal = 1,
  HasPartitions = 2,
  Usb = 3,
  HasForeignPartitions = 4,  // reported to clients exactly like HasPartitions
  TooSmall = 5,
  GroupNotMounted = 6,
};

// The identity of one disk.
struct DiskName {
  std::string deviceName;  // canonical name; empty when the device has left the host
  std::string kovaUuid;    // identity within the storage service; empty for a disk it does not use

  friend bool operator==(const DiskName&, const DiskName&) = default;
};

// One disk group: a flash cache disk and its capacity disks, in the kernel's order.
struct DiskMapping {
  DiskName ssd;
  std::vector<DiskName> capacityDisks;
  std::uint8_t formatVersion = 0;
  bool allFlash = false;
  bool thirdFlag = false;  // set while the kernel does not want the group to be extended

  friend bool operator==(const DiskMapping&, const DiskMapping&) = default;
};

// The kernel's verdict on one disk.
struct DiskResult {
  std::string name;      // canonical name; empty when the device has left the host
  std::string kovaUuid;  // empty for a disk that the service does not use
  DiskState state = DiskState::InUse;
  DiskReason reason = DiskReason::None;
  bool isSsd = false;
  bool isPdl = false;  // the device is permanently lost
  bool thirdFlag = false;
  bool capacityFlash = false;  // a flash device tagged for the capacity tier
  std::uint8_t formatVersion = 0;

  friend bool operator==(const DiskResult&, const DiskResult&) = default;
};

// What a format request carries down to the kernel beside the names of the disks.
struct FormatContext {
  std::string requestTag;
  std::int32_t mappingCount = 0;  // how many groups the whole request holds
  std::int32_t mappingIndex = 0;  // which of them this one is, from 0
};

// Options of a removal. Their meaning is the kernel's alone.
struct RemovalOptions {
  std::string text;
  std::int32_t first = 0;
  std::int32_t second = 0;
};

// The host's membership of a cluster. The five texts and the pairs belong to the kernel.
struct KovaClusterInfoDetailed {
  bool enabled = false;
  std::string clusterUuid;
  std::vector<std::pair<std::string, std::string>> pairs;
  std::string nodeUuid;
  std::string text1;
  std::string text2;
  std::string text3;
  std::string text4;
  std::string text5;
};

}  // namespace HostCtl::Kova
