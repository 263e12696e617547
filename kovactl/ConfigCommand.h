// kovactl config: how the storage service is set up on the host.
#pragma once

#include <iosfwd>
#include <string>

#include "host/ManagementApi.h"
#include "kovactl/ExitStatus.h"

namespace Kovactl {

ExitStatus RunConfig(const Host::ManagementApi& host, const std::string& output, std::ostream& out,
                     std::ostream& err);

}  // namespace Kovactl
