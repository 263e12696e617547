// The management API of an agent, over its socket: objects in, objects out.
#pragma once

#include <string>
#include <vector>

#include "host/Answer.h"

namespace Agentd {

class AgentClient {
 public:
  // A URL: "unix:/run/kova/agentd.sock". Throws std::invalid_argument for any other.
  explicit AgentClient(const std::string& url);

  // As Host::KovaService. Throws ConnectionError when the agent cannot be reached or does not answer in the
  // form it should.
  Host::Answer QueryDisksForKova(const std::vector<std::string>& names) const;
  Host::Answer GetStorageInfo() const;
  Host::Answer GetConfigInfo() const;

 private:
  Host::Answer Call(const std::string& operation, const std::string& body,
                    const Orbis::TypeDescriptor* resultType) const;

  std::string _socketPath;
};

}  // namespace Agentd
