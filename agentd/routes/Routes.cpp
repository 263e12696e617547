#include "agentd/routes/Routes.h"

#include <algorithm>
#include <array>
#include <optional>
#include <string>
#include <vector>

#include "agentd/http/HttpTarget.h"
#include "host/KovaService.h"
#include "orbis/ParseException.h"
#include "orbis/json/JsonText.h"

namespace Agentd {
namespace {

using Host::Answer;
using Host::KovaService;

constexpr std::string_view jsonType = "application/json";

HttpAnswer PlainText(unsigned status, const std::string& text) {
  return {status, "text/plain", text + "\n"};
}

HttpAnswer ToJson(const Answer& answer) {
  HttpAnswer http;
  WriteJsonAnswer(answer, http.body);
  http.body += "\n";
  if (!answer.result && answer.fault) {
    http.status = dynamic_cast<Orbis::Fault::InvalidArgument*>(answer.fault.Get()) != nullptr ? 400 : 500;
  }
  return http;
}

[[noreturn]] void Refuse(const Orbis::Json::Value& value, const std::string& path,
                         const std::string& wanted) {
  throw Orbis::ParseException(path, value.line,
                              "wanted " + wanted + ", found " + Orbis::Json::Describe(value));
}

// The body {"names": [..]}, or {}.
std::vector<std::string> ReadNames(const std::string& body) {
  using Orbis::Json::Kind;
  const Orbis::Json::Value root = Orbis::Json::Parse(body, Orbis::Limits::Untrusted());
  if (root.kind != Kind::Object) {
    Refuse(root, "(root)", "an object");
  }
  std::vector<std::string> names;
  for (const auto& [key, value] : root.members) {
    if (key != "names") {
      throw Orbis::ParseException(key, value.line, "unknown parameter; QueryDisksForKova takes 'names'");
    }
    if (value.kind != Kind::Array) {
      Refuse(value, key, "an array of names");
    }
    for (const Orbis::Json::Value& item : value.items) {
      if (item.kind != Kind::String) {
        Refuse(item, "names[" + std::to_string(names.size()) + "]", "a name");
      }
      names.push_back(item.text);
    }
  }
  return names;
}

HttpAnswer Health(const KovaService&, const HttpTarget&, const HttpRequest&) {
  return PlainText(200, "ok");
}

std::optional<HttpAnswer> RefuseParameters(const HttpTarget& target, std::string_view known) {
  for (const auto& [name, value] : target.parameters) {
    if (name != known) {
      return PlainText(
          400, "unknown parameter '" + name + "'" +
                   (known.empty() ? "; there are none here" : "; wanted '" + std::string(known) + "'"));
    }
  }
  return std::nullopt;
}

// The body of an operation without parameters: {}.
void DemandNoParameters(const std::string& body) {
  const Orbis::Json::Value root = Orbis::Json::Parse(body, Orbis::Limits::Untrusted());
  if (root.kind != Orbis::Json::Kind::Object) {
    Refuse(root, "(root)", "an object");
  }
  for (const auto& [key, value] : root.members) {
    throw Orbis::ParseException(key, value.line, "unknown parameter; the operation takes none");
  }
}

HttpAnswer GetDisks(const KovaService& service, const HttpTarget& target, const HttpRequest&) {
  const auto refused = RefuseParameters(target, "names");
  return refused ? *refused : ToJson(service.QueryDisksForKova(target.ValuesOf("names")));
}

HttpAnswer PostQueryDisks(const KovaService& service, const HttpTarget&, const HttpRequest& request) {
  return ToJson(service.QueryDisksForKova(ReadNames(request.body)));
}

using Operation = Answer (KovaService::*)() const;

template <Operation operation>
HttpAnswer GetPlain(const KovaService& service, const HttpTarget& target, const HttpRequest&) {
  const auto refused = RefuseParameters(target, "");
  return refused ? *refused : ToJson((service.*operation)());
}

template <Operation operation>
HttpAnswer PostPlain(const KovaService& service, const HttpTarget&, const HttpRequest& request) {
  DemandNoParameters(request.body);
  return ToJson((service.*operation)());
}

struct Entry {
  std::string_view method;
  std::string_view path;
  HttpAnswer (*serve)(const KovaService&, const HttpTarget&, const HttpRequest&);
};

constexpr std::array<Entry, 7> entries = {{
    {"GET", "/healthz", &Health},
    {"GET", "/api/v1/disks", &GetDisks},
    {"POST", "/api/v1/QueryDisksForKova", &PostQueryDisks},
    {"GET", "/api/v1/groups", &GetPlain<&KovaService::GetStorageInfo>},
    {"POST", "/api/v1/GetStorageInfo", &PostPlain<&KovaService::GetStorageInfo>},
    {"GET", "/api/v1/config", &GetPlain<&KovaService::GetConfigInfo>},
    {"POST", "/api/v1/GetConfigInfo", &PostPlain<&KovaService::GetConfigInfo>},
}};

// A content type is demanded of every body: a form of a stranger's page cannot send this one.
bool IsJson(std::string_view contentType) {
  std::string type(contentType.substr(0, contentType.find(';')));
  type.erase(type.find_last_not_of(" \t") + 1);
  std::transform(type.begin(), type.end(), type.begin(), [](char byte) {
    return byte >= 'A' && byte <= 'Z' ? static_cast<char>(byte - 'A' + 'a') : byte;
  });
  return type == jsonType;
}

}  // namespace

HttpAnswer Route(const KovaService& service, const HttpRequest& request) {
  const std::optional<HttpTarget> target = ParseTarget(request.target);
  if (!target) {
    return PlainText(400, "the target holds a broken escape");
  }
  bool pathKnown = false;
  for (const Entry& entry : entries) {
    pathKnown = pathKnown || entry.path == target->path;
    if (entry.path != target->path || entry.method != request.method) {
      continue;
    }
    if (entry.method == "POST" && !IsJson(request.contentType)) {
      return PlainText(415, "the body must be application/json");
    }
    try {
      return entry.serve(service, *target, request);
    } catch (const Orbis::ParseException& refused) {
      return PlainText(400, refused.what());
    }
  }
  return pathKnown ? PlainText(405, "that method is not served here")
                   : PlainText(404, "nothing is served here");
}

}  // namespace Agentd
