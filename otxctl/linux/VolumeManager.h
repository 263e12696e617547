// The volume manager's commands that change something: each told before and after, none with force.
//
// Threads: one at a time.
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <utility>
#include <vector>

#include "otxctl/linux/Commands.h"

namespace OtxCtl::Linux {

// Extents of the volume groups that are made here.
inline constexpr std::int64_t extentBytes = std::int64_t{4} << 20;

// A cache disk is cut into as many equal slices, one for each capacity disk that its group may have.
inline constexpr std::int64_t slicesOfCache = 7;

// A command that ended with another status than 0.
class CommandRefused : public CommandFailed {
 public:
  CommandRefused(const std::string& what, CommandResult result)
      : CommandFailed(what), _result(std::move(result)) {}

  const CommandResult& GetResult() const noexcept { return _result; }

 private:
  CommandResult _result;
};

// A data volume to be made.
struct NewVolume {
  std::string name;
  std::string node;       // of its capacity disk, all of which it takes
  std::string cacheNode;  // of the cache disk
  std::int64_t cacheBytes = 0;
  std::string tag;
};

class VolumeManager {
 public:
  using Texts = std::vector<std::string>;
  // Told a line for people before and after each command.
  using Log = std::function<void(const std::string& line)>;
  // Given the words of each command, in place of running it.
  using DryRun = std::function<void(const Texts& command)>;

  VolumeManager(Commands& commands, std::string program, Log log, DryRun dryRun = {})
      : _commands(commands), _program(std::move(program)), _log(std::move(log)), _dryRun(std::move(dryRun)) {}

  bool IsDryRun() const noexcept { return static_cast<bool>(_dryRun); }

  // All throw CommandFailed; a CommandRefused if the command itself did not succeed. `nodes` are the device
  // files that it may look at, `group` is the name of a volume group on them.
  void CreateGroup(const Texts& nodes, const std::string& group, const Texts& tags);
  void AddMembers(const Texts& nodes, const std::string& group, const Texts& added);
  // Of a member. In a dry run an estimate, from the size of the disk.
  std::int64_t CountExtents(const Texts& nodes, const std::string& member, std::int64_t diskBytes);
  void TagMember(const Texts& nodes, const std::string& member, const Texts& tags);
  void CreateVolume(const Texts& nodes, const std::string& group, const NewVolume& volume);
  void ChangeTags(const Texts& nodes, const std::string& group, const Texts& removed, const Texts& added);
  // Volumes on disks that are not there are passed over.
  void Activate(const Texts& nodes, const std::string& group);
  void Deactivate(const Texts& nodes, const std::string& group);
  // One that came back after its group had changed.
  void TakeBack(const Texts& nodes, const std::string& group, const std::string& member);
  void SplitCache(const Texts& nodes, const std::string& group, const std::string& volume);
  void RemoveVolume(const Texts& nodes, const std::string& group, const std::string& volume);
  // The same; to find none is no error.
  void RemoveVolumeIfThere(const Texts& nodes, const std::string& group, const std::string& volume);
  void RemoveMember(const Texts& nodes, const std::string& group, const std::string& member);
  // Forgets members that have left the host and on which no volume lies.
  void ForgetMissing(const Texts& nodes, const std::string& group);
  // The same, with volumes that lie on them: those that only serve as caches, after SplitCache.
  void ForgetMissingAndTheirVolumes(const Texts& nodes, const std::string& group);
  // With all its volumes.
  void RemoveGroup(const Texts& nodes, const std::string& group);
  void ClearMembers(const Texts& nodes);

 private:
  CommandResult Try(const std::string& command, const Texts& nodes, const Texts& arguments);
  void Run(const std::string& command, const Texts& nodes, const Texts& arguments);
  [[noreturn]] void Refuse(const std::string& command, CommandResult result);

  Commands& _commands;
  const std::string _program;
  const Log _log;
  const DryRun _dryRun;
};

// As a shell would take it, for people.
std::string InWords(const std::vector<std::string>& command);

}  // namespace OtxCtl::Linux
