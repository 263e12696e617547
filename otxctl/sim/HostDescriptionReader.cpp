#include <algorithm>
#include <nlohmann/json.hpp>
#include <string>
#include <type_traits>
#include <unordered_map>
#include <vector>

#include "otxctl/sim/HostDescription.h"
#include "otxctl/sim/HostDescriptionFields.h"
#include "otxctl/sim/JsonText.h"
#include "tessa/text/Base64.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Sim {
namespace {

using Fields::Rule;
using nlohmann::json;

constexpr std::size_t longestText = 64 * 1024;

// Where a value stands. Lives on the stack along the way down, and becomes a text only for an error.
struct Place {
  const Place* parent = nullptr;
  std::string_view key;
  std::size_t index = 0;

  std::string Text() const {
    if (parent == nullptr) {
      return {};
    }
    const std::string before = parent->Text();
    if (key.empty()) {
      return before + "[" + std::to_string(index) + "]";
    }
    return before + (before.empty() ? "" : ".") + std::string(key);
  }
};

[[noreturn]] void Refuse(const Place& place, const std::string& why) {
  const std::string path = place.Text();
  throw HostDescriptionError((path.empty() ? "document" : path) + ": " + why);
}

template <typename Struct>
requires std::is_class_v<Struct>
void Read(const json& value, const Place& place, const Rule& rule, Struct& object);

void Read(const json& value, const Place& place, const Rule&, bool& flag) {
  if (!value.is_boolean()) {
    Refuse(place, "must be true or false");
  }
  flag = value.get<bool>();
}

template <typename Integer>
requires std::is_integral_v<Integer>
void Read(const json& value, const Place& place, const Rule& rule, Integer& number) {
  if (!value.is_number_integer()) {
    Refuse(place, "must be a whole number");
  }
  const bool isHuge = value.is_number_unsigned() && value.get<std::uint64_t>() > std::uint64_t{INT64_MAX};
  const auto read = isHuge ? std::int64_t{INT64_MAX} : value.get<std::int64_t>();
  if (isHuge || read < rule.least || read > rule.most) {
    Refuse(place, "must be a number from " + std::to_string(rule.least) + " to " + std::to_string(rule.most));
  }
  number = static_cast<Integer>(read);
}

void Read(const json& value, const Place& place, const Rule& rule, std::string& text) {
  if (!value.is_string()) {
    Refuse(place, "must be a text");
  }
  const auto& read = value.get_ref<const std::string&>();
  if (read.empty() && !rule.mayBeEmpty) {
    Refuse(place, "must not be empty");
  }
  if (read.size() > longestText) {
    Refuse(place, "must not be longer than " + std::to_string(longestText) + " bytes");
  }
  if (!Tessa::IsPrintable(read)) {
    Refuse(place, "must be UTF-8 without control characters");
  }
  if (rule.isKnown != nullptr && !read.empty() && !rule.isKnown(read)) {
    Refuse(place, Tessa::Quote(read) + " is no " + rule.kind);
  }
  text = read;
}

void Read(const json& value, const Place& place, const Rule& rule, StorageSystem& system) {
  std::string text;
  Read(value, place, rule, text);
  if (text != "present" && text != "missing") {
    Refuse(place, "must be \"present\" or \"missing\"");
  }
  system = text == "missing" ? StorageSystem::Missing : StorageSystem::Present;
}

void Read(const json& value, const Place& place, const Rule& rule, std::vector<std::uint8_t>& bytes) {
  std::string text;
  Read(value, place, rule, text);
  if (!Tessa::ParseBase64(text, bytes)) {
    Refuse(place, "must be base64");
  }
}

template <typename Value>
void Read(const json& value, const Place& place, const Rule& rule, std::optional<Value>& optional) {
  if (value.is_null() && rule.mayBeNull) {
    optional.reset();
    return;
  }
  Read(value, place, rule, optional.emplace());
}

// The rule of a list is the rule of its elements.
template <typename Element>
void Read(const json& value, const Place& place, const Rule& rule, std::vector<Element>& list) {
  if (!value.is_array()) {
    Refuse(place, "must be a list");
  }
  list.clear();
  list.reserve(value.size());
  for (std::size_t index = 0; index < value.size(); ++index) {
    Read(value[index], Place{&place, {}, index}, rule, list.emplace_back());
  }
}

// Reads the keys that a table of fields names, and then refuses what is left over.
template <typename Struct>
class FieldReader {
 public:
  FieldReader(const json& source, const Place& place, Struct& object)
      : _source(source), _place(place), _object(object) {}

  template <typename Value>
  void Required(std::string_view key, Value Struct::*member, const Rule& rule = {}) {
    if (!Take(key, member, rule)) {
      Refuse(Place{&_place, key}, "is missing");
    }
  }

