// kovactl disks: which disks the storage service could use, and why it cannot use the others.
#pragma once

#include <iosfwd>
#include <string>
#include <vector>

#include "host/ManagementApi.h"
#include "kovactl/ExitStatus.h"

namespace Kovactl {

// Asks for the named disks, or all, and prints them. A name that the host does not know is an error, told
// after the disks that it does know.
ExitStatus RunDisks(const Host::ManagementApi& host, const std::vector<std::string>& names,
                    const std::string& output, std::ostream& out, std::ostream& err);

}  // namespace Kovactl
