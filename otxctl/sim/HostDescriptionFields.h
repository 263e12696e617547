// The keys of a host description, each written once: the reader and the writer both walk these tables.
//
// A table calls fields.Required(key, member, rule) or fields.Optional(key, member, rule) for each key, in the
// order in which a file shows them. An optional key that is missing leaves the default of the struct.
#pragma once

#include <limits>

#include "otxctl/fault/FaultRules.h"
#include "otxctl/provider/NamedException.h"
#include "otxctl/provider/OperationNames.h"
#include "otxctl/sim/HostDescription.h"

namespace OtxCtl::Sim::Fields {

// What a value has to keep beside its type.
struct Rule {
  std::int64_t least = 0;
  std::int64_t most = std::numeric_limits<std::int64_t>::max();
  bool mayBeEmpty = true;
  bool mayBeNull = false;
  bool (*isKnown)(std::string_view) noexcept = nullptr;  // a text that is not empty has to be
  const char* kind = "";                                 // what isKnown knows, for the message
};

constexpr std::int32_t kLargest32 = std::numeric_limits<std::int32_t>::max();
constexpr std::int32_t kSmallest32 = std::numeric_limits<std::int32_t>::min();
constexpr std::int64_t longestDelayMs = 10 * 60 * 1000;  // also of all faults of one operation together

constexpr Rule Between(std::int64_t least, std::int64_t most) {
  Rule rule;
  rule.least = least;
  rule.most = most;
  return rule;
}

constexpr Rule NotEmpty() {
  Rule rule;
  rule.mayBeEmpty = false;
  return rule;
}

constexpr Rule OrNull(Rule rule = {}) {
  rule.mayBeNull = true;
  return rule;
}

constexpr Rule Known(bool (*isKnown)(std::string_view) noexcept, const char* kind, bool mayBeEmpty) {
  Rule rule;
  rule.isKnown = isKnown;
  rule.kind = kind;
  rule.mayBeEmpty = mayBeEmpty;
  return rule;
}

inline bool IsLunKind(std::string_view kind) noexcept {
  return kind == "disk" || kind == "tape" || kind == "cdrom" || kind == "enclosure" || kind == "unknown";
}

template <typename Table>
void Describe(Table& fields, const DurableName*) {
  fields.Optional("authority", &DurableName::authority);
  fields.Optional("identifier", &DurableName::identifier);
}

template <typename Table>
void Describe(Table& fields, const HostVerdict*) {
  fields.Optional("state", &HostVerdict::state, Between(kSmallest32, kLargest32));
  fields.Optional("reason", &HostVerdict::reason, Between(kSmallest32, kLargest32));
}

template <typename Table>
void Describe(Table& fields, const HostDisk*) {
  fields.Required("name", &HostDisk::name, NotEmpty());
  fields.Required("ssd", &HostDisk::ssd);
  fields.Optional("capacityFlash", &HostDisk::capacityFlash);
  fields.Required("bytes", &HostDisk::bytes);
  fields.Optional("blockSize", &HostDisk::blockSize, Between(1, kLargest32));
  fields.Optional("transport", &HostDisk::transport);
  fields.Optional("local", &HostDisk::local);
  fields.Optional("partitions", &HostDisk::partitions, Between(0, kLargest32));
  fields.Optional("vendor", &HostDisk::vendor);
  fields.Optional("model", &HostDisk::model);
  fields.Optional("serial", &HostDisk::serial);
  fields.Optional("displayName", &HostDisk::displayName);
  fields.Optional("durableName", &HostDisk::durableName);
  fields.Optional("alternateName", &HostDisk::alternateName);
  fields.Optional("standardInquiry", &HostDisk::standardInquiry);
  fields.Optional("kovaUuid", &HostDisk::kovaUuid);
  fields.Optional("formatVersion", &HostDisk::formatVersion, Between(0, 255));
  fields.Optional("absent", &HostDisk::absent);
  fields.Optional("inInventory", &HostDisk::inInventory);
  fields.Optional("inKernel", &HostDisk::inKernel);
  fields.Optional("verdict", &HostDisk::verdict, OrNull());
  fields.Optional("detail", &HostDisk::detail);
}

template <typename Table>
void Describe(Table& fields, const HostGroup*) {
  fields.Required("ssd", &HostGroup::ssd, NotEmpty());
  fields.Optional("capacity", &HostGroup::capacity, NotEmpty());
  fields.Optional("allFlash", &HostGroup::allFlash);
  fields.Optional("mounted", &HostGroup::mounted);
  fields.Optional("formatVersion", &HostGroup::formatVersion, Between(0, 255));
  fields.Optional("busy", &HostGroup::busy);
}

template <typename Table>
void Describe(Table& fields, const HostCluster*) {
  fields.Optional("enabled", &HostCluster::enabled);
  fields.Optional("clusterUuid", &HostCluster::clusterUuid);
  fields.Optional("nodeUuid", &HostCluster::nodeUuid);
}

template <typename Table>
void Describe(Table& fields, const HostNetwork*) {
  fields.Optional("interface", &HostNetwork::interface);
  fields.Optional("masterMulticastGroup", &HostNetwork::masterMulticastGroup);
  fields.Optional("agentMulticastGroup", &HostNetwork::agentMulticastGroup);
}

template <typename Table>
void Describe(Table& fields, const Fault::FaultRule*) {
  using Fault::FaultRule;
  fields.Required("operation", &FaultRule::operation,
                  Known(&Provider::IsOperationName, "provider operation", false));
  fields.Optional("call", &FaultRule::call, Between(0, kLargest32));
  fields.Optional("exception", &FaultRule::exception, Known(&Provider::IsExceptionName, "exception", true));
  fields.Optional("message", &FaultRule::message);
  fields.Optional("disk", &FaultRule::disk);
  fields.Optional("delayMs", &FaultRule::delayMs, Between(0, longestDelayMs));
}

template <typename Table>
void Describe(Table& fields, const HostDescription*) {
  fields.Optional("name", &HostDescription::name);
  fields.Optional("autoMode", &HostDescription::autoMode);
  fields.Optional("minimumDiskBytes", &HostDescription::minimumDiskBytes);
  fields.Optional("storageSystem", &HostDescription::storageSystem);
  fields.Optional("cluster", &HostDescription::cluster);
  fields.Optional("faultDomain", &HostDescription::faultDomain);
  fields.Optional("networks", &HostDescription::networks);
  fields.Optional("disks", &HostDescription::disks);
  fields.Optional("otherLuns", &HostDescription::otherLuns,
                  OrNull(Known(&IsLunKind, "kind of logical unit", false)));
  fields.Optional("groups", &HostDescription::groups);
  fields.Optional("faults", &HostDescription::faults);
}

}  // namespace OtxCtl::Sim::Fields
