// The object behind all hooks: it owns the kernel provider, the two locks and the disk cache, and holds
// the order of each operation's steps. The rules themselves stand elsewhere (planning, marshal, query).
//
// Threads: operations may be called from several threads at once. Two locks guard the shared state: the
// operation lock lets one disk-changing operation work at a time, the disk-cache lock guards the cached
// records and their valid flag. Where both are held, the operation lock was taken first. Neither is
// recursive: an operation releases the operation lock before it calls one that takes it.
//
// Answers: `faultText` and `resultText` are appended to, never assigned.
//
// Exceptions: an operation turns the kernel's exceptions into its fault, or logs them where it says so. A
// fault thrown on the way becomes the operation's fault in InitializeDisks and AddAllEligibleDisks, and in
// AddDisks and UnmountDiskMapping once the disk cache is refreshed; the others let it out, but for that of a
// missing inventory where they say so. Any other exception is let out, and whatever is leaves with all locks
// released.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "kova/agentd/disks/DiskCache.h"
#include "kova/agentd/include/KovaRecords.h"
#include "kova/agentd/util/KovaUtil.h"
#include "nox/Fwd.h"
#include "orbis/DataArray.h"
#include "tessa/Lockable.h"
#include "tessa/Logger.h"
#include "tessa/Ref.h"

namespace Orbis {
class MethodFault;
}

namespace Kovasvc {

class KovaManagerImpl : public Tessa::System::LockableObjectImpl {
 public:
  using Texts = std::vector<std::string>;
  using Mapping = Nox::Kova::Host::DiskMapping;
  using MapResult = Nox::Kova::Host::DiskMapResult;
  using DiskResults = Orbis::DataArray<Nox::Kova::Host::DiskResult>;

  // Throws HostCtl::Lib::HostCtlException when there is no provider, and whatever making the locks throws.
  explicit KovaManagerImpl(Tessa::Ref<Tessa::Service::Logger>& logger);
  ~KovaManagerImpl() override;

  // The order of these operations is that of the operation table and must not change. A text of a request
  // that is not of the wanted type ends the process; one that cannot be read throws Orbis::ParseException. A
  // null group or a disk without a name throws Tessa::NotInitializedException. `requestTag` goes down to the
  // kernel unread where groups are made, and nowhere else.

  // Plans disk groups from the disks and makes them, and mounts the groups that the disks already form. The
  // result is a list of KovaHostDiskMapResult, one per group; the fault tells what failed of it, or why
  // nothing was planned.
  virtual void AddDisks(const Texts& disks, const std::string& requestTag, std::string& faultText,
                        std::string& resultText);
  // Makes exactly these groups. Result and fault as above.
  virtual void InitializeDisks(const Texts& mappings, const std::string& requestTag, std::string& faultText,
                               std::string& resultText);
  // Takes one disk out of the service; one that has left the host is named "kova:UUID". What is behind
  // `disk` is the kernel's to understand.
  virtual void RemoveDisk(const std::string& disk, const std::string& passThrough,
                          const std::string& optionText, int optionFirst, int optionSecond,
                          std::string& faultText);
  // Takes a whole group out of the service, if the kernel has it.
  virtual void RemoveDiskMapping(const std::string& mapping, const std::string& passThrough,
                                 const std::string& optionText, int optionFirst, int optionSecond,
                                 std::string& faultText);
  // Which disks the service could use. No names: every disk that the kernel and the agent both know.
  // Names that match no disk are passed over. Without an inventory there is no answer at all.
  virtual void QueryDisksForKova(Texts& names, std::string& faultText, std::string& resultText);
  // Plans disk groups from every disk that the kernel offers and makes them. Neither result nor fault: there
  // was nothing to make.
  virtual void AddAllEligibleDisks(const std::string& requestTag, std::string& faultText,
                                   std::string& resultText);
  // Takes groups out of use without erasing them. The result is a list of KovaHostDiskMapResult, one per
  // group, each with its fault if it has one.
  virtual void UnmountDiskMapping(const Texts& mappings, const std::string& requestTag,
                                  std::string& faultText, std::string& resultText);
  // The mounted disk groups, of which disks, and whether disks are claimed automatically. What cannot be read
  // is a warning and missing, never a fault. The disk cache is invalid afterwards.
  virtual void GetStorageInfo(std::string& resultText);
  // Cluster, network and fault domain, each missing by itself when it cannot be read; never a fault.
  virtual void GetConfigInfo(std::string& resultText);
  // Brings every group that is there but not mounted back into use. A failure is only logged.
  virtual void ClaimUnmountedDiskgroup();
  // The kernel's mounted disk groups, appended. Provider exceptions pass.
  virtual void GetKovaDiskMapping(std::vector<HostCtl::Kova::DiskMapping>& mappings);
  // Makes the groups one by one. `result` and `fault` are replaced: the results of the groups that were
  // worked on, and null or what went wrong.
  virtual void InitializeDisksInt(Orbis::DataArray<Mapping>* mappings, const std::string& requestTag,
                                  Tessa::Ref<Orbis::Any>& result, Tessa::Ref<Orbis::MethodFault>& fault);
  // Checks one group of a request. `result` holds an object, whose fields are filled: the group, the results
  // of its disks as far as the kernel knows them, and the first fault found, or null. Throws
  // Tessa::NotInitializedException for a disk without a name or an SSD without its flag, and
  // Orbis::Fault::SystemError::Exception without an inventory; `result` is then as it was. Takes the
  // disk-cache lock.
  virtual void ValidateDiskMapping(Tessa::Ref<Mapping> mapping, Tessa::Ref<MapResult>& result);
  // Checks a request as a whole. Throws Nox::Fault::InsufficientDisks::Exception when it names fewer than two
  // disks, Nox::Fault::DuplicateDisks::Exception when it names one twice.
  virtual void ValidateDiskMappings(Orbis::DataArray<Mapping>* mappings);
  // Whether the kernel has that mounted group already; false, with a warning, when it cannot say.
  virtual bool DiskMappingExists(Tessa::Ref<Mapping> mapping);
  // The kernel's format of one group, which is number `mappingIndex`, from 0, of a request of
  // `mappingCount`. Provider exceptions pass.
  virtual void FormatDiskMapping(const std::string& ssdName, Texts& nonSsdNames,
                                 const std::string& requestTag, int mappingCount, int mappingIndex);
  // Gives a group that is off-line new stamps and mounts it. Provider exceptions pass.
  virtual void RestampDiskMapping(const std::string& ssdName, Texts& capacityNames);
  // Checks, makes and reports one group. `result` holds an object, whose fields are filled. Throws as
  // ValidateDiskMapping does.
  virtual void InitializeMapping(Tessa::Ref<Mapping> mapping, const std::string& requestTag, int mappingCount,
                                 int mappingIndex, Tessa::Ref<MapResult>& result);
  // Takes one group out of use; `fault` is set when that fails.
  virtual void UnmountDiskMappingInt(Tessa::Ref<Mapping>& mapping, const std::string& requestTag,
                                     Tessa::Ref<Orbis::MethodFault>& fault);

