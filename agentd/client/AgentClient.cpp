#include "agentd/client/AgentClient.h"

#include <stdexcept>

#include "agentd/http/HttpClient.h"
#include "nox/Kova.h"
#include "orbis/Json.h"
#include "orbis/ParseException.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/json/JsonText.h"

namespace Agentd {
namespace {

constexpr std::string_view unixScheme = "unix:";

}  // namespace

AgentClient::AgentClient(const std::string& url) {
  if (url.compare(0, unixScheme.size(), unixScheme) != 0 || url.size() == unixScheme.size()) {
    throw std::invalid_argument("the agent's address '" + url + "' must be unix:PATH");
  }
  _socketPath = url.substr(unixScheme.size());
}

Host::Answer AgentClient::QueryDisksForKova(const std::vector<std::string>& names) const {
  std::string body = "{\"names\":[";
  for (std::size_t i = 0; i < names.size(); ++i) {
    body += i == 0 ? "" : ",";
    Orbis::Json::AppendString(names[i], body);
  }
  body += "]}";
  return Call("QueryDisksForKova", body, &Orbis::DataArray<Nox::Kova::Host::DiskResult>::StaticType());
}

Host::Answer AgentClient::GetStorageInfo() const {
  return Call("GetStorageInfo", "{}", &Nox::Kova::Host::ConfigInfo::StorageInfo::StaticType());
}

Host::Answer AgentClient::GetConfigInfo() const {
  return Call("GetConfigInfo", "{}", &Nox::Kova::Host::ConfigInfo::StaticType());
}

Host::Answer AgentClient::Call(const std::string& operation, const std::string& body,
                               const Orbis::TypeDescriptor* resultType) const {
  const HttpAnswer http = Exchange(_socketPath, {"POST", "/api/v1/" + operation, "application/json", body});
  if (http.contentType != "application/json") {
    throw ConnectionError("the agent on " + _socketPath + " answered with status " +
                          std::to_string(http.status) + ": " + http.body.substr(0, 1024));
  }
  try {
    return Host::ReadJsonAnswer(http.body, resultType);
  } catch (const Orbis::ParseException& refused) {
    throw ConnectionError("the answer of the agent on " + _socketPath + " cannot be read: " + refused.what());
  }
}

}  // namespace Agentd
