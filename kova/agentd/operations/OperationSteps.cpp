#include "kova/agentd/operations/OperationSteps.h"

#include "kova/agentd/KovaLibManager.h"
#include "tessa/Panic.h"

namespace Kovasvc {

void PanicOverWrongType(WrongTypeLine line) {
  Tessa::Panic("NOT_REACHED %s:%d\n", sourcePath, static_cast<int>(line));
}

}  // namespace Kovasvc
