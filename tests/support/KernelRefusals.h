// The exceptions by which a kernel refuses, each with the fault that tells it to clients.
//
// Every one says "no", and names disk "a" where its class names a disk.
#pragma once

#include <functional>
#include <ostream>
#include <string>
#include <vector>

#include "kova/agentd/include/HostCtlException.h"
#include "tests/support/FakeKernel.h"
#include "tests/support/Matchers.h"

namespace TestSupport {

struct KernelRefusal {
  const char* name;
  // Makes every call of the operation throw.
  std::function<void(FakeKernel& kernel, const std::string& operation)> fail;
  testing::Matcher<const Tessa::Ref<Orbis::MethodFault>&> fault;
};

inline void PrintTo(const KernelRefusal& refusal, std::ostream* out) {
  *out << refusal.name;
}

inline std::vector<KernelRefusal> KernelRefusals() {
  using namespace HostCtl::Lib;
  const auto refusal = [](const char* name, const auto& exception, const auto& fault) {
    return KernelRefusal{
        name,
        [exception](FakeKernel& kernel, const std::string& operation) { kernel.Fail(operation, exception); },
        fault};
  };
  return {
      refusal("HostCtlException", HostCtlException("no"), IsSystemError("no")),
      refusal("KovaStorageException", KovaStorageException("no", "a"), IsSystemError("no")),
      refusal("HasPartition", KovaExceptionHasPartition("no", "a"), NamesDevice("DiskHasPartitions", "a")),
      refusal("LastRemainingHDD", KovaExceptionLastRemainingHDD("no", "a"),
              NamesDevice("DiskIsLastRemainingNonSSD", "a")),
      refusal("RescanError", KovaExceptionRescanError("no", "a"), NamesDevice("KovaDiskFault", "no")),
      refusal("RemoveMappingAutoMode", KovaExceptionRemoveMappingAutoModeEnabled("no", "a"),
              NamesDevice("KovaDiskFault", "no")),
      refusal("RemoveDiskAutoMode", KovaExceptionRemoveDiskAutoModeEnabled("no", "a"),
              NamesDevice("KovaDiskFault", "no")),
      refusal("IncompatibleDiskMapping", KovaExceptionIncompatibleDiskMapping("no"), IsSystemError("no")),
  };
}

}  // namespace TestSupport
