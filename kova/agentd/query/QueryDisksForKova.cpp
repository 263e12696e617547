// Which disks the service could use, and why it cannot use the others.

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/disks/DiskQuery.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/marshal/DiskResultMarshal.h"
#include "kova/agentd/util/KovaUtil.h"
#include "nox/Kova.h"
#include "orbis/Types.h"

namespace Kovasvc {

using Tessa::Ref;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;

void KovaManagerImpl::QueryDisksForKova(Texts& names, std::string& faultText, std::string& resultText) {
  std::vector<HostCtl::Kova::DiskResult> records;
  {
    DiskCache::Locked cache(*_diskCache);
    RefreshKovaDiskCacheLocked(cache);
    LimitQueryDisksForKova(*_logger, names, DiskQueryLimit(), cache.Records(), records);
  }
  try {
    Ref<Orbis::DataArray<Nox::Kova::Host::DiskResult>> disks;
    MarshalHostCtlDiskResults(*_logger, records, disks, true);
    Ref<Orbis::Any> result = disks;
    Ref<Orbis::MethodFault> noFault;
    SerializeKovaResultAndFault(resultText, faultText, result, noFault);
  } catch (const Orbis::Fault::SystemError::Exception& exception) {
    // Without an inventory there is no answer, and that is not a fault of the request.
    LogInternal(_logger, LogLevel::Info, "Cannot marshal DiskResult due to %1", Util::ReasonOf(exception));
  }
}

}  // namespace Kovasvc
