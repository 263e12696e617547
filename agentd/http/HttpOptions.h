// What a server is told: where it answers, whom, and what a client may cost.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "agentd/http/AccessRules.h"
#include "agentd/http/HttpAddress.h"
#include "agentd/http/HttpTypes.h"

namespace Agentd {

// Files in PEM form.
struct TlsFiles {
  std::string certificate;  // the server's, with those between it and its root
  std::string key;
  std::string clientCa;  // whose certificates clients may come with
};

struct HttpOptions {
  std::vector<HttpAddress> listen = {};
  HttpLimits limits = {};
  AccessRules access = {};
  // For every TCP address. Without it, only loopback addresses are served, and clients there may read.
  std::optional<TlsFiles> tls = std::nullopt;
  // What the server is called besides the names of loopback, in the Host header of TCP clients.
  std::vector<std::string> serverNames = {};
};

}  // namespace Agentd
