#include "agentd/routes/Permission.h"

#include <string>

#include "host/Refusal.h"
#include "nox/Faults.h"
#include "tessa/Logger.h"
#include "tessa/text/Escape.h"

namespace Agentd {
namespace {

Host::Answer NotPermitted(HttpRole role, const std::string& reason) {
  const auto fault = Tessa::MakeRef<Nox::Fault::NotPermitted>();
  fault->SetRole(std::string(NameOf(role)));
  Host::Explain(*fault, "nox.agentd.notPermitted", reason);
  return {.result = nullptr, .fault = fault};
}

}  // namespace

std::optional<Host::Answer> RefusalOf(const HttpRequest& request, HttpRole role) {
  const bool isFromPage = role == HttpRole::Change && request.hasOrigin;
  if (request.peer.role >= role && !isFromPage) {
    return std::nullopt;
  }
  const std::string reason =
      isFromPage ? "a page in a browser changes nothing here; the request bears an Origin header"
                 : "this takes the role '" + std::string(NameOf(role)) + "'; " + request.peer.identity +
                       " has the role '" + std::string(NameOf(request.peer.role)) + "'";
  if (const auto logger = Tessa::Service::GetDefaultLogger()) {
    Tessa::Service::LogInternal(logger, Tessa::Service::LogLevel::Info, "Refused '%1 %2' of %3: %4",
                                Tessa::EscapeToAscii(request.method), Tessa::EscapeToAscii(request.target),
                                request.peer.identity, reason);
  }
  return NotPermitted(role, reason);
}

}  // namespace Agentd
