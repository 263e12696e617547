#include "otxctl/linux/BlkidProbe.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>

#include <cerrno>
#include <utility>
#include <vector>

#include "otxctl/linux/BoundedFile.h"
#include "otxctl/linux/FileDescriptor.h"
#include "otxctl/linux/Signatures.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Linux {
namespace {

using Disks::Fact;
using Texts = std::vector<std::string>;

ProbeResult Unknown(const std::string& why) {
  return {Fact<Texts>::Unknown(why), Fact<std::string>::Unknown(why), Fact<bool>::Unknown(why)};
}

ProbeResult WhyNotOpen(const std::string& node, int error) {
  ProbeResult result = Unknown(CannotRead(node, error));
  // A node that is missing is no disk that is missing: nobody may have made it yet.
  result.isGone = error == ENXIO || error == ENODEV;
  result.hasNoMedium = error == ENOMEDIUM;
  return result;
}

FileDescriptor Open(const std::string& node, int flags) {
  return FileDescriptor(
      Uninterrupted([&] { return open(node.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | flags); }));
}

// Empty, or why it is not the disk that was asked for.
std::string WhyAnother(const FileDescriptor& file, const std::string& node, const std::string& number) {
  struct stat status = {};
  if (fstat(file.Get(), &status) != 0) {
    return CannotRead(node, errno);
  }
  if (!S_ISBLK(status.st_mode)) {
    return Tessa::Escape(node) + ": not a block device";
  }
  const std::string own = std::to_string(major(status.st_rdev)) + ":" + std::to_string(minor(status.st_rdev));
  return own == number ? "" : Tessa::Escape(node) + ": is device " + own + " instead of " + number;
}

}  // namespace

// Whoever changes the disk has locked it for himself, and would be disturbed by a claim.
ProbeResult BlkidProbe::Probe(const std::string& node, const std::string& number) {
  const FileDescriptor file = Open(node, 0);
  if (!file.IsOpen()) {
    return WhyNotOpen(node, errno);
  }
  const std::string why = WhyAnother(file, node, number);
  if (!why.empty()) {
    return Unknown(why);
  }
  bool isBusy = flock(file.Get(), LOCK_SH | LOCK_NB) != 0;
  if (!isBusy) {
    const FileDescriptor claim = Open(node, O_EXCL);
    isBusy = !claim.IsOpen() && errno == EBUSY;
    if (!claim.IsOpen() && !isBusy) {
      return WhyNotOpen(node, errno);
    }
  }
  Signatures signatures = ReadSignatures(file.Get(), Tessa::Escape(node));
  return {std::move(signatures.all), std::move(signatures.partitionTable), isBusy};
}

bool HoldsData(const std::string& path) {
  const FileDescriptor file = Open(path, 0);
  if (!file.IsOpen()) {
    return true;
  }
  const Signatures found = ReadSignatures(file.Get(), Tessa::Escape(path));
  const bool isEmpty = found.all.IsKnown() && found.all.Get().empty() && found.partitionTable.IsKnown() &&
                       found.partitionTable.Get().empty();
  return !isEmpty;
}

}  // namespace OtxCtl::Linux
