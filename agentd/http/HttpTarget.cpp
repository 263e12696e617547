#include "agentd/http/HttpTarget.h"

#include <algorithm>
#include <boost/url/pct_string_view.hpp>

namespace Agentd {
namespace {

// Nothing when an escape is broken. What the library would refuse besides, bytes that stand in a target
// without need of their escape, is taken as it is: names of disks may hold any.
std::optional<std::string> Decode(std::string_view text) {
  const auto escaped = boost::urls::make_pct_string_view(text);
  return escaped ? std::optional<std::string>(escaped->decode()) : std::nullopt;
}

}  // namespace

std::vector<std::string> HttpTarget::ValuesOf(std::string_view name) const {
  std::vector<std::string> values;
  for (const auto& [key, value] : parameters) {
    if (key == name) {
      values.push_back(value);
    }
  }
  return values;
}

std::optional<HttpTarget> ParseTarget(std::string_view target) {
  HttpTarget parsed;
  const std::size_t question = target.find('?');
  const std::optional<std::string> path = Decode(target.substr(0, question));
  if (!path) {
    return std::nullopt;
  }
  parsed.path = *path;
  std::string_view rest = question == std::string_view::npos ? "" : target.substr(question + 1);
  while (!rest.empty()) {
    const std::size_t end = std::min(rest.find('&'), rest.size());
    const std::string_view pair = rest.substr(0, end);
    const std::size_t equals = std::min(pair.find('='), pair.size());
    const std::optional<std::string> name = Decode(pair.substr(0, equals));
    const std::optional<std::string> value = Decode(pair.substr(std::min(equals + 1, pair.size())));
    if (!name || !value) {
      return std::nullopt;
    }
    if (!pair.empty()) {
      parsed.parameters.emplace_back(*name, *value);
    }
    rest.remove_prefix(std::min(end + 1, rest.size()));
  }
  return parsed;
}

}  // namespace Agentd
