#include "otxctl/linux/VolumeManager.h"

#include <array>
#include <chrono>
#include <cstdio>
#include <utility>

#include "otxctl/linux/LvmReport.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Linux {
namespace {

using Texts = std::vector<std::string>;

std::string Join(const Texts& texts, const char* between) {
  std::string joined;
  for (const std::string& text : texts) {
    joined += (joined.empty() ? "" : between) + text;
  }
  return joined;
}

Texts operator+(Texts one, const Texts& other) {
  one.insert(one.end(), other.begin(), other.end());
  return one;
}

Texts TagArguments(const char* option, const Texts& tags) {
  Texts arguments;
  for (const std::string& tag : tags) {
    arguments.insert(arguments.end(), {option, tag});
  }
  return arguments;
}

std::string SecondsSince(std::chrono::steady_clock::time_point start) {
  const std::chrono::duration<double> seconds = std::chrono::steady_clock::now() - start;
  std::array<char, 32> text{};
  std::snprintf(text.data(), text.size(), "%.1f", seconds.count());
  return text.data();
}

}  // namespace

std::string InWords(const Texts& command) {
  constexpr const char* plain = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-_=+./,:@%";
  Texts words;
  for (const std::string& word : command) {
    const bool isPlain = !word.empty() && word.find_first_not_of(plain) == std::string::npos;
    words.push_back(isPlain ? word : "'" + Tessa::Escape(word) + "'");
  }
  return Join(words, " ");
}

CommandResult VolumeManager::Try(const std::string& command, const Texts& nodes, const Texts& arguments) {
  const Texts words = Texts{_program, command, "--devices", Join(nodes, ",")} + arguments;
  if (_dryRun) {
    _dryRun(words);
    return {};
  }
  _log("Running " + InWords(words));
  const auto start = std::chrono::steady_clock::now();
  try {
    CommandResult result = _commands.Run(words);
    _log(command + " ended with status " + std::to_string(result.status) + " after " + SecondsSince(start) +
         " s");
    return result;
  } catch (const CommandFailed& failed) {
    _log(command + " failed after " + SecondsSince(start) + " s: " + failed.what());
    throw;
  }
}

void VolumeManager::Run(const std::string& command, const Texts& nodes, const Texts& arguments) {
  CommandResult result = Try(command, nodes, arguments);
  if (result.status != 0) {
    Refuse(command, std::move(result));
  }
}

void VolumeManager::Refuse(const std::string& command, CommandResult result) {
  const std::string words =
      command + " ended with status " + std::to_string(result.status) + ": " + Tessa::Sanitize(result.errors);
  _log(words);
  throw CommandRefused(words, std::move(result));
}

// Without "--yes": what stands on a disk that was thought to be free keeps the group from being made.
void VolumeManager::CreateGroup(const Texts& nodes, const std::string& group, const Texts& tags) {
  const Texts options = {"--setautoactivation", "n", "--physicalextentsize",
                         std::to_string(extentBytes) + "b"};
  Run("vgcreate", nodes, options + TagArguments("--addtag", tags) + Texts{"--", group} + nodes);
}

void VolumeManager::AddMembers(const Texts& nodes, const std::string& group, const Texts& added) {
  Run("vgextend", nodes, Texts{"--", group} + added);
}

std::int64_t VolumeManager::CountExtents(const Texts& nodes, const std::string& member,
                                         std::int64_t diskBytes) {
  if (_dryRun) {
    return diskBytes / extentBytes - 1;
  }
  const CommandResult result = Try(
      "pvs", nodes,
      {"--reportformat", "json", "--units", "b", "--nosuffix", "-o", physicalVolumeColumns, "--", member});
  try {
    const auto volumes = ReadPhysicalVolumes(result.output);
    return volumes.empty() ? 0 : volumes.front().extents;
  } catch (const BadReport& bad) {
    throw CommandFailed(std::string(bad.what()) + ": " + Tessa::Sanitize(result.errors));
  }
}