  template <typename Value>
  void Optional(std::string_view key, Value Struct::*member, const Rule& rule = {}) {
    Take(key, member, rule);
  }

  void RefuseUnknownKeys() const {
    if (_found == _source.size()) {
      return;
    }
    for (const auto& [key, value] : _source.items()) {
      if (std::find(_keys.begin(), _keys.end(), key) == _keys.end()) {
        const std::string clean = Tessa::Abbreviate(Tessa::Sanitize(key));
        Refuse(Place{&_place, clean.empty() ? std::string_view("\"\"") : clean}, "is no known key");
      }
    }
  }

 private:
  template <typename Value>
  bool Take(std::string_view key, Value Struct::*member, const Rule& rule) {
    _keys.push_back(key);
    const auto value = _source.find(key);
    if (value == _source.end()) {
      return false;
    }
    ++_found;
    Read(*value, Place{&_place, key}, rule, _object.*member);
    return true;
  }

  const json& _source;
  const Place& _place;
  Struct& _object;
  std::vector<std::string_view> _keys;
  std::size_t _found = 0;
};

template <typename Struct>
requires std::is_class_v<Struct>
void Read(const json& value, const Place& place, const Rule&, Struct& object) {
  if (!value.is_object()) {
    Refuse(place, "must be an object");
  }
  FieldReader<Struct> reader(value, place, object);
  Fields::Describe(reader, static_cast<const Struct*>(nullptr));
  reader.RefuseUnknownKeys();
}

// What no single value shows: names that are unique, and groups that hold disks of the host, each once.
class ReferenceCheck {
 public:
  explicit ReferenceCheck(const HostDescription& host) : _host(host) {}

  void Run() {
    for (std::size_t index = 0; index < _host.disks.size(); ++index) {
      AddDisk(index);
    }
    for (std::size_t index = 0; index < _host.groups.size(); ++index) {
      AddGroup(index);
    }
  }

 private:
  void AddDisk(std::size_t index) {
    const std::string& name = _host.disks[index].name;
    const auto [other, isNew] = _diskIndex.emplace(name, index);
    if (!isNew) {
      const Place disk{&_disks, {}, index};
      Refuse(Place{&disk, "name"},
             Tessa::Quote(name) + " is the name of disks[" + std::to_string(other->second) + "] already");
    }
  }

  void AddGroup(std::size_t index) {
    const HostGroup& group = _host.groups[index];
    const Place place{&_groups, {}, index};
    AddMember(Place{&place, "ssd"}, group.ssd);
    const Place capacity{&place, "capacity"};
    for (std::size_t position = 0; position < group.capacity.size(); ++position) {
      AddMember(Place{&capacity, {}, position}, group.capacity[position]);
    }
  }

  void AddMember(const Place& place, const std::string& name) {
    if (_diskIndex.count(name) == 0) {
      Refuse(place, "the host has no disk " + Tessa::Quote(name));
    }
    const auto [other, isNew] = _members.emplace(name, std::string());
    if (!isNew) {
      Refuse(place, Tessa::Quote(name) + " is in use already by " + other->second);
    }
    other->second = place.Text();
  }

  const HostDescription& _host;
  const Place _root;
  const Place _disks{&_root, "disks"};
  const Place _groups{&_root, "groups"};
  std::unordered_map<std::string_view, std::size_t> _diskIndex;
  std::unordered_map<std::string_view, std::string> _members;
};

// Delays that fit the same call add up, so those of one operation are bounded together: whoever waits for a
// host must get to the end of it.
void CheckDelays(const std::vector<Fault::FaultRule>& faults) {
  std::unordered_map<std::string_view, std::int64_t> totals;
  for (std::size_t index = 0; index < faults.size(); ++index) {
    std::int64_t& total = totals[faults[index].operation];
    total += faults[index].delayMs;
    if (total > Fields::longestDelayMs) {
      const Place root;
      const Place list{&root, "faults"};
      const Place fault{&list, {}, index};
      Refuse(Place{&fault, "delayMs"}, "the delays of " + faults[index].operation + " are longer than " +
                                           std::to_string(Fields::longestDelayMs) + " together");
    }
  }
}

}  // namespace

HostDescription ReadHostDescription(const json& document) {
  HostDescription host;
  Read(document, Place{}, Rule{}, host);
  ReferenceCheck(host).Run();
  CheckDelays(host.faults);
  return host;
}

HostDescription ParseHostDescription(std::string_view text) {
  return ReadHostDescription(ParseJsonText(text, JsonLimits{}));
}

}  // namespace OtxCtl::Sim
