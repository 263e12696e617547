// One line of a request log, understood but not yet carried out.
#pragma once

#include <cstdint>
#include <nlohmann/json.hpp>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "nox/Fwd.h"
#include "tessa/Ref.h"

namespace Kovactl {

// A disk as a log names it: by canonical name, to be looked up when the request runs, or in full.
using DiskArgument = std::variant<std::string, Tessa::Ref<Nox::Host::ScsiDisk>>;

struct MappingArgument {
  DiskArgument ssd;
  std::vector<DiskArgument> nonSsd;
};

// Which fields count depends on the operation; the others are empty.
struct ReplayRequest {
  std::string operation;
  std::string hook;  // raw: the export's name; otherwise the hook of the operation, empty for "host"
  std::vector<std::string> names;
  std::vector<DiskArgument> disks;
  std::vector<MappingArgument> mappings;
  std::vector<std::string> texts;  // raw
  std::string disk;
  std::string requestTag;
  std::string passThrough;
  std::string optionText;
  std::int32_t optionFirst = 0;
  std::int32_t optionSecond = 0;
  nlohmann::json hostSet;   // host: an object, or null
  nlohmann::json hostDisk;  // host: an object, or null
};

// Throws Orbis::ParseException: unknown operations, hooks and keys, wrong types.
ReplayRequest ParseReplayRequest(std::string_view line);

}  // namespace Kovactl
