// Changes of a host's disk groups, as the command line asks for them.
//
// One class per command: what it may destroy, how it is made, what it comes to. Used for the change itself
// and for its plan alike. Not shared between threads.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "host/ManagementApi.h"

namespace Kovactl {

using Texts = std::vector<std::string>;

class Change {
 public:
  virtual ~Change() = default;

  // Looks up on the host what the change has to know. Null, or the fault that the host answered with. Throws
  // BadInput for a disk group that the host does not have.
  virtual Tessa::Ref<Orbis::MethodFault> LookAt(const Host::ManagementApi& host);

  // Whether any disk may lose its data.
  virtual bool Destroys() const = 0;
  // Which ones, by canonical name; known once the host was looked at.
  virtual Texts DisksAtRisk() const { return {}; }

  // Makes the change. The host must have been looked at.
  virtual Host::Answer Make(const Host::ManagementApi& host) const = 0;

  // What became of a disk group for which the host answers without an error: "added".
  virtual std::string Participle() const = 0;
  // What to say where the host answers with nothing at all.
  virtual std::string WordsForSilence() const = 0;
  // Whether a full answer is a list of groups.
  virtual bool AnswersWithGroups() const { return true; }
  // The disks that it offers for disk groups, by canonical name; an empty list: every disk of the host.
  virtual std::optional<Texts> OfferedDisks() const { return std::nullopt; }
};

// Handed to the host's kernel as they are.
struct RemovalOptions {
  std::string passThrough;
  std::string text;
  std::int32_t first = 0;
  std::int32_t second = 0;
};

using ChangeRef = std::unique_ptr<Change>;

ChangeRef AddTheseDisks(Texts disks);
ChangeRef AddEveryEligibleDisk();
ChangeRef MakeGroup(std::string cacheDisk, Texts capacityDisks);
ChangeRef RemoveOneDisk(std::string disk, RemovalOptions options);
ChangeRef RemoveGroup(std::string cacheDisk, RemovalOptions options);
ChangeRef UnmountGroups(Texts cacheDisks);
ChangeRef ClaimGroups();

}  // namespace Kovactl
