// Names of types as the source has them, for messages.
#pragma once

#include <string>
#include <typeinfo>

#include "tessa/Api.h"

namespace Tessa {

// "Nox::Host::ScsiDisk"; without the arguments of templates and the library's inline namespaces.
TESSA_API std::string TypeName(const std::type_info& type);

}  // namespace Tessa
