#include <algorithm>
#include <array>
#include <nlohmann/json.hpp>
#include <type_traits>

#include "otxctl/sim/HostDescription.h"
#include "otxctl/sim/HostDescriptionFields.h"
#include "otxctl/sim/JsonText.h"
#include "tessa/text/Base64.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Sim {
namespace {

using nlohmann::json;
using nlohmann::ordered_json;

template <typename Struct>
requires std::is_class_v<Struct> ordered_json ToJson(const Struct& object);

template <typename Scalar>
requires std::is_arithmetic_v<Scalar> ordered_json ToJson(const Scalar& value) {
  return value;
}

ordered_json ToJson(const std::string& text) {
  return text;
}

ordered_json ToJson(const StorageSystem& system) {
  return system == StorageSystem::Missing ? "missing" : "present";
}

ordered_json ToJson(const std::vector<std::uint8_t>& bytes) {
  std::string text;
  Tessa::AppendBase64(bytes, text);
  return text;
}

template <typename Value>
ordered_json ToJson(const std::optional<Value>& optional) {
  return optional ? ToJson(*optional) : ordered_json(nullptr);
}

template <typename Element>
ordered_json ToJson(const std::vector<Element>& list) {
  ordered_json array = ordered_json::array();
  for (const Element& element : list) {
    array.push_back(ToJson(element));
  }
  return array;
}

template <typename Struct>
class FieldWriter {
 public:
  explicit FieldWriter(const Struct& object) : _object(object) {}

  template <typename Value>
  void Required(const char* key, Value Struct::*member, const Fields::Rule& = {}) {
    _result[key] = ToJson(_object.*member);
  }

  template <typename Value>
  void Optional(const char* key, Value Struct::*member, const Fields::Rule& = {}) {
    static const Struct defaults{};
    if (_object.*member != defaults.*member) {
      _result[key] = ToJson(_object.*member);
    }
  }

  ordered_json Take() { return std::move(_result); }

 private:
  const Struct& _object;
  ordered_json _result = ordered_json::object();
};

template <typename Struct>
requires std::is_class_v<Struct> ordered_json ToJson(const Struct& object) {
  FieldWriter<Struct> writer(object);
  Fields::Describe(writer, static_cast<const Struct*>(nullptr));
  return writer.Take();
}

bool IsGiven(const json& object, const char* what) {
  if (object.is_null()) {
    return false;
  }
  if (!object.is_object()) {
    throw HostDescriptionError(std::string(what) + ": must be an object");
  }
  return true;
}

// Of the disk that is to be changed.
const json& NameIn(const json& change) {
  const auto name = change.find("name");
  if (name == change.end() || !name->is_string()) {
    throw HostDescriptionError("disk.name: must be the name of the disk to change");
  }
  return *name;
}

json& FindDisk(json& document, const json& change) {
  const json& name = NameIn(change);
  json& disks = document["disks"];
  if (disks.is_array()) {
    for (json& disk : disks) {
      if (disk.is_object() && disk.contains("name") && disk["name"] == name) {
        return disk;
      }
    }
  }
  throw HostDescriptionError("disk.name: the host has no disk " +
                             Tessa::Quote(Tessa::Sanitize(name.get_ref<const std::string&>())));
}

}  // namespace

std::string WriteHostDescription(const HostDescription& host) {
  try {
    return ToJson(host).dump(2) + "\n";
  } catch (const json::exception& failure) {
    throw HostDescriptionError(std::string("document: cannot be written: ") + failure.what());
  }
}

void ApplyChange(HostDescription& host, const json& set, const json& disk) {
  json document = ToJson(host);
  if (IsGiven(set, "set")) {
    document.update(set);
  }
  if (IsGiven(disk, "disk")) {
    FindDisk(document, disk).update(disk);
  }
  host = ReadHostDescription(document);
}

namespace {

// A text that is of a change's form, whatever host it is for.
json ReadChange(std::string_view change) {
  json document = ParseJsonText(change, JsonLimits{});
  if (!document.is_object()) {
    throw HostDescriptionError("document: must be an object");
  }
  const std::array<const char*, 2> keys = {"set", "disk"};
  for (const auto& [key, value] : document.items()) {
    if (std::find(keys.begin(), keys.end(), key) == keys.end()) {
      const std::string clean = Tessa::Abbreviate(Tessa::Sanitize(key));
      throw HostDescriptionError((clean.empty() ? "''" : clean) +
                                 ": is no known key; a change has set and disk");
    }
  }
  IsGiven(document.value("set", json()), "set");
  if (const json disk = document.value("disk", json()); IsGiven(disk, "disk")) {
    NameIn(disk);
  }
  return document;
}

}  // namespace

void CheckChange(std::string_view change) {
  ReadChange(change);
}

void ApplyChange(HostDescription& host, std::string_view change) {
  const json document = ReadChange(change);
  ApplyChange(host, document.value("set", json()), document.value("disk", json()));
}

void CheckHostDescription(const HostDescription& host) {
  ReadHostDescription(ToJson(host));
}

}  // namespace OtxCtl::Sim
