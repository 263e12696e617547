// The runtime's loggers on standard error.
#pragma once

#include "tessa/Logger.h"
#include "tessa/Ref.h"

namespace Host {

// A logger whose lines go to standard error, with time, level and name. Children write to the same place
// under their own names, at the same level. Control characters in messages are made visible, so that a
// name cannot forge a line. Safe from any thread.
Tessa::Ref<Tessa::Service::Logger> MakeConsoleLogger(Tessa::Service::LogLevel level);

// Writes out what is still held back.
void FlushLogs() noexcept;

}  // namespace Host
