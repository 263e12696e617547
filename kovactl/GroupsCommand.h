// kovactl groups: the disk groups of the host.
#pragma once

#include <iosfwd>
#include <string>

#include "kovactl/Connection.h"
#include "kovactl/ExitStatus.h"

namespace Kovactl {

ExitStatus RunGroups(const Connection& connection, const std::string& output, std::ostream& out,
                     std::ostream& err);

}  // namespace Kovactl
