// One host as plain values: its disks, its disk groups, its network and cluster, and the faults it has on
// demand.
//
// A description is what a simulated host starts from and what it is saved as. Nothing in it is derived or
// made up: reading a text and writing it again loses nothing and adds nothing. Values without owner or lock.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "otxctl/fault/FaultRules.h"
#include "otxctl/sim/HostDescriptionError.h"

namespace OtxCtl::Sim {

struct DurableName {
  std::string authority;
  std::string identifier;

  friend bool operator==(const DurableName&, const DurableName&) = default;
};

// What the kernel says of a disk whatever the host would derive. Values beyond the known ones are allowed.
struct HostVerdict {
  std::int32_t state = 0;
  std::int32_t reason = 0;

  friend bool operator==(const HostVerdict&, const HostVerdict&) = default;
};

struct HostDisk {
  std::string name;  // canonical name, unique on the host
  bool ssd = false;
  bool capacityFlash = false;  // flash tagged for the capacity tier
  std::int64_t bytes = 0;
  std::int32_t blockSize = 512;
  std::optional<std::string> transport;
  bool local = true;
  std::int32_t partitions = 0;
  std::string vendor;
  std::string model;
  std::string serial;
  std::string displayName;
  std::optional<DurableName> durableName;
  std::vector<DurableName> alternateName;
  std::optional<std::vector<std::uint8_t>> standardInquiry;
  std::string kovaUuid;
  std::uint8_t formatVersion = 0;
  bool absent = false;      // the device has left the host
  bool inInventory = true;  // the host agent lists it
  bool inKernel = true;     // the kernel knows it
  std::optional<HostVerdict> verdict;
  std::string detail;  // why it is not eligible, in words for people

  friend bool operator==(const HostDisk&, const HostDisk&) = default;
};

struct HostGroup {
  std::string ssd;                    // names of disks
  std::vector<std::string> capacity;  // in the kernel's order
  bool allFlash = false;
  bool mounted = true;
  std::uint8_t formatVersion = 3;
  bool busy = false;  // the kernel does not want the group to be extended

  friend bool operator==(const HostGroup&, const HostGroup&) = default;
};

struct HostCluster {
  bool enabled = false;
  std::string clusterUuid;
  std::string nodeUuid;

  friend bool operator==(const HostCluster&, const HostCluster&) = default;
};

struct HostNetwork {
  std::string interface;
  std::string masterMulticastGroup;  // an address with a colon is IPv6
  std::string agentMulticastGroup;

  friend bool operator==(const HostNetwork&, const HostNetwork&) = default;
};

// Whether the host agent has the object that lists its storage devices.
enum class StorageSystem { Present, Missing };

struct HostDescription {
  std::string name;
  bool autoMode = false;
  std::int64_t minimumDiskBytes = 0;
  StorageSystem storageSystem = StorageSystem::Present;
  HostCluster cluster;
  std::string faultDomain;
  std::vector<HostNetwork> networks;
  std::vector<HostDisk> disks;                        // order of the inventory and of the kernel's records
  std::vector<std::optional<std::string>> otherLuns;  // kinds of further logical units; null: a null entry
  std::vector<HostGroup> groups;                      // in order of creation
  std::vector<Fault::FaultRule> faults;

  friend bool operator==(const HostDescription&, const HostDescription&) = default;
};

// Reads one host from JSON. Strict: an unknown key, a wrong type, a value out of range, a duplicate key or
// disk name, a group that names an unknown disk or one that is taken, a text that is not clean UTF-8 is a
// HostDescriptionError that begins with the path.
HostDescription ParseHostDescription(std::string_view text);

// The same from a document that was read before.
HostDescription ReadHostDescription(const nlohmann::json& document);

// The description as JSON, indented, ending in a newline; values that equal their default are left out.
// Throws HostDescriptionError for a text that is not UTF-8.
std::string WriteHostDescription(const HostDescription& host);

// Changes a host: first each top-level key of `set` replaces the host's, then the keys of `disk` (an object
// with "name") replace those of that disk. Null stands for a missing object; `"verdict": null` takes a disk's
// verdict away. The changed host is checked like a file; on HostDescriptionError `host` is as it was.
void ApplyChange(HostDescription& host, const nlohmann::json& set, const nlohmann::json& disk);
// The same for a text {"set": {..}, "disk": {..}} that nobody vouches for; either may be missing, other keys
// are an error.
void ApplyChange(HostDescription& host, std::string_view change);
// Throws HostDescriptionError for a text that is no change, whatever the host.
void CheckChange(std::string_view change);

// Throws HostDescriptionError unless the description, written and read again, is accepted.
void CheckHostDescription(const HostDescription& host);

}  // namespace OtxCtl::Sim
