// What a fault says in one line of text.
#pragma once

#include <string>

#include "tessa/Api.h"

namespace Orbis {

class MethodFault;

// The type's name and, behind a colon, the reason, or else the keys of its messages:
// "SystemError: no such host", "KovaFault: key1, key2", "DiskIsUSB".
TESSA_API std::string FaultText(const MethodFault& fault);

}  // namespace Orbis
