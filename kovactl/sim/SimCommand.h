// kovactl sim: a simulated host, changed as only a simulated one can be.
#pragma once

#include <iosfwd>
#include <nlohmann/json.hpp>
#include <string>

#include "host/ManagementApi.h"
#include "kovactl/ExitStatus.h"
#include "kovactl/change/ChangeCommand.h"

namespace Kovactl {

// What to change: {"set": {top-level keys}, "disk": {"name": .., keys of that disk}}, either may be missing.
using HostChange = nlohmann::ordered_json;

// Changes the host and says what was set. Fault when the host would not be one any more, say, when it has no
// such disk. Throws BadInput for a change of nothing.
ExitStatus RunSimSet(const Host::ManagementApi& host, const HostChange& change, const ChangeOptions& options,
                     std::ostream& out, std::ostream& err);

// Adds a fault to those that the host has; `fault` holds the keys of one.
ExitStatus RunSimFault(const Host::ManagementApi& host, const nlohmann::ordered_json& fault,
                       const ChangeOptions& options, std::ostream& out, std::ostream& err);

// Prints the host's description, as a file would hold it.
ExitStatus RunSimShow(const Host::ManagementApi& host, std::ostream& out);

}  // namespace Kovactl
