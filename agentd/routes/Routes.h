// Which request calls which operation.
//
//   GET  /healthz                     "ok" while the agent serves
//   GET  /api/v1/disks?names=N&..     QueryDisksForKova
//   POST /api/v1/QueryDisksForKova    the same, {"names": [..]}
//   GET  /api/v1/groups               GetStorageInfo; POST /api/v1/GetStorageInfo, {}
//   GET  /api/v1/config               GetConfigInfo; POST /api/v1/GetConfigInfo, {}
//
// An answer is {"result": .., "fault": ..}, either null. The status is 200 with a result, 400 for an
// InvalidArgument or a request that cannot be read, 500 for other faults.
#pragma once

#include "agentd/http/HttpTypes.h"

namespace Host {
class KovaService;
}

namespace Agentd {

// Threads: any.
HttpAnswer Route(const Host::KovaService& service, const HttpRequest& request);

}  // namespace Agentd
