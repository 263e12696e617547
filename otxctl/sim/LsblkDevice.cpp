#include "otxctl/sim/LsblkDevice.h"

#include <charconv>
#include <limits>
#include <nlohmann/json.hpp>

#include "otxctl/sim/HostDescriptionError.h"
#include "otxctl/sim/JsonText.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Sim {
namespace {

using nlohmann::json;

// Each layer of mapped devices takes two levels of the document.
constexpr std::size_t kMostNesting = 64;

[[noreturn]] void Refuse(const std::string& path, const std::string& why) {
  throw HostDescriptionError(path + ": " + why);
}

// The keys of one device. A key that is missing or null counts as not said.
class DeviceReader {
 public:
  DeviceReader(const json& device, const std::string& path) : _device(device), _path(path) {
    if (!device.is_object()) {
      Refuse(path, "must be an object");
    }
  }

  std::string Text(const char* key) const {
    const json* const value = Find(key);
    if (value == nullptr) {
      return {};
    }
    if (!value->is_string()) {
      Refuse(_path + "." + key, "must be a text");
    }
    return Tessa::Sanitize(value->get_ref<const std::string&>());
  }

  std::string RequiredText(const char* key) const {
    std::string text = Text(key);
    if (text.empty()) {
      Refuse(_path + "." + key, "is missing; was lsblk run as \"lsblk --json -O -b\"?");
    }
    return text;
  }

  std::int64_t Number(const char* key) const {
    const json* const value = Find(key);
    if (value == nullptr) {
      return 0;
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
      Refuse(_path + "." + key, "must be a number of bytes; was lsblk run with -b?");
    }
    return number;
  }

  bool Flag(const char* key) const {
    const json* const value = Find(key);
    const auto is = [value](const json& meaning) { return *value == meaning; };
    if (value == nullptr || is(false) || is(0) || is("0")) {
      return false;
    }
    if (is(true) || is(1) || is("1")) {
      return true;
    }
    Refuse(_path + "." + key, "must be true or false");
  }

  // "mountpoints" is a list that holds null for a device that is not mounted; old versions have one text.
  bool IsMounted() const {
    if (Find("mountpoint") != nullptr) {
      return true;
    }
    const json* const points = Find("mountpoints");
    if (points == nullptr) {
      return false;
    }
    if (!points->is_array()) {
      Refuse(_path + ".mountpoints", "must be a list");
    }
    for (const json& point : *points) {
      if (!point.is_null()) {
        return true;
      }
    }
    return false;
  }

  const json* Find(const char* key) const {
    const auto found = _device.find(key);
    return found == _device.end() || found->is_null() ? nullptr : &*found;
  }

 private:
  const json& _device;
  const std::string& _path;
};

LsblkDevice ReadDevice(const DeviceReader& reader) {
  LsblkDevice device;
  device.name = reader.RequiredText("name");
  device.type = reader.RequiredText("type");
  device.parent = reader.Text("pkname");
  device.transport = reader.Text("tran");
  device.subsystems = reader.Text("subsystems");
  device.wwn = reader.Text("wwn");
  device.vendor = reader.Text("vendor");
  device.model = reader.Text("model");
  device.serial = reader.Text("serial");
  device.fileSystem = reader.Text("fstype");
  device.bytes = reader.Number("size");
  device.blockSize = reader.Number("log-sec");
  device.isRotational = reader.Flag("rota");
  device.isReadOnly = reader.Flag("ro");
  device.isMounted = reader.IsMounted();
  return device;
}

// Depth is bounded by the limits of the document.
void ReadDevices(const json& list, const std::string& path, const std::string& parent,
                 std::vector<LsblkDevice>& devices) {
  if (!list.is_array()) {
    Refuse(path, "must be a list");
  }
  for (std::size_t index = 0; index < list.size(); ++index) {
    const std::string devicePath = path + "[" + std::to_string(index) + "]";
    const DeviceReader reader(list[index], devicePath);
    LsblkDevice device = ReadDevice(reader);
    if (!parent.empty()) {
      device.parent = parent;
    }
    const std::string name = device.name;
    devices.push_back(std::move(device));
    if (const json* const children = reader.Find("children")) {
      ReadDevices(*children, devicePath + ".children", name, devices);
    }
  }
}

}  // namespace

std::vector<LsblkDevice> ReadLsblk(std::string_view lsblkJson) {
  JsonLimits limits;
  limits.depth = kMostNesting;
  const json document = ParseJsonText(lsblkJson, limits);
  if (!document.is_object() || !document.contains("blockdevices")) {
    Refuse("blockdevices", "is missing; this is no output of \"lsblk --json -O -b\"");
  }
  std::vector<LsblkDevice> devices;
  ReadDevices(document["blockdevices"], "blockdevices", {}, devices);
  return devices;
}

}  // namespace OtxCtl::Sim
