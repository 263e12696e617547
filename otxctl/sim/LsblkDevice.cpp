#include "otxctl/sim/LsblkDevice.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <limits>
#include <nlohmann/json.hpp>
#include <unordered_map>
#include <unordered_set>
#include <utility>

#include "otxctl/sim/HostDescriptionError.h"
#include "otxctl/sim/JsonText.h"
#include "otxctl/sim/LsblkText.h"

namespace OtxCtl::Sim {
namespace {

using nlohmann::json;

// Each layer of mapped devices takes two levels of the document.
constexpr std::size_t mostNesting = 64;

// Without one of these nobody can tell whether a disk is free. Where mounts are shown has two names.
constexpr std::array<const char*, 18> neededColumns = {
    "kname",  "fstype", "label", "uuid", "pttype", "ptuuid", "ro",         "rm",   "hotplug",
    "serial", "size",   "state", "rota", "model",  "wwn",    "subsystems", "tran", "zoned"};

// What a device has only if somebody uses it, beside its file system and its partition table.
constexpr std::array<const char*, 9> traceColumns = {
    "fsver", "fssize", "fsused", "fsavail", "fsuse%", "partuuid", "partlabel", "parttype", "partflags"};

[[noreturn]] void Refuse(const std::string& path, const std::string& why) {
  throw HostDescriptionError(path + ": " + why);
}

std::string InCapitals(std::string text) {
  std::transform(text.begin(), text.end(), text.begin(), [](char character) {
    return character >= 'a' && character <= 'z' ? static_cast<char>(character - 'a' + 'A') : character;
  });
  return text;
}

// The keys of one device.
class DeviceReader {
 public:
  DeviceReader(const json& device, const std::string& path) : _device(device), _path(path) {
    if (!device.is_object()) {
      Refuse(path, "must be an object");
    }
  }

  std::string Text(const char* key) const {
    const json* const value = Find(key);
    return value == nullptr ? std::string() : TextOf(*value, key);
  }

  std::string RequiredText(const char* key) const {
    std::string text = Text(key);
    if (text.empty()) {
      Refuse(_path + "." + key, "is missing; run: " + std::string(lsblkCommand));
    }
    return text;
  }

  // A name may come as the path of the device's node.
  std::string DeviceName(const char* key) const { return WithoutFolder(Text(key)); }

  std::optional<std::int64_t> Number(const char* key) const {
    const json* const value = Find(key);
    if (value == nullptr) {
      return std::nullopt;
    }
    std::int64_t number = -1;
    if (value->is_number_unsigned()) {
      const auto read = value->get<std::uint64_t>();
      number = read > std::uint64_t{std::numeric_limits<std::int64_t>::max()}
                   ? -1
                   : static_cast<std::int64_t>(read);
    } else if (value->is_string()) {
      const auto& text = value->get_ref<const std::string&>();
      const char* const end = text.data() + text.size();
      const auto [stop, error] = std::from_chars(text.data(), end, number);
      number = error == std::errc() && stop == end ? number : -1;
    }
    if (number < 0) {
      Refuse(_path + "." + key, "must be a number of bytes; run: " + std::string(lsblkCommand));
    }
    return number;
  }

  std::optional<bool> Flag(const char* key) const {
    const json* const value = Find(key);
    const auto is = [value](const json& meaning) { return *value == meaning; };
    if (value == nullptr) {
      return std::nullopt;
    }
    if (is(false) || is(0) || is("0")) {
      return false;
    }
    if (is(true) || is(1) || is("1")) {
      return true;
    }
    Refuse(_path + "." + key, "must be true or false");
  }

  // "mountpoints" is a list that holds null for a device that is not mounted; old versions have one text.
  std::vector<std::string> Mounts() const {
    constexpr std::size_t enough = 8;
    std::vector<std::string> mounts;
    const auto add = [&](const json& value, const char* key) {
      std::string mount = value.is_null() ? std::string() : TextOf(value, key);
      if (!mount.empty() && mounts.size() < enough &&
          std::find(mounts.begin(), mounts.end(), mount) == mounts.end()) {
        mounts.push_back(std::move(mount));
      }
    };
    if (const json* const points = Find("mountpoints")) {
      if (!points->is_array()) {
        Refuse(_path + ".mountpoints", "must be a list");
      }
      for (const json& point : *points) {
        add(point, "mountpoints");
      }
    }
    if (const json* const point = Find("mountpoint")) {
      add(*point, "mountpoint");
    }
    return mounts;
  }