void VolumeManager::TagMember(const Texts& nodes, const std::string& member, const Texts& tags) {
  Run("pvchange", nodes, TagArguments("--addtag", tags) + Texts{"--", member});
}

// "--yes" lets it wipe what an earlier volume at the same place of the disk has left; and the cache, which
// the volume manager makes and joins in the same step, is new as well.
void VolumeManager::CreateVolume(const Texts& nodes, const std::string& group, const NewVolume& volume) {
  Run("lvcreate", nodes,
      {"--yes",
       "--wipesignatures",
       "y",
       "--zero",
       "y",
       "--config",
       "allocation/cache_mode=\"writethrough\"",
       "--type",
       "cache",
       "--cachedevice",
       volume.cacheNode,
       "--cachesize",
       std::to_string(volume.cacheBytes) + "b",
       "--extents",
       "100%PVS",
       "--addtag",
       volume.tag,
       "--name",
       volume.name,
       "--",
       group,
       volume.node});
}

void VolumeManager::ChangeTags(const Texts& nodes, const std::string& group, const Texts& removed,
                               const Texts& added) {
  Run("vgchange", nodes,
      TagArguments("--deltag", removed) + TagArguments("--addtag", added) + Texts{"--", group});
}

void VolumeManager::Activate(const Texts& nodes, const std::string& group) {
  constexpr int someCouldNot = 5;
  CommandResult result = Try("vgchange", nodes, {"--activate", "y", "--", group});
  const bool areMissing = result.errors.find("Refusing activation of partial LV") != std::string::npos;
  if (result.status != 0 && !(result.status == someCouldNot && areMissing)) {
    Refuse("vgchange", std::move(result));
  }
}

void VolumeManager::Deactivate(const Texts& nodes, const std::string& group) {
  Run("vgchange", nodes, {"--activate", "n", "--", group});
}

void VolumeManager::TakeBack(const Texts& nodes, const std::string& group, const std::string& member) {
  Run("vgextend", nodes, {"--restoremissing", "--", group, member});
}

void VolumeManager::SplitCache(const Texts& nodes, const std::string& group, const std::string& volume) {
  Run("lvconvert", nodes, {"--yes", "--splitcache", "--", group + "/" + volume});
}

void VolumeManager::RemoveVolume(const Texts& nodes, const std::string& group, const std::string& volume) {
  Run("lvremove", nodes, {"--yes", "--", group + "/" + volume});
}

void VolumeManager::RemoveVolumeIfThere(const Texts& nodes, const std::string& group,
                                        const std::string& volume) {
  CommandResult result = Try("lvremove", nodes, {"--yes", "--", group + "/" + volume});
  const bool isMissing = result.errors.find("Failed to find logical volume") != std::string::npos;
  if (result.status != 0 && !isMissing) {
    Refuse("lvremove", std::move(result));
  }
}

void VolumeManager::RemoveMember(const Texts& nodes, const std::string& group, const std::string& member) {
  Run("vgreduce", nodes, {"--", group, member});
}

void VolumeManager::ForgetMissing(const Texts& nodes, const std::string& group) {
  constexpr int othersKeepVolumes = 5;
  CommandResult result = Try("vgreduce", nodes, {"--removemissing", "--", group});
  if (result.status != 0 && result.status != othersKeepVolumes) {
    Refuse("vgreduce", std::move(result));
  }
}

void VolumeManager::ForgetMissingAndTheirVolumes(const Texts& nodes, const std::string& group) {
  Run("vgreduce", nodes, {"--removemissing", "--force", "--", group});
}

void VolumeManager::RemoveGroup(const Texts& nodes, const std::string& group) {
  Run("vgremove", nodes, {"--yes", "--", group});
}

void VolumeManager::ClearMembers(const Texts& nodes) {
  Run("pvremove", nodes, Texts{"--"} + nodes);
}

}  // namespace OtxCtl::Linux
