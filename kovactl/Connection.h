// The host that a command works on: an agent's, or one hosted by this very process.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "host/Answer.h"
#include "host/HostRuntime.h"
#include "tessa/Logger.h"

namespace Kovactl {

class Connection {
 public:
  virtual ~Connection();
  // As Host::KovaService::QueryDisksForKova.
  virtual Host::Answer QueryDisksForKova(const std::vector<std::string>& names) const = 0;
  virtual Host::Answer GetStorageInfo() const = 0;
  virtual Host::Answer GetConfigInfo() const = 0;
};

// What all commands share.
struct GlobalOptions {
  std::string agent = "unix:/run/kova/agentd.sock";
  Host::RuntimeOptions runtime;  // with a host file, the command hosts the plug-in itself
  std::string output = "table";  // table, json or soap
  std::string logLevel = "warning";
};

// Throws BadInput, and what starting the runtime throws. An agent is not called yet.
std::unique_ptr<Connection> Connect(const GlobalOptions& options);

// The level of that name; throws BadInput.
Tessa::Service::LogLevel LevelOf(const std::string& name);

}  // namespace Kovactl
