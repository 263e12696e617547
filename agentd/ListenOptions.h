// What the agent's command line says about clients: where they find the agent, and who may do what.
#pragma once

#include <string>
#include <vector>

#include "agentd/http/HttpOptions.h"

namespace CLI {
class App;
}

namespace Agentd {

class ListenOptions {
 public:
  // This outlives the parsing.
  void AddTo(CLI::App& cli);

  // What was given, understood. Throws std::invalid_argument that names what was not.
  HttpOptions Read() const;

 private:
  // As texts: a user or group of that name is looked up only when the agent starts.
  struct Grant {
    std::vector<std::string> users;
    std::vector<std::string> groups;
    std::vector<std::string> names;
  };

  static void AddTo(CLI::App& cli, const std::string& role, Grant& grant);
  static AccessRules::Grant Read(const Grant& grant);

  std::vector<std::string> _listen;
  Grant _change;
  Grant _read;
  TlsFiles _tls;
  std::vector<std::string> _serverNames;
};

}  // namespace Agentd