  std::vector<std::string> Traces() const {
    std::vector<std::string> traces;
    for (const char* const column : traceColumns) {
      const json* const value = Find(column);
      if (value == nullptr) {
        continue;
      }
      const std::string text = value->is_string() ? TextOf(*value, column) : value->dump();
      if (!text.empty()) {
        traces.push_back(InCapitals(column) + " " + text);
      }
    }
    return traces;
  }

  std::vector<std::string> MissingColumns() const {
    std::vector<std::string> missing;
    for (const char* const column : neededColumns) {
      if (!_device.contains(column)) {
        missing.push_back(InCapitals(column));
      }
    }
    if (!_device.contains("mountpoint") && !_device.contains("mountpoints")) {
      missing.push_back("MOUNTPOINTS");
    }
    return missing;
  }

  const json* Find(const char* key) const {
    const auto found = _device.find(key);
    return found == _device.end() || found->is_null() ? nullptr : &*found;
  }

 private:
  std::string TextOf(const json& value, const char* key) const {
    if (!value.is_string()) {
      Refuse(_path + "." + key, "must be a text");
    }
    return CleanLsblkText(value.get_ref<const std::string&>());
  }

  const json& _device;
  const std::string& _path;
};

LsblkDevice ReadDevice(const DeviceReader& reader, const std::string& path) {
  LsblkDevice device;
  device.path = path;
  device.name = WithoutFolder(reader.RequiredText("name"));
  device.type = reader.RequiredText("type");
  device.kernelName = reader.DeviceName("kname");
  if (device.kernelName.empty()) {
    device.kernelName = device.name;
  }
  device.transport = reader.Text("tran");
  device.subsystems = reader.Text("subsystems");
  device.worldWideName = reader.Text("wwn");
  device.vendor = reader.Text("vendor");
  device.model = reader.Text("model");
  device.serial = reader.Text("serial");
  device.fileSystem = reader.Text("fstype");
  device.label = reader.Text("label");
  device.uuid = reader.Text("uuid");
  device.partitionTable = reader.Text("pttype");
  device.otherTraces = reader.Traces();
  device.state = reader.Text("state");
  device.zones = reader.Text("zoned");
  device.mounts = reader.Mounts();
  device.bytes = reader.Number("size");
  device.blockSize = reader.Number("log-sec");
  device.isRotational = reader.Flag("rota");
  device.isReadOnly = reader.Flag("ro");
  device.isRemovable = reader.Flag("rm");
  device.isHotPlug = reader.Flag("hotplug");
  device.missingColumns = reader.MissingColumns();
  return device;
}

// A table's UUID without its kind is a table still.
void AddTableOfUuid(const DeviceReader& reader, LsblkDevice& device) {
  if (device.type != "part" && device.partitionTable.empty() && !reader.Text("ptuuid").empty()) {
    device.partitionTable = "unnamed";
  }
}

// Every device once, though lsblk shows one that stands on several others below each of them.
class DeviceList {
 public:
  void Add(LsblkDevice device) {
    // A zero byte stands in no name.
    const auto isKnownParent = [&](const std::string& parent) {
      return !_parents.insert(device.kernelName + '\0' + parent).second;
    };
    device.parents.erase(std::remove_if(device.parents.begin(), device.parents.end(), isKnownParent),
                         device.parents.end());
    const auto [position, isNew] = _positions.try_emplace(device.kernelName, _devices.size());
    if (isNew) {
      _devices.push_back(std::move(device));
    } else {
      Merge(_devices[position->second], std::move(device));
    }
  }

  std::vector<LsblkDevice> Take() && { return std::move(_devices); }

