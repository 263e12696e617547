// The kernel's exceptions become the management API's faults.
//
// Threads: any. Nothing is logged here.
#pragma once

#include "orbis/Types.h"
#include "tessa/Ref.h"

namespace HostCtl::Lib {
class HostCtlException;
}

namespace Kovasvc {

// Replaces `fault` with a new one that says what the exception said. An exception of a class that nobody
// knows becomes a SystemError.
void MarshalHostCtlException(const HostCtl::Lib::HostCtlException& exception,
                             Tessa::Ref<Orbis::MethodFault>& fault);

// Folds one fault into the combined one of an operation: the first stays what it is; from the second on
// there is one KovaFault with the messages of all, in order. A null fault changes nothing.
void PrepareKovaDiskFault(const Tessa::Ref<Orbis::MethodFault>& fault,
                          Tessa::Ref<Orbis::MethodFault>& combined);

}  // namespace Kovasvc
