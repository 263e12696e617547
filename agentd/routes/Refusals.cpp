#include "agentd/routes/Refusals.h"

#include <algorithm>

#include "agentd/routes/JsonAnswers.h"
#include "agentd/tasks/Busy.h"
#include "host/Refusal.h"
#include "nox/Faults.h"
#include "orbis/ParseException.h"
#include "orbis/Types.h"

namespace Agentd {
namespace {

constexpr std::string_view jsonFolder = "/api/v1";

bool IsForPrograms(std::string_view path) {
  const std::string_view rest = path.substr(std::min(jsonFolder.size(), path.size()));
  return path.substr(0, jsonFolder.size()) == jsonFolder &&
         (rest.empty() || rest.front() == '/' || rest.front() == '?');
}

}  // namespace

HttpAnswer RefusalAt(std::string_view path, unsigned status, const std::string& reason,
                     const std::string& argument) {
  if (!IsForPrograms(path)) {
    return PlainText(status, reason);
  }
  const auto fault = Tessa::MakeRef<Orbis::Fault::InvalidArgument>();
  if (!argument.empty()) {
    fault->SetArgument(argument);
  }
  Host::Explain(*fault, Host::invalidArgumentKey, reason);
  HttpAnswer http = ToHttp(Host::Answer{.result = nullptr, .fault = fault});
  http.status = status;
  return http;
}

HttpAnswer EncodeRefusal(std::string_view path, HttpAnswer refusal) {
  if (!IsForPrograms(path)) {
    return refusal;
  }
  const std::string reason = refusal.body.substr(0, refusal.body.find('\n'));
  HttpAnswer told = RefusalAt(path, refusal.status, reason);
  if (refusal.status == 503) {
    const auto busy = TooBusy("nox.agentd.door.tooMuch", reason);
    busy->SetRetryAfterSeconds(refusal.retryAfterSeconds);
    told = ToHttp(Host::Answer{.result = nullptr, .fault = busy});
  }
  refusal.contentType = std::move(told.contentType);
  refusal.body = std::move(told.body);
  return refusal;
}

HttpAnswer RefusalAt(std::string_view path, const Orbis::ParseException& refused) {
  return RefusalAt(path, 400, refused.what(), refused.GetPath());
}

}  // namespace Agentd
