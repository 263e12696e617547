// Reads JSON that nobody vouches for: bounded in size, depth and number of values, duplicate keys refused.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include <cstddef>
#include <string_view>

namespace OtxCtl::Sim {

struct JsonLimits {
  std::size_t bytes = std::size_t{256} * 1024 * 1024;
  std::size_t depth = 16;
  std::size_t values = 8'000'000;
};

// Throws HostDescriptionError. Time and memory grow linearly with the text.
nlohmann::json ParseJsonText(std::string_view text, const JsonLimits& limits);

}  // namespace OtxCtl::Sim
