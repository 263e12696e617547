// The plug-in's entry points: what a host program calls.
//
// Every hook forwards its arguments unchanged to the manager's operation. An exception that the operation
// lets out is not an answer: it is logged where it carries a fault, and ends the process. The first two
// hooks do so for the runtime's own exceptions only; others go on to the caller.

#include "kova/agentd/KovaLibManager.h"

#include <ios>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/include/KovaConstants.h"
#include "kova/agentd/util/KovaUtil.h"
#include "orbis/Formatter.h"
#include "orbis/Types.h"
#include "tessa/Panic.h"

using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::Logger;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;

// The statics of the plug-in. They stand in one file and in this order on purpose: they are built when the
// plug-in is loaded and go down in reverse when it is unloaded, the manager first, while the logger still
// lives.
namespace Kovasvc {

Ref<Logger> Util::KovaUtil::_logger;
Ref<Util::SessionImpl> Util::KovaUtil::_session;

const std::string masterGroupIpv4 = "224.1.2.3";
const std::string masterGroupIpv6 = "FF19:0:0:0:0:1:2:3";
const std::string agentGroupIpv4 = "224.2.3.4";
const std::string agentGroupIpv6 = "FF19:0:0:0:0:2:3:4";
const std::string lastHddText = "Can not remove last HDD";
const std::string witnessName = "witness";
const std::string serviceName = "kova";
const std::string allName = "all";
namespace {
const std::ios_base::Init standardStreams;
}
const std::string tcpStates[4] = {"down", "listen", "advertise", "both"};
const std::string anyIpv6Address = "::";
const std::string keyExchangeFolder = "/etc/nimbra/ike";
const std::string congestionControl = "newreno";

Ref<KovaManagerImpl> _kovaManagerImpl;

void CreateKovaManager(Ref<Logger>& logger) {
  LogInternal(logger, LogLevel::Verbose, "CreateKovaManagerImpl instantiating ostrax provider.");
  if (_kovaManagerImpl) {
    Tessa::PanicVerify("_kovaManagerImpl == __null", sourcePath, 231);
  }
  _kovaManagerImpl = MakeRef<KovaManagerImpl>(logger);
  LogInternal(logger, LogLevel::Verbose, "CreateKovaManagerImpl instantiated ostrax provider.");
}

namespace {

// Ends the process over an exception that nobody expected.
[[noreturn]] void PanicOver(const std::exception& exception) {
  const auto* const fault = dynamic_cast<const Orbis::MethodFault::Exception*>(&exception);
  if (fault == nullptr) {
    Tessa::PanicExit(exception.what());
  }
  if (const Ref<Logger> logger = Tessa::Service::GetDefaultLogger()) {
    LogInternal(logger, LogLevel::Error, "Fault: %1", Orbis::SerializeFormatter::Format(fault->GetFault()));
  }
  Tessa::PanicExit(exception);
}

// Calls an operation of the manager; an exception of the family ends the process.
template <class Family, class... Parameters, class... Arguments>
void Forward(void (KovaManagerImpl::*operation)(Parameters...), Arguments&... arguments) {
  try {
    (_kovaManagerImpl.Get()->*operation)(arguments...);
  } catch (const Family& exception) {
    PanicOver(exception);
  }
}

}  // namespace
}  // namespace Kovasvc

using Kovasvc::Forward;
using Kovasvc::KovaManagerImpl;
using Kovasvc::Texts;

KOVA_EXPORT int InitKovaPlugin() {
  try {
    const Ref<Logger> appLogger = Tessa::Service::GetDefaultLogger();
    if (!appLogger) {
      Tessa::PanicVerify("appLogger != __null", Kovasvc::sourcePath, 3330);
    }
    Ref<Logger> logger;
    appLogger->CreateChild("KovaPluginMgr", logger);
    Kovasvc::CreateKovaManager(logger);
    logger.Reset();
    return 1;
  } catch (...) {
    return 0;
  }
}

KOVA_EXPORT void AddDisksHookFn(const Texts& disks, const std::string& requestTag, std::string& fault,
                                std::string& result) {
  Forward<Tessa::Throwable>(&KovaManagerImpl::AddDisks, disks, requestTag, fault, result);
}

KOVA_EXPORT void InitializeDisksHookFn(const Texts& mappings, const std::string& requestTag,
                                       std::string& fault, std::string& result) {
  Forward<Tessa::Throwable>(&KovaManagerImpl::InitializeDisks, mappings, requestTag, fault, result);
}

// The hook's name is in the plural, the operation's is not: one disk is removed.
KOVA_EXPORT void RemoveDisksHookFn(const std::string& disk, const std::string& passThrough,
                                   const std::string& optionText, int optionFirst, int optionSecond,
                                   std::string& fault) {
  Forward<std::exception>(&KovaManagerImpl::RemoveDisk, disk, passThrough, optionText, optionFirst,
                          optionSecond, fault);
}

KOVA_EXPORT void RemoveDiskMappingHookFn(const std::string& mapping, const std::string& passThrough,
                                         const std::string& optionText, int optionFirst, int optionSecond,
                                         std::string& fault) {
  Forward<std::exception>(&KovaManagerImpl::RemoveDiskMapping, mapping, passThrough, optionText, optionFirst,
                          optionSecond, fault);
}

KOVA_EXPORT void QueryDisksForKovaHookFn(Texts& names, std::string& fault, std::string& result) {
  Forward<std::exception>(&KovaManagerImpl::QueryDisksForKova, names, fault, result);
}

KOVA_EXPORT void AddAllEligibleDisksHookFn(const std::string& requestTag, std::string& fault,
                                           std::string& result) {
  Forward<std::exception>(&KovaManagerImpl::AddAllEligibleDisks, requestTag, fault, result);
}

KOVA_EXPORT void UnmountDiskMappingHookFn(const Texts& mappings, const std::string& requestTag,
                                          std::string& fault, std::string& result) {
  Forward<std::exception>(&KovaManagerImpl::UnmountDiskMapping, mappings, requestTag, fault, result);
}

KOVA_EXPORT void GetStorageInfoHookFn(std::string& result) {
  Forward<std::exception>(&KovaManagerImpl::GetStorageInfo, result);
}

KOVA_EXPORT void GetConfigInfoHookFn(std::string& result) {
  Forward<std::exception>(&KovaManagerImpl::GetConfigInfo, result);
}

KOVA_EXPORT void ClaimUnmountedDiskgroupHookFn() {
  Forward<std::exception>(&KovaManagerImpl::ClaimUnmountedDiskgroup);
}
