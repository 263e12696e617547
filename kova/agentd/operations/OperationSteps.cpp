#include "kova/agentd/operations/OperationSteps.h"

#include "kova/agentd/KovaLibManager.h"
#include "kova/agentd/disks/AbsentDisk.h"
#include "tessa/Panic.h"

namespace Kovasvc {

void PanicOverWrongType(WrongTypeLine line) {
  Tessa::Panic("NOT_REACHED %s:%d\n", sourcePath, static_cast<int>(line));
}

std::string ReadAbsentDisk(Tessa::Service::Logger& logger, const std::string& disk) {
  std::string uuid;
  PDLDiskToKovaUuid(disk, uuid);
  LogInternal(logger, Tessa::Service::LogLevel::Verbose, "Given PDL'd disk input (KOVA UUID: '%1')", uuid);
  return uuid;
}

}  // namespace Kovasvc
