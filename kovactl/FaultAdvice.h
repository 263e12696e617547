// What can be done about a fault, for who sits at the command line.
#pragma once

#include <string>

#include "orbis/Types.h"

namespace Kovactl {

// A sentence or two; empty where nobody can say.
std::string Advise(const Orbis::MethodFault& fault);

}  // namespace Kovactl
