// kovactl config: how the storage service is set up on the host.
#pragma once

#include <iosfwd>
#include <string>

#include "kovactl/Connection.h"
#include "kovactl/ExitStatus.h"

namespace Kovactl {

ExitStatus RunConfig(const Connection& connection, const std::string& output, std::ostream& out,
                     std::ostream& err);

}  // namespace Kovactl
