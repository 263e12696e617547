#include "host/Generation.h"

#include <array>
#include <cstdint>
#include <cstdio>
#include <string_view>
#include <type_traits>
#include <utility>
#include <vector>

#include "host/HostState.h"
#include "nox/Host.h"
#include "orbis/Json.h"

namespace Host {
namespace {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskName;
using HostCtl::Kova::DiskResult;
using HostCtl::Kova::KovaClusterInfoDetailed;
using OtxCtl::Provider::NicGroups;

// Takes values in, each so that no two rows of values are the same bytes: texts and lists with their length
// in front. The hash is FNV-1a of 64 bits, mixed once more at the end.
//
// Records are taken apart field by field: one that gets a further field no longer compiles here.
class Digest {
 public:
  template <typename Number>
  requires(std::is_arithmetic_v<Number> || std::is_enum_v<Number>) void Add(Number number) {
    auto left = static_cast<std::uint64_t>(number);
    for (int byte = 0; byte < 8; ++byte) {
      AddByte(static_cast<unsigned char>(left & 0xFFU));
      left >>= 8U;
    }
  }

  void Add(std::string_view text) {
    Add(text.size());
    for (const char byte : text) {
      AddByte(static_cast<unsigned char>(byte));
    }
  }
  void Add(const std::string& text) { Add(std::string_view(text)); }

  template <typename Item>
  void Add(const std::vector<Item>& list) {
    Add(list.size());
    for (const Item& item : list) {
      Add(item);
    }
  }

  void Add(const std::pair<std::string, std::string>& pair) { AddAll(pair.first, pair.second); }

  void Add(const DiskResult& record) {
    const auto& [name, uuid, state, reason, isSsd, isPdl, thirdFlag, capacityFlash, format] = record;
    AddAll(name, uuid, state, reason, isSsd, isPdl, thirdFlag, capacityFlash, format);
  }

  void Add(const DiskName& disk) {
    const auto& [name, uuid] = disk;
    AddAll(name, uuid);
  }

  void Add(const DiskMapping& group) {
    const auto& [ssd, capacity, format, allFlash, thirdFlag] = group;
    AddAll(ssd, capacity, format, allFlash, thirdFlag);
  }

  void Add(const KernelGroup& group) {
    const auto& [disks, mounted] = group;
    AddAll(disks, mounted);
  }

  void Add(const KovaClusterInfoDetailed& cluster) {
    const auto& [enabled, uuid, pairs, node, text1, text2, text3, text4, text5] = cluster;
    AddAll(enabled, uuid, pairs, node, text1, text2, text3, text4, text5);
  }

  void Add(const NicGroups& nic) {
    const auto& [interface, master, agent] = nic;
    AddAll(interface, master, agent);
  }

  void Add(const Tessa::Ref<Nox::Host::StorageDeviceInfo>& inventory) {
    if (!inventory) {
      Add(std::string());
      return;
    }
    Nox::Host::StorageDeviceInfo rest(*inventory);
    rest.SetScsiLun(nullptr);
    AddText(&rest);
    const auto& units = inventory->GetScsiLun();
    Add(units ? units->Size() + 1 : 0);
    if (units) {
      for (const Nox::Host::ScsiLun* unit : *units) {
        AddText(unit);
      }
    }
  }

  template <typename... Values>
  void AddAll(const Values&... values) {
    (Add(values), ...);
  }

  std::string Text() const {
    std::uint64_t mixed = _hash;
    mixed = (mixed ^ (mixed >> 33U)) * 0xFF51AFD7ED558CCDU;
    mixed = (mixed ^ (mixed >> 33U)) * 0xC4CEB9FE1A85EC53U;
    mixed ^= mixed >> 33U;
    std::array<char, 17> text{};
    std::snprintf(text.data(), text.size(), "%016llx", static_cast<unsigned long long>(mixed));
    return text.data();
  }

 private:
  // Null, which a list may hold, is no text at all.
  void AddText(const Orbis::Any* object) {
    std::string text;
    if (object != nullptr) {
      Orbis::WriteJson(*object, text);
    }
    Add(text);
  }

  void AddByte(unsigned char byte) { _hash = (_hash ^ byte) * 0x100000001B3U; }

  std::uint64_t _hash = 0xCBF29CE484222325U;
};

}  // namespace

std::string GenerationOf(const HostState& state) {
  const auto& [disks, groups, autoMode, cluster, faultDomain, nics, inventory] = state;
  Digest digest;
  digest.AddAll(disks, groups, autoMode, cluster, faultDomain, nics, inventory);
  return digest.Text();
}

}  // namespace Host
