// Operations whose work is not built yet. They stand in the operation table so that the hooks and their
// order are final; each says so instead of pretending: as a fault where the caller can be given one, as an
// error in the log where not.

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/include/KovaInfo.h"
#include "nox/Kova.h"
#include "orbis/Types.h"

namespace Kovasvc {

using Orbis::MethodFault;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;

namespace {

Ref<MethodFault> NotBuilt(const char* operation) {
  return MakeRef<SystemError>("The operation " + std::string(operation) + " is not built yet.");
}

// For operations that others call and that have no text to answer in.
[[noreturn]] void ThrowNotBuilt(const char* operation) {
  throw SystemError::Exception(
      MakeRef<SystemError>("The operation " + std::string(operation) + " is not built yet."));
}

}  // namespace

void KovaManagerImpl::AddDisks(const Texts&, const std::string&, std::string& faultText,
                               std::string& resultText) {
  Ref<Orbis::Any> noResult;
  Ref<MethodFault> fault = NotBuilt("AddDisks");
  SerializeKovaResultAndFault(resultText, faultText, noResult, fault);
}

void KovaManagerImpl::InitializeDisks(const Texts&, const std::string&, std::string& faultText,
                                      std::string& resultText) {
  Ref<Orbis::Any> noResult;
  Ref<MethodFault> fault = NotBuilt("InitializeDisks");
  SerializeKovaResultAndFault(resultText, faultText, noResult, fault);
}

void KovaManagerImpl::RemoveDisk(const std::string&, const std::string&, const std::string&, int, int,
                                 std::string& faultText) {
  std::string resultText;
  Ref<Orbis::Any> noResult;
  Ref<MethodFault> fault = NotBuilt("RemoveDisk");
  SerializeKovaResultAndFault(resultText, faultText, noResult, fault);
}

void KovaManagerImpl::RemoveDiskMapping(const std::string&, const std::string&, const std::string&, int, int,
                                        std::string& faultText) {
  std::string resultText;
  Ref<Orbis::Any> noResult;
  Ref<MethodFault> fault = NotBuilt("RemoveDiskMapping");
  SerializeKovaResultAndFault(resultText, faultText, noResult, fault);
}

void KovaManagerImpl::AddAllEligibleDisks(const std::string&, std::string& faultText,
                                          std::string& resultText) {
  Ref<Orbis::Any> noResult;
  Ref<MethodFault> fault = NotBuilt("AddAllEligibleDisks");
  SerializeKovaResultAndFault(resultText, faultText, noResult, fault);
}

void KovaManagerImpl::UnmountDiskMapping(const Texts&, const std::string&, std::string& faultText,
                                         std::string& resultText) {
  Ref<Orbis::Any> noResult;
  Ref<MethodFault> fault = NotBuilt("UnmountDiskMapping");
  SerializeKovaResultAndFault(resultText, faultText, noResult, fault);
}

void KovaManagerImpl::ClaimUnmountedDiskgroup() {
  LogInternal(_logger, LogLevel::Error, "The operation %1 is not built yet.", "ClaimUnmountedDiskgroup");
}

void KovaManagerImpl::InitializeDisksInt(Orbis::DataArray<Mapping>*, const std::string&, Ref<Orbis::Any>&,
                                         Ref<MethodFault>& fault) {
  fault = NotBuilt("InitializeDisksInt");
}

void KovaManagerImpl::FormatDiskMapping(const std::string&, Texts&, const std::string&, int, int) {
  ThrowNotBuilt("FormatDiskMapping");
}

void KovaManagerImpl::RestampDiskMapping(const std::string&, Texts&) {
  ThrowNotBuilt("RestampDiskMapping");
}

void KovaManagerImpl::InitializeMapping(Ref<Mapping>, const std::string&, int, int, Ref<MapResult>&) {
  ThrowNotBuilt("InitializeMapping");
}

void KovaManagerImpl::UnmountDiskMappingInt(Ref<Mapping>&, const std::string&, Ref<MethodFault>& fault) {
  fault = NotBuilt("UnmountDiskMappingInt");
}

}  // namespace Kovasvc
