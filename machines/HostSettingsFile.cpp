#include "machines/HostSettingsFile.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <nlohmann/json.hpp>
#include <string_view>

#include "host/HostError.h"
#include "otxctl/sim/HostDescription.h"
#include "otxctl/sim/HostFile.h"
#include "otxctl/sim/JsonText.h"
#include "tessa/text/Escape.h"

namespace Machines {
namespace {

using Host::HostError;
using nlohmann::json;
using OtxCtl::Linux::HostSettings;

constexpr std::size_t longestFile = std::size_t{1} << 20;
constexpr const char* capacityFlashKey = "capacityFlash";
constexpr const char* minimumKey = "minimumDiskBytes";
constexpr std::array<std::string_view, 5> describedKeys = {"autoMode", "cluster", "faultDomain", "networks",
                                                           minimumKey};

// False: there is no such file.
bool CheckFile(const std::string& file) {
  struct stat status {};
  if (stat(file.c_str(), &status) != 0) {
    if (errno == ENOENT || errno == ENOTDIR) {
      return false;
    }
    throw HostError(file + ": cannot be read: " + std::strerror(errno));
  }
  if (status.st_uid != 0 && status.st_uid != geteuid()) {
    throw HostError(file + ": belongs to another user; it must be root's");
  }
  if ((status.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
    throw HostError(file + ": group or others may write it; take that away with chmod go-w");
  }
  return true;
}

json ReadDocument(const std::string& file) {
  if (!CheckFile(file)) {
    return json::object();
  }
  try {
    json document = OtxCtl::Sim::ParseJsonText(OtxCtl::Sim::ReadTextFile(file, longestFile), {});
    if (!document.is_object()) {
      throw HostError(file + ": must be an object");
    }
    return document;
  } catch (const OtxCtl::Sim::HostDescriptionError& refused) {
    throw HostError(file + ": " + refused.what());
  } catch (const OtxCtl::Sim::HostFileError& failed) {
    throw HostError(failed.what());
  }
}

std::set<std::string> ReadCapacityFlash(const std::string& file, const json& document) {
  std::set<std::string> disks;
  const auto list = document.find(capacityFlashKey);
  if (list == document.end()) {
    return disks;
  }
  if (!list->is_array()) {
    throw HostError(file + ": capacityFlash: must be a list");
  }
  for (std::size_t index = 0; index < list->size(); ++index) {
    const json& disk = (*list)[index];
    const bool isName = disk.is_string() && !disk.get_ref<const std::string&>().empty() &&
                        Tessa::IsPrintable(disk.get_ref<const std::string&>());
    if (!isName) {
      throw HostError(file + ": capacityFlash[" + std::to_string(index) +
                      "]: must be a disk's canonical name");
    }
    disks.insert(disk.get<std::string>());
  }
  return disks;
}

HostSettings Read(const std::string& file, const json& document) {
  HostSettings settings;
  settings.capacityFlash = ReadCapacityFlash(file, document);
  json described = json::object();
  for (const auto& [key, value] : document.items()) {
    if (std::find(describedKeys.begin(), describedKeys.end(), key) != describedKeys.end()) {
      described[key] = value;
    } else if (key != capacityFlashKey) {
      throw HostError(file + ": " + Tessa::Abbreviate(Tessa::Sanitize(key)) + ": is no known key");
    }
  }
  try {
    const OtxCtl::Sim::HostDescription host = OtxCtl::Sim::ReadHostDescription(described);
    settings.isAutoMode = host.autoMode;
    settings.isInCluster = host.cluster.enabled;
    settings.clusterUuid = host.cluster.clusterUuid;
    settings.nodeUuid = host.cluster.nodeUuid;
    settings.faultDomain = host.faultDomain;
    for (const OtxCtl::Sim::HostNetwork& network : host.networks) {
      settings.nics.push_back({network.interface, network.masterMulticastGroup, network.agentMulticastGroup});
    }
    if (described.contains(minimumKey)) {
      settings.minimumDiskBytes = host.minimumDiskBytes;
    }
  } catch (const OtxCtl::Sim::HostDescriptionError& refused) {
    throw HostError(file + ": " + refused.what());
  }
  return settings;
}

}  // namespace

HostSettings ReadHostSettings(const std::string& file) {
  return Read(file, ReadDocument(file));
}

bool MarkCapacityFlash(const std::string& file, const std::string& disk, bool isMarked) {
  try {
    const OtxCtl::Sim::HostFileWriter writer(file);
    json document = ReadDocument(file);
    std::set<std::string> disks = Read(file, document).capacityFlash;
    const bool isChanged = isMarked ? disks.insert(disk).second : disks.erase(disk) > 0;
    if (isChanged) {
      document[capacityFlashKey] = disks;
      if (const auto warning = writer.SaveText(document.dump(2) + "\n")) {
        throw HostError(*warning);
      }
    }
    return isChanged;
  } catch (const OtxCtl::Sim::HostFileError& failed) {
    throw HostError(failed.what());
  }
}

}  // namespace Machines
