// kovactl tasks: what became of the changing requests that an agent was given.
#pragma once

#include <iosfwd>
#include <string>

#include "kovactl/ExitStatus.h"

namespace Kovactl {

// Prints the agent's list of tasks, JSON as the agent gives it. Throws Orbis::ParseException when that
// cannot be one.
ExitStatus PrintTasks(const std::string& tasks, const std::string& output, std::ostream& out);

}  // namespace Kovactl
