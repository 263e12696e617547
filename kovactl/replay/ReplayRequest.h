// One line of a request log, understood but not yet carried out.
#pragma once

#include <nlohmann/json.hpp>
#include <string>
#include <string_view>
#include <vector>

#include "kovactl/replay/HookCall.h"
#include "nox/Host.h"

namespace Kovactl {

// A disk that a log names by its canonical name alone: it is looked up when the request runs.
class NamedDisk final : public Nox::Host::ScsiDisk {
 public:
  explicit NamedDisk(const std::string& canonicalName) { SetCanonicalName(canonicalName); }
};

struct ReplayRequest {
  std::string operation;
  const HookCall* hook = nullptr;            // null for "host"
  Tessa::Ref<Orbis::DataObject> parameters;  // the request object of the operation; null for "raw" and "host"
  HookArguments arguments;                   // without the texts of disks and groups, but for "raw"
  nlohmann::json hostSet;                    // host: an object, or null
  nlohmann::json hostDisk;                   // host: an object, or null
};

// Throws Orbis::ParseException: unknown operations, hooks and keys, wrong types.
ReplayRequest ParseReplayRequest(std::string_view line);

}  // namespace Kovactl