  // Plans hybrid groups (or, for `allFlash`, all-flash ones) from the disks: new groups round the flash disks
  // among them, or, without a flash disk that may head a group, more disks for the kernel's groups of that
  // kind. `mappings` is replaced; `limitReached` says whether nothing could be planned because of a limit. A
  // throw leaves both as they were. Lets go of the object's own lock, if held, while it asks the agent.
  void ComputeDiskMappings(Orbis::DataArray<Nox::Host::ScsiDisk>* candidates, bool allFlash,
                           Tessa::Ref<Orbis::DataArray<Mapping>>& mappings, bool& limitReached);
  // Plans all-flash groups from the eligible flash disks among the candidates. Appends the names of the disks
  // it takes: every capacity flash disk, and the cache disks of planned groups. Without any, `mappings` is
  // null and `limitReached` stays as it was.
  void ComputeAllFlashDiskMappings(Orbis::DataArray<Nox::Host::ScsiDisk>* candidates,
                                   Tessa::Ref<Orbis::DataArray<Mapping>>& mappings, Texts& takenNames,
                                   bool& limitReached);
  // The same, and the candidates that are left for hybrid groups, in order.
  void AllFlashDiskMappingSwitch(Orbis::DataArray<Nox::Host::ScsiDisk>* candidates,
                                 Tessa::Ref<Orbis::DataArray<Mapping>>& mappings,
                                 Tessa::Ref<Orbis::DataArray<Nox::Host::ScsiDisk>>& remaining,
                                 bool& limitReached);
  // Appends the kernel's groups that are not mounted and whose cache disk is among the candidates. Disks that
  // the inventory lacks are null in them.
  void ComputeNotMountedDiskMappings(Orbis::DataArray<Nox::Host::ScsiDisk>* candidates,
                                     Tessa::Ref<Orbis::DataArray<Mapping>>& mappings);

  // Makes the disk cache valid, as DiskCache::Locked::Refresh does. Takes the disk-cache lock.
  void RefreshKovaDiskCache();
  // The same for a caller that holds the lock.
  void RefreshKovaDiskCacheLocked(DiskCache::Locked& cache);
  // The next refresh will ask the kernel again. Takes the disk-cache lock.
  void InvalidateKovaDiskCache();

  // Appends the SOAP texts of what is there; both, one or none may be null.
  void SerializeKovaResultAndFault(std::string& resultText, std::string& faultText,
                                   Tessa::Ref<Orbis::Any>& result, Tessa::Ref<Orbis::MethodFault>& fault);

 protected:
  DiskCache& GetDiskCache() noexcept { return *_diskCache; }

 private:
  // In reverse, the order in which a manager goes down: the provider first.
  Tessa::Ref<Tessa::Service::Logger> _logger;
  Tessa::Ref<Util::KovaUtil> _util;  // held for its life alone: the logger that it shares goes with it
  Tessa::Ref<Tessa::System::Lock> _operationLock;
  std::unique_ptr<DiskCache> _diskCache;
  std::unique_ptr<HostCtl::Kova::KovaInfo> _provider;
};

}  // namespace Kovasvc
