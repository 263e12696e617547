#include "otxctl/linux/DiskLocks.h"

#include <fcntl.h>
#include <linux/fs.h>
#include <sys/file.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <cstdint>
#include <cstring>
#include <thread>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/linux/FileDescriptor.h"
#include "otxctl/linux/SysfsReader.h"

#ifndef BLKGETDISKSEQ
#define BLKGETDISKSEQ _IOR(0x12, 128, std::uint64_t)
#endif

namespace OtxCtl::Linux {
namespace {

using HostCtl::Lib::KovaStorageException;

[[noreturn]] void Refuse(const ScannedDisk& disk, const std::string& why) {
  throw KovaStorageException("disk " + disk.facts.canonicalName + " cannot be used: " + why,
                             disk.facts.canonicalName);
}

std::string NumberOf(const FileDescriptor& file) {
  struct stat status = {};
  if (fstat(file.Get(), &status) != 0 || !S_ISBLK(status.st_mode)) {
    return "";
  }
  return std::to_string(major(status.st_rdev)) + ":" + std::to_string(minor(status.st_rdev));
}

// What the kernel tells of the disk with this number, to be compared; empty: there is none.
std::string MarksOf(const SysfsReader& reader, const std::string& number) {
  const std::string folder = "/dev/block/" + number;
  const auto path = reader.RealPath(folder);
  if (!path.IsKnown() || !path.Get()) {
    return "";
  }
  std::string marks = *path.Get();
  for (const char* const attribute : {"/diskseq", "/wwid", "/device/wwid", "/device/serial", "/dm/uuid"}) {
    const auto text = TextOrEmpty(reader.Text(*path.Get() + attribute, Refusal::MeansNone));
    marks += "\n" + (text.IsKnown() ? text.Get() : "?");
  }
  return marks;
}

// The number that the kernel gives each disk it ever sees; empty from old kernels.
std::string SequenceOf(const FileDescriptor& file) {
  std::uint64_t sequence = 0;
  return ioctl(file.Get(), BLKGETDISKSEQ, &sequence) == 0 ? std::to_string(sequence) : "";
}

class DeviceFileLock final : public DiskLock {
 public:
  DeviceFileLock(FileDescriptor file, const SystemPaths& paths)
      : _file(std::move(file)),
        _reader(paths.sys),
        _number(NumberOf(_file)),
        _marks(MarksOf(_reader, _number)) {}

  std::string WhyNotTheSame() const override {
    const std::string now = MarksOf(_reader, _number);
    if (now.empty()) {
      return "it has gone";
    }
    const std::string sequence = SequenceOf(_file);
    const bool isThisOne = sequence.empty() || now.find("\n" + sequence + "\n") != std::string::npos;
    return now == _marks && isThisOne ? "" : "another disk has taken its place";
  }

 private:
  const FileDescriptor _file;
  const SysfsReader _reader;
  const std::string _number;
  const std::string _marks;
};

FileDescriptor Open(const std::string& node, int flags) {
  return FileDescriptor(
      Uninterrupted([&] { return open(node.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | flags); }));
}

// Whoever only looks at a device holds it for a moment.
bool LockWithin(const FileDescriptor& file, std::chrono::milliseconds limit) {
  const auto end = std::chrono::steady_clock::now() + limit;
  while (flock(file.Get(), LOCK_EX | LOCK_NB) != 0) {
    if ((errno != EWOULDBLOCK && errno != EINTR) || std::chrono::steady_clock::now() > end) {
      return false;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
  }
  return true;
}

}  // namespace

std::unique_ptr<DiskLock> DeviceFileLocks::Lock(const ScannedDisk& disk, bool mustBeFree) {
  FileDescriptor file = Open(disk.deviceNode, 0);
  if (!file.IsOpen()) {
    Refuse(disk, disk.deviceNode + ": " + std::strerror(errno));
  }
  if (NumberOf(file) != disk.deviceNumber) {
    Refuse(disk, disk.deviceNode + " leads to another disk now");
  }
  if (!LockWithin(file, std::chrono::seconds(10))) {
    Refuse(disk, "another program has locked " + disk.deviceNode);
  }
  if (mustBeFree && !Open(disk.deviceNode, O_EXCL).IsOpen()) {
    Refuse(disk, "another program holds it");
  }
  auto lock = std::make_unique<DeviceFileLock>(std::move(file), _paths);
  if (const std::string why = lock->WhyNotTheSame(); !why.empty()) {
    Refuse(disk, why);
  }
  return lock;
}

}  // namespace OtxCtl::Linux
