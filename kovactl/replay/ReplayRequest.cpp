#include "kovactl/replay/ReplayRequest.h"

#include <algorithm>
#include <limits>

#include "nox/Host.h"
#include "orbis/Json.h"
#include "orbis/ParseException.h"
#include "orbis/json/JsonText.h"

namespace Kovactl {
namespace {

using Orbis::Json::Kind;
using Orbis::Json::Value;

[[noreturn]] void Refuse(const Value& value, const std::string& path, const std::string& reason) {
  throw Orbis::ParseException(path, value.line, reason);
}

void Demand(Kind kind, const char* wanted, const Value& value, const std::string& path) {
  if (value.kind != kind) {
    Refuse(value, path, std::string("wanted ") + wanted + ", found " + Orbis::Json::Describe(value));
  }
}

std::string ReadText(const Value& value, const std::string& path) {
  Demand(Kind::String, "a text", value, path);
  return value.text;
}

std::int32_t ReadInt(const Value& value, const std::string& path) {
  Demand(Kind::Integer, "an integer", value, path);
  if (value.integer < std::numeric_limits<std::int32_t>::min() ||
      value.integer > std::numeric_limits<std::int32_t>::max()) {
    Refuse(value, path, "does not fit in 32 bits");
  }
  return static_cast<std::int32_t>(value.integer);
}

template <class Item, class Read>
std::vector<Item> ReadList(const Value& value, const std::string& path, Read read) {
  Demand(Kind::Array, "an array", value, path);
  std::vector<Item> items;
  for (const Value& item : value.items) {
    items.push_back(read(item, path + "[" + std::to_string(items.size()) + "]"));
  }
  return items;
}

DiskArgument ReadDisk(const Value& value, const std::string& path) {
  if (value.kind == Kind::String) {
    return value.text;
  }
  const auto object =
      Orbis::ReadJson(value, &Nox::Host::ScsiDisk::StaticType(), path, Orbis::Missing::Default);
  return Tessa::Ref<Nox::Host::ScsiDisk>(static_cast<Nox::Host::ScsiDisk*>(object.Get()));
}

MappingArgument ReadMapping(const Value& value, const std::string& path) {
  Demand(Kind::Object, "a mapping", value, path);
  MappingArgument mapping{Tessa::MakeRef<Nox::Host::ScsiDisk>(), {}};
  for (const auto& [key, member] : value.members) {
    const std::string place = path + "." + key;
    if (key == "ssd") {
      mapping.ssd = ReadDisk(member, place);
    } else if (key == "nonSsd") {
      mapping.nonSsd = ReadList<DiskArgument>(member, place, &ReadDisk);
    } else if (key != "@type" || ReadText(member, place) != "KovaHostDiskMapping") {
      Refuse(member, place, "a mapping has ssd and nonSsd");
    }
  }
  return mapping;
}

nlohmann::json ReadHostPart(const Value& value, std::string_view line, const std::string& key) {
  Demand(Kind::Object, "an object", value, key);
  return nlohmann::json::parse(line)[key];  // sound and free of double keys: it was read before
}

// What each operation is called by, and the keys it takes.
struct Operation {
  std::string_view name;
  std::string_view hook;
  std::vector<std::string_view> keys;
};

const std::vector<Operation>& Operations() {
  static const std::vector<Operation> operations = {
      {"QueryDisksForKova", "QueryDisksForKovaHookFn", {"names"}},
      {"AddDisks", "AddDisksHookFn", {"disks", "requestTag"}},
      {"InitializeDisks", "InitializeDisksHookFn", {"mappings", "requestTag"}},
      {"RemoveDisk",
       "RemoveDisksHookFn",
       {"disk", "passThrough", "optionText", "optionFirst", "optionSecond"}},
      {"RemoveDiskMapping",
       "RemoveDiskMappingHookFn",
       {"mapping", "passThrough", "optionText", "optionFirst", "optionSecond"}},
      {"UnmountDiskMapping", "UnmountDiskMappingHookFn", {"mappings", "requestTag"}},
      {"AddAllEligibleDisks", "AddAllEligibleDisksHookFn", {"requestTag"}},
      {"GetStorageInfo", "GetStorageInfoHookFn", {}},
      {"GetConfigInfo", "GetConfigInfoHookFn", {}},
      {"ClaimUnmountedDiskgroup", "ClaimUnmountedDiskgroupHookFn", {}},
      {"raw",
       "",
       {"hook", "texts", "names", "disk", "requestTag", "passThrough", "optionText", "optionFirst",
        "optionSecond"}},
      {"host", "", {"set", "disk"}},
  };
  return operations;
}

const Operation& FindOperation(const Value& root) {
  const Value* const name = root.Find("operation");
  if (name == nullptr) {
    Refuse(root, "operation", "is missing");
  }
  for (const Operation& operation : Operations()) {
    if (operation.name == ReadText(*name, "operation")) {
      return operation;
    }
  }
  Refuse(*name, "operation", "unknown operation '" + name->text + "'");
}

void CheckHook(const Value& value) {
  for (const Operation& operation : Operations()) {
    if (!operation.hook.empty() && operation.hook == ReadText(value, "hook")) {
      return;
    }
  }
  Refuse(value, "hook", "unknown hook '" + value.text + "'");
}

void ReadMember(const std::string& key, const Value& value, std::string_view line, ReplayRequest& request) {
  if (key == "names") {
    request.names = ReadList<std::string>(value, key, &ReadText);
  } else if (key == "disks") {
    request.disks = ReadList<DiskArgument>(value, key, &ReadDisk);
  } else if (key == "mappings") {
    request.mappings = ReadList<MappingArgument>(value, key, &ReadMapping);
  } else if (key == "mapping") {
    request.mappings = {ReadMapping(value, key)};
  } else if (key == "texts") {
    request.texts = ReadList<std::string>(value, key, &ReadText);
  } else if (key == "hook") {
    CheckHook(value);
    request.hook = value.text;
  } else if (key == "set") {
    request.hostSet = ReadHostPart(value, line, key);
  } else if (key == "disk" && request.operation == "host") {
    request.hostDisk = ReadHostPart(value, line, key);
  } else if (key == "disk") {
    request.disk = ReadText(value, key);
  } else if (key == "requestTag") {
    request.requestTag = ReadText(value, key);
  } else if (key == "passThrough") {
    request.passThrough = ReadText(value, key);
  } else if (key == "optionText") {
    request.optionText = ReadText(value, key);
  } else if (key == "optionFirst") {
    request.optionFirst = ReadInt(value, key);
  } else if (key == "optionSecond") {
    request.optionSecond = ReadInt(value, key);
  }
}

}  // namespace

ReplayRequest ParseReplayRequest(std::string_view line) {
  const Value root = Orbis::Json::Parse(line, Orbis::Limits::OwnOutput());
  Demand(Kind::Object, "an object", root, "(root)");
  const Operation& operation = FindOperation(root);
  ReplayRequest request;
  request.operation = operation.name;
  request.hook = operation.hook;
  for (const auto& [key, value] : root.members) {
    if (key == "operation") {
      continue;
    }
    if (std::find(operation.keys.begin(), operation.keys.end(), key) == operation.keys.end()) {
      Refuse(value, key, "unknown key; " + request.operation + " has none of that name");
    }
    ReadMember(key, value, line, request);
  }
  if (request.operation == "raw" && request.hook.empty()) {
    Refuse(root, "hook", "is missing");
  }
  return request;
}

}  // namespace Kovactl
