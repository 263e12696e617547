// What a source can tell about one disk: a capture of lsblk, or the kernel of the machine itself.
//
// Plain values. Sources fill them, the judge (DiskJudge.h) reads them; neither knows the other. Texts are
// cleaned by the source: they may be shown as they are.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "otxctl/disks/Fact.h"

namespace OtxCtl::Disks {

// What makes a disk this one and no other, wherever it is plugged in. All empty: nobody can tell it from
// another one.
struct DiskIdentity {
  std::string worldWideName;  // as the canonical names have it: "naa.5000c50000000201"
  std::string vendor;
  std::string model;
  std::string serial;
};

enum class Attachment {
  Machine,  // a bus inside this machine
  Usb,
  FireWire,
  MemoryCard,  // SD and MMC, soldered ones included
  Remote,      // behind a network, or a fabric that other hosts are on
  Virtual,     // no hardware at all
};

struct Connection {
  Attachment attachment = Attachment::Machine;
  std::string transport;  // "sas", "nvme", "usb", ...; empty if the kernel names none
};

// What holds the disk as a part of itself.
enum class Membership {
  None,
  Mounted,    // of a disk group of this machine that is in use
  Unmounted,  // of a disk group of this machine that is not
};

// Whether the kernel's word for the state of a disk says that it works; kinds without states have none to
// say.
bool IsRunning(const std::string& state);

struct DiskFacts {
  std::string kernelName;     // "sda"
  std::string canonicalName;  // unique on its host
  Fact<DiskIdentity> identity;
  Fact<std::int64_t> bytes;
  Fact<bool> isFlash;
  Fact<Connection> connection;
  Fact<bool> isReadOnly;
  Fact<bool> isRemovable;
  Fact<bool> isHotPlug;
  Fact<std::string> state;  // the kernel's word; empty where this kind of disk has none
  Fact<std::string> zones;  // the kernel's word; empty or "none": has none
  // What stands on the whole disk, in words: "ext4 file system", "member of volume group vg0".
  Fact<std::vector<std::string>> signatures;
  Fact<std::string> partitionTable;  // its kind; empty: there is none
  Fact<std::int32_t> partitions;     // that the kernel shows, with or without a table
  // Where the disk itself is mounted; a swap area in use counts.
  Fact<std::vector<std::string>> mounts;
  // Who has it open for itself, in words: "vg0-data", "another program".
  Fact<std::vector<std::string>> holders;
  // The multipath device that leads to this disk by this path and others; empty: none does.
  Fact<std::string> multipathMap;
  // A member's signatures and holders are KOVA's own.
  Membership membership = Membership::None;
  std::string group;  // which one, in words, for a member
};

}  // namespace OtxCtl::Disks
