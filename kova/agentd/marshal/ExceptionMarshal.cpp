#include "kova/agentd/marshal/ExceptionMarshal.h"

#include <array>

#include "kova/agentd/include/HostCtlException.h"
#include "nox/Faults.h"

namespace Kovasvc {

using HostCtl::Lib::HostCtlException;
using HostCtl::Lib::KovaStorageException;
using Orbis::DataArray;
using Orbis::LocalizableMessage;
using Orbis::MethodFault;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::Ref;

namespace {

template <class Kernel>
bool Is(const HostCtlException& exception) {
  return dynamic_cast<const Kernel*>(&exception) != nullptr;
}

template <class Fault>
Ref<MethodFault> NamingDisk(const KovaStorageException& exception) {
  return MakeRef<Fault>(exception.GetDiskName());
}

template <class Fault>
Ref<MethodFault> CarryingText(const KovaStorageException& exception) {
  return MakeRef<Fault>(exception.Describe());
}

struct Row {
  bool (*matches)(const HostCtlException&);
  Ref<MethodFault> (*make)(const KovaStorageException&);
};

// Tried in this order, for storage exceptions only. That makes the row of the incompatible mapping one
// that no exception reaches, since its class is no storage exception: it is reported as a plain failure.
constexpr std::array<Row, 6> rows = {{
    {&Is<HostCtl::Lib::KovaExceptionHasPartition>, &NamingDisk<Nox::Fault::DiskHasPartitions>},
    {&Is<HostCtl::Lib::KovaExceptionLastRemainingHDD>, &NamingDisk<Nox::Fault::DiskIsLastRemainingNonSSD>},
    {&Is<HostCtl::Lib::KovaExceptionRescanError>, &CarryingText<Nox::Fault::KovaDiskFault>},
    {&Is<HostCtl::Lib::KovaExceptionRemoveMappingAutoModeEnabled>, &CarryingText<Nox::Fault::KovaDiskFault>},
    {&Is<HostCtl::Lib::KovaExceptionRemoveDiskAutoModeEnabled>, &CarryingText<Nox::Fault::KovaDiskFault>},
    {&Is<HostCtl::Lib::KovaExceptionIncompatibleDiskMapping>,
     &NamingDisk<Nox::Fault::KovaIncompatibleDiskMapping>},
}};

}  // namespace

void MarshalHostCtlException(const HostCtlException& exception, Ref<MethodFault>& fault) {
  if (const auto* storage = dynamic_cast<const KovaStorageException*>(&exception)) {
    for (const Row& row : rows) {
      if (row.matches(exception)) {
        fault = row.make(*storage);
        return;
      }
    }
  }
  fault = MakeRef<SystemError>(exception.Describe());
}

void PrepareKovaDiskFault(const Ref<MethodFault>& fault, Ref<MethodFault>& combined) {
  if (!combined) {
    combined = fault;
    return;
  }
  if (!fault) {
    return;
  }
  const Ref<DataArray<LocalizableMessage>> messages = combined->GetFaultMessage();
  combined = MakeRef<Nox::Fault::KovaFault>();
  combined->SetFaultMessage(messages);
  const Ref<DataArray<LocalizableMessage>> added = fault->GetFaultMessage();
  // The count is taken first: a fault folded into itself must not grow while it is walked.
  const std::size_t count = added->Size();
  for (std::size_t i = 0; i < count; ++i) {
    messages->Append((*added)[i]);
  }
}

}  // namespace Kovasvc
