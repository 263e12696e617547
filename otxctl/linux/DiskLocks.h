// Disks that nobody else may touch for a while.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "otxctl/linux/DiskScan.h"
#include "otxctl/linux/SystemPaths.h"

namespace OtxCtl::Linux {

// While one lives, the device has its name and its number, and programs that ask before they touch a device
// (udev among them) leave it alone.
class DiskLock {
 public:
  virtual ~DiskLock() = default;

  // Why what the lock was taken on is no longer the disk that was meant: it has gone, or is another one.
  // Empty: it still is.
  virtual std::string WhyNotTheSame() const = 0;
};

// An interface, so that tests need no disks.
class DiskLocks {
 public:
  virtual ~DiskLocks() = default;

  // Throws HostCtl::Lib::KovaStorageException if the device file leads to another disk than the one that was
  // looked at, or somebody else has locked it; if it has to be free, also if somebody has claimed it.
  virtual std::unique_ptr<DiskLock> Lock(const ScannedDisk& disk, bool mustBeFree) = 0;
};

// Locks the device files themselves, as udev and others do. Waits a little for who only looks.
class DeviceFileLocks final : public DiskLocks {
 public:
  explicit DeviceFileLocks(SystemPaths paths) : _paths(std::move(paths)) {}

  std::unique_ptr<DiskLock> Lock(const ScannedDisk& disk, bool mustBeFree) override;

 private:
  const SystemPaths _paths;
};

}  // namespace OtxCtl::Linux
