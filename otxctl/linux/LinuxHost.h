// The disks of this machine and KOVA's groups on them, looked at as a whole.
//
// Threads: any. One looks at a time; whoever asks meanwhile waits.
#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "otxctl/disks/DiskJudge.h"
#include "otxctl/linux/Commands.h"
#include "otxctl/linux/DiskGroups.h"
#include "otxctl/linux/DiskScan.h"
#include "otxctl/linux/HostSettings.h"

namespace OtxCtl::Linux {

// One look. Never changed.
struct LinuxSnapshot {
  std::vector<ScannedDisk> disks;
  std::vector<Disks::DiskVerdict> verdicts;  // of the disks, in their order
  std::vector<LeftOut> leftOut;
  std::vector<DiskGroup> groups;  // in order of creation
  std::vector<Unfinished> unfinished;
  HostSettings settings;

  // "disk sda: ext4 file system" and the like, for who compares two looks.
  friend bool operator==(const LinuxSnapshot& one, const LinuxSnapshot& other);
};

struct LinuxHostOptions {
  SystemPaths paths;
  std::string volumeManager = "/usr/sbin/lvm";
  std::string machineId;
  // Throws anything that says what is wrong.
  std::function<HostSettings()> readSettings = [] { return HostSettings(); };
  std::string stateFolder;  // where changes leave word of what they do (ChangeRecord.h); empty: nowhere
  // A look that is younger answers the next question too; the questions of one operation come together.
  std::chrono::milliseconds freshness = std::chrono::milliseconds(1000);
};

class LinuxHost {
 public:
  using Listener = std::function<void()>;

  // While one lives, all looks of its thread are one: the first. To be let go by the thread that made it.
  class OneLook {
   public:
    OneLook();
    ~OneLook();
    OneLook(const OneLook&) = delete;
    OneLook& operator=(const OneLook&) = delete;

   private:
    friend class LinuxHost;
    const LinuxHost* _host = nullptr;  // whose look it is
    std::shared_ptr<const LinuxSnapshot> _seen;
    OneLook* const _outer;
  };

  LinuxHost(LinuxHostOptions options, std::unique_ptr<DiskProbe> probe, std::unique_ptr<Commands> commands);

  // A new look, but for those within a OneLook. Throws HostCtl::Lib::HostCtlException if the machine cannot
  // be looked at; what was seen last stays.
  std::shared_ptr<const LinuxSnapshot> Look();
  // A new look, also within a OneLook, which goes by it from now on.
  std::shared_ptr<const LinuxSnapshot> LookAgain();
  // What was seen is no answer to any further question.
  void Forget();
  // The last look if it is fresh, else a new one.
  std::shared_ptr<const LinuxSnapshot> Current();
  // The last one, however old; null: nobody has looked.
  std::shared_ptr<const LinuxSnapshot> Last() const;

  // What the operator says of the machine; no disk is looked at. Throws HostCtl::Lib::HostCtlException.
  HostSettings ReadSettings() const;
  // What stands on one disk now.
  ProbeResult Probe(const ScannedDisk& disk) { return _probe->Probe(disk.deviceNode, disk.deviceNumber); }

  const LinuxHostOptions& GetOptions() const noexcept { return _options; }

  // Called after each look that differs from the one before, by the thread that looked.
  void SetListener(Listener listener);

 private:
  using Clock = std::chrono::steady_clock;

  std::shared_ptr<const LinuxSnapshot> LookAnew();
  LinuxSnapshot TakeSnapshot();
  FoundGroups FindGroups(std::vector<ScannedDisk>& disks);
  std::string Report(const char* command, const char* columns, const std::vector<ScannedDisk>& disks);

  const LinuxHostOptions _options;
  const std::unique_ptr<DiskProbe> _probe;
  const std::unique_ptr<Commands> _commands;
  std::mutex _looking;  // held while somebody looks
  mutable std::mutex _mutex;
  std::shared_ptr<const LinuxSnapshot> _last;
  Clock::time_point _lookedAt;
  Listener _listener;
};

}  // namespace OtxCtl::Linux
