#include "otxctl/linux/LinuxHost.h"

#include <algorithm>
#include <utility>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/linux/ChangeRecord.h"

namespace OtxCtl::Linux {
namespace {

using HostCtl::Lib::HostCtlException;

// What listing and verdicts show of a disk, in one text.
std::string Digest(const ScannedDisk& disk) {
  const Disks::DiskFacts& facts = disk.facts;
  const auto bytes = facts.bytes.IsKnown() ? std::to_string(facts.bytes.Get()) : "?";
  const auto transport = facts.connection.IsKnown() ? facts.connection.Get().transport : "?";
  return facts.canonicalName + '\n' + disk.displayName + '\n' + disk.deviceNumber + '\n' + bytes + '\n' +
         transport + '\n' + (facts.isFlash.Is(true) ? "flash" : "") + '\n' +
         std::to_string(static_cast<int>(facts.membership)) + facts.group;
}

std::string Digest(const DiskGroup& group) {
  std::string digest = group.uuid + (group.isMounted ? " mounted" : "");
  digest += '\n' + group.cache.kovaUuid + ' ' + group.cache.canonicalName;
  for (const GroupMember& member : group.capacity) {
    digest += '\n' + member.kovaUuid + ' ' + member.canonicalName;
  }
  return digest;
}

template <typename Item>
bool AreSame(const std::vector<Item>& one, const std::vector<Item>& other) {
  return std::equal(one.begin(), one.end(), other.begin(), other.end(),
                    [](const Item& left, const Item& right) { return Digest(left) == Digest(right); });
}

// The innermost of this thread, or null.
thread_local LinuxHost::OneLook* oneLook = nullptr;

[[noreturn]] void Fail(const std::string& what, const std::string& why) {
  throw HostCtlException(what + ": " + why);
}

}  // namespace

LinuxHost::OneLook::OneLook() : _outer(oneLook) {
  oneLook = this;
}

LinuxHost::OneLook::~OneLook() {
  oneLook = _outer;
}

bool operator==(const LinuxSnapshot& one, const LinuxSnapshot& other) {
  return one.verdicts == other.verdicts && AreSame(one.disks, other.disks) &&
         AreSame(one.groups, other.groups);
}

LinuxHost::LinuxHost(LinuxHostOptions options, std::unique_ptr<DiskProbe> probe,
                     std::unique_ptr<Commands> commands)
    : _options(std::move(options)), _probe(std::move(probe)), _commands(std::move(commands)) {}

std::shared_ptr<const LinuxSnapshot> LinuxHost::Look() {
  if (oneLook == nullptr) {
    return LookAnew();
  }
  if (oneLook->_host != this) {
    oneLook->_seen = LookAnew();
    oneLook->_host = this;
  }
  return oneLook->_seen;
}

std::shared_ptr<const LinuxSnapshot> LinuxHost::LookAgain() {
  Forget();
  return Look();
}

void LinuxHost::Forget() {
  if (oneLook != nullptr && oneLook->_host == this) {
    oneLook->_host = nullptr;
  }
  const std::lock_guard guard(_mutex);
  _lookedAt = Clock::time_point();
}

std::shared_ptr<const LinuxSnapshot> LinuxHost::LookAnew() {
  std::shared_ptr<const LinuxSnapshot> seen;
  Listener listener;
  {
    const std::lock_guard looking(_looking);
    seen = std::make_shared<const LinuxSnapshot>(TakeSnapshot());
    const std::lock_guard guard(_mutex);
    const bool isOther = _last == nullptr || !(*_last == *seen);
    _last = seen;
    _lookedAt = Clock::now();
    listener = isOther ? _listener : Listener();
  }
  if (listener) {
    listener();
  }
  return seen;
}

std::shared_ptr<const LinuxSnapshot> LinuxHost::Current() {
  if (oneLook != nullptr && oneLook->_host == this) {
    return oneLook->_seen;
  }
  {
    const std::lock_guard guard(_mutex);
    if (_last != nullptr && Clock::now() - _lookedAt < _options.freshness) {
      return _last;
    }
  }
  return Look();
}

std::shared_ptr<const LinuxSnapshot> LinuxHost::Last() const {
  const std::lock_guard guard(_mutex);
  return _last;
}

void LinuxHost::SetListener(Listener listener) {
  const std::lock_guard guard(_mutex);
  _listener = std::move(listener);
}

HostSettings LinuxHost::ReadSettings() const {
  try {
    return _options.readSettings();
  } catch (const std::exception& refused) {
    Fail("this host's settings cannot be used", refused.what());
  }
}

LinuxSnapshot LinuxHost::TakeSnapshot() {
  LinuxSnapshot snapshot;
  snapshot.settings = ReadSettings();
  DiskScan scan = ScanDisks(_options.paths, *_probe);
  if (!scan.whyIncomplete.empty()) {
    Fail("this machine's disks cannot be looked at", scan.whyIncomplete);
  }
  FoundGroups found = FindGroups(scan.disks);
  snapshot.groups = std::move(found.groups);
  snapshot.unfinished = std::move(found.unfinished);
  std::vector<Disks::DiskFacts> facts;
  facts.reserve(scan.disks.size());
  for (const ScannedDisk& disk : scan.disks) {
    facts.push_back(disk.facts);
  }
  snapshot.verdicts = Disks::JudgeDisks(facts, {snapshot.settings.minimumDiskBytes});
  snapshot.disks = std::move(scan.disks);
  snapshot.leftOut = std::move(scan.leftOut);
  return snapshot;
}

// At most two programs are run, and none where no disk is a physical volume.
FoundGroups LinuxHost::FindGroups(std::vector<ScannedDisk>& disks) {
  if (std::none_of(disks.begin(), disks.end(), &IsPhysicalVolume) ||
      !_commands->Has(_options.volumeManager)) {
    return {};
  }
  try {
    const auto physical = ReadPhysicalVolumes(Report("pvs", physicalVolumeColumns, disks));
    std::vector<LogicalVolume> logical;
    if (HasMarkedGroup(physical)) {
      logical = ReadLogicalVolumes(Report("lvs", logicalVolumeColumns, disks));
    }
    const auto underChange = ChangeRecord(_options.stateFolder).Read();
    return FindDiskGroups(physical, logical, _options.machineId, underChange, disks);
  } catch (const std::runtime_error& failed) {  // a command, its report, or the record of changes
    Fail("the volume groups cannot be read", failed.what());
  }
}

// Only the disks concerned are opened by the volume manager.
std::string LinuxHost::Report(const char* command, const char* columns,
                              const std::vector<ScannedDisk>& disks) {
  std::string devices;
  for (const ScannedDisk& disk : disks) {
    if (IsPhysicalVolume(disk)) {
      devices += (devices.empty() ? "" : ",") + disk.deviceNode;
    }
  }
  const CommandResult result =
      _commands->Run({_options.volumeManager, command, "--reportformat", "json", "--units", "b", "--nosuffix",
                      "--devices", devices, "-o", columns});
  if (result.status != 0) {
    throw CommandFailed(std::string(command) + " ended with status " + std::to_string(result.status) + ": " +
                        result.errors);
  }
  return result.output;
}

}  // namespace OtxCtl::Linux
