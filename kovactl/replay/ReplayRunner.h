// kovactl replay: a log of requests, run again.
//
// Every line goes through the plug-in's hooks, past the gate, in one process and in order; for each, one
// line of JSON says what was answered, logged and asked of the kernel provider.
#pragma once

#include <iosfwd>
#include <string>

#include "host/HostRuntime.h"
#include "kovactl/ExitStatus.h"
#include "machines/Machines.h"
#include "tessa/Logger.h"

namespace Kovactl {

// The whole file is understood before its first line runs. Throws BadInput that names file, line and path.
// A panic of the plug-in ends the process with status 70, after a last answer that tells of it.
ExitStatus RunReplay(const Machines::MachineOptions& machine, Host::RuntimeOptions runtime,
                     const std::string& file, Tessa::Service::LogLevel level, std::istream& in,
                     std::ostream& out);

}  // namespace Kovactl
