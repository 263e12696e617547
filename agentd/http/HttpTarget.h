// The target of a request, taken apart.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace Agentd {

struct HttpTarget {
  std::string path;                                             // "/api/v1/disks"
  std::vector<std::pair<std::string, std::string>> parameters;  // decoded, in order

  // Every value given for the name.
  std::vector<std::string> ValuesOf(std::string_view name) const;
};

// Nothing when an escape ("%4x") is broken. A plus stays a plus: names of disks may hold one.
std::optional<HttpTarget> ParseTarget(std::string_view target);

}  // namespace Agentd