 private:
  static void Merge(LsblkDevice& known, LsblkDevice&& again) {
    if (known.type != again.type) {
      Refuse(again.path, "is " + known.name + " of " + known.path + " again, with another type");
    }
    known.parents.insert(known.parents.end(), again.parents.begin(), again.parents.end());
    Unite(known.mounts, again.mounts);
    Unite(known.otherTraces, again.otherTraces);
    Unite(known.missingColumns, again.missingColumns);
    for (const auto member :
         {&LsblkDevice::fileSystem, &LsblkDevice::label, &LsblkDevice::uuid, &LsblkDevice::partitionTable}) {
      if ((known.*member).empty()) {
        known.*member = again.*member;
      }
    }
    KeepIfSame(known.bytes, again.bytes);
    KeepIfSame(known.isRotational, again.isRotational);
    KeepIfSame(known.isReadOnly, again.isReadOnly);
    KeepIfSame(known.isRemovable, again.isRemovable);
    KeepIfSame(known.isHotPlug, again.isHotPlug);
    KeepIfSame(known.subsystems, again.subsystems);
    for (const auto member : {&LsblkDevice::transport, &LsblkDevice::worldWideName, &LsblkDevice::serial,
                              &LsblkDevice::model, &LsblkDevice::state, &LsblkDevice::zones}) {
      if (known.*member != again.*member) {
        Refuse(again.path, "is " + known.name + " of " + known.path + " again, and says something else");
      }
    }
  }

  // Of very many, some: one is enough to rule a disk out.
  static void Unite(std::vector<std::string>& known, const std::vector<std::string>& again) {
    constexpr std::size_t enough = 32;
    for (const std::string& text : again) {
      if (known.size() < enough && std::find(known.begin(), known.end(), text) == known.end()) {
        known.push_back(text);
      }
    }
  }

  template <typename Value>
  static void KeepIfSame(Value& known, const Value& again) {
    if (known != again) {
      known = Value();
    }
  }

  std::vector<LsblkDevice> _devices;
  std::unordered_map<std::string, std::size_t> _positions;
  std::unordered_set<std::string> _parents;  // of which device, and which
};

// Depth is bounded by the limits of the document.
void ReadDevices(const json& list, const std::string& path, const std::string& parent, DeviceList& devices) {
  if (!list.is_array()) {
    Refuse(path, "must be a list");
  }
  for (std::size_t index = 0; index < list.size(); ++index) {
    const std::string devicePath = path + "[" + std::to_string(index) + "]";
    const DeviceReader reader(list[index], devicePath);
    LsblkDevice device = ReadDevice(reader, devicePath);
    AddTableOfUuid(reader, device);
    for (const std::string& below : {parent, reader.DeviceName("pkname")}) {
      if (!below.empty() && std::count(device.parents.begin(), device.parents.end(), below) == 0) {
        device.parents.push_back(below);
      }
    }
    const std::string kernelName = device.kernelName;
    devices.Add(std::move(device));
    if (const json* const children = reader.Find("children")) {
      ReadDevices(*children, devicePath + ".children", kernelName, devices);
    }
  }
}

json ParseCapture(std::string_view text) {
  if (text.find_first_not_of(" \t\r\n") == std::string_view::npos) {
    throw HostDescriptionError("the capture is empty; run: " + std::string(lsblkCommand));
  }
  JsonLimits limits;
  limits.depth = mostNesting;
  try {
    return ParseJsonText(WithSoundEscapes(text), limits);
  } catch (const HostDescriptionError& refused) {
    const char first = text[text.find_first_not_of(" \t\r\n")];
    if (first == '{') {
      throw;
    }
    throw HostDescriptionError(std::string(refused.what()) +
                               "; this is no JSON, run: " + std::string(lsblkCommand));
  }
}

}  // namespace

std::vector<LsblkDevice> ReadLsblk(std::string_view lsblkJson) {
  const json document = ParseCapture(lsblkJson);
  if (!document.is_object() || !document.contains("blockdevices")) {
    Refuse("blockdevices", "is missing; run: " + std::string(lsblkCommand));
  }
  DeviceList devices;
  ReadDevices(document["blockdevices"], "blockdevices", {}, devices);
  return std::move(devices).Take();
}

}  // namespace OtxCtl::Sim
