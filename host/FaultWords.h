// What faults say, in words for people.
#pragma once

#include <string>

#include "orbis/Types.h"

namespace Host {

// The words for the fault's kind alone: "attached by USB". The kind's name where there are none.
std::string WordsFor(const Orbis::MethodFault& fault);

// What went wrong, in one line: the words for the fault's kind, what it carries, then its messages.
std::string Explain(const Orbis::MethodFault& fault);

}  // namespace Host
