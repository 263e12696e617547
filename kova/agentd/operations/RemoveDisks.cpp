// Takes disks and whole disk groups out of the service.

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/disks/AbsentDisk.h"
#include "kova/agentd/disks/DiskMappings.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/operations/OperationSteps.h"
#include "nox/Kova.h"
#include "orbis/Any.h"

namespace Kovasvc {

using HostCtl::Kova::RemovalOptions;
using Nox::Kova::Host::DiskMapping;
using Orbis::MethodFault;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::Logger;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;
using Tessa::System::LockGuard;

namespace {

Ref<MethodFault> MappingNotFound(const std::string& mappingText) {
  const auto argument = MakeRef<Orbis::KeyAnyValue>();
  argument->SetKey("diskMap");
  argument->SetValue(MakeRef<Orbis::Boxed<std::string>>(mappingText));
  const auto arguments = MakeRef<Orbis::DataArray<Orbis::KeyAnyValue>>();
  arguments->Append(argument);
  const auto message = MakeRef<Orbis::LocalizableMessage>();
  message->SetKey("nox.agentd.kovaDiskOperation.diskMappingNotFound");
  message->SetArg(arguments);
  const auto fault = MakeRef<Orbis::Fault::InvalidArgument>();
  fault->GetFaultMessage()->Append(message);
  return fault;
}

// Takes a disk that has left out of the service. Provider exceptions pass.
void RemoveAbsentDisk(Logger& logger, HostCtl::Kova::KovaInfo& provider, const std::string& disk,
                      const std::string& passThrough) {
  const std::string uuid = ReadAbsentDisk(logger, disk);
  provider.RemoveDiskByUuid(uuid, passThrough);
}

// How an operation ends that answers with a fault or nothing.
void FinishWithoutResult(KovaManagerImpl& manager, std::string& faultText, Ref<MethodFault>& fault) {
  manager.InvalidateKovaDiskCache();
  std::string resultText;
  Ref<Orbis::Any> noResult;
  manager.SerializeKovaResultAndFault(resultText, faultText, noResult, fault);
}

}  // namespace

void KovaManagerImpl::RemoveDisk(const std::string& disk, const std::string& passThrough,
                                 const std::string& optionText, int optionFirst, int optionSecond,
                                 std::string& faultText) {
  Ref<MethodFault> fault;
  {
    const LockGuard guard(*_operationLock);
    RefreshKovaDiskCache();
    AskKernel(*_logger, "Error removing KOVA disks: %1", fault, [&] {
      if (IsPDLDiskInput(disk)) {
        RemoveAbsentDisk(*_logger, *_provider, disk, passThrough);
      } else {
        _provider->RemoveDisk(disk, passThrough, RemovalOptions{optionText, optionFirst, optionSecond});
      }
    });
  }
  FinishWithoutResult(*this, faultText, fault);
}

void KovaManagerImpl::RemoveDiskMapping(const std::string& mapping, const std::string& passThrough,
                                        const std::string& optionText, int optionFirst, int optionSecond,
                                        std::string& faultText) {
  const Ref<DiskMapping> group = ReadObject<DiskMapping>(mapping, WrongTypeLine::RemoveDiskMapping);
  Ref<MethodFault> fault;
  {
    const LockGuard guard(*_operationLock);
    RefreshKovaDiskCache();
    const std::string ssdName = SsdNameOf(group.Get());
    LogOneDiskMapping(*_logger, group);
    if (IsPDLDiskInput(ssdName)) {
      // A group whose cache disk has left is not looked for.
      AskKernel(*_logger, "Error removing PDL'd KOVA disk mapping: %1", fault,
                [&] { RemoveAbsentDisk(*_logger, *_provider, ssdName, passThrough); });
    } else if (!DiskMappingExists(group)) {
      const std::string text = "SSD: " + ssdName + ", Disks: " + JoinNames(CapacityNamesOf(group.Get()));
      LogInternal(_logger, LogLevel::Warning, "Failed to validate existing disk mapping: %1", text);
      fault = MappingNotFound(text);
    } else {
      AskKernel(*_logger, "Error removing KOVA disk mapping: %1", fault, [&] {
        _provider->RemoveDiskMapping(ssdName, passThrough,
                                     RemovalOptions{optionText, optionFirst, optionSecond});
      });
    }
  }
  FinishWithoutResult(*this, faultText, fault);
}

}  // namespace Kovasvc
