// What faults say, in words for people, and what can be done about them.
#pragma once

#include <string>

#include "orbis/Types.h"

namespace Kovactl {

// The words for the fault's kind alone: "attached by USB". The kind's name where there are none.
std::string WordsFor(const Orbis::MethodFault& fault);

// What went wrong, in one line: the words for the fault's kind, what it carries, then its messages.
std::string Explain(const Orbis::MethodFault& fault);

// What to do about it, a sentence or two; empty where nobody can say.
std::string Advise(const Orbis::MethodFault& fault);

}  // namespace Kovactl
