// Claiming: the one change that the host answers with nothing, whatever came of it.

#include <ostream>

#include "kovactl/DiskGroups.h"
#include "kovactl/Print.h"
#include "kovactl/Table.h"
#include "kovactl/change/ChangeCommand.h"

namespace Kovactl {
namespace {

using Nox::Kova::Host::DiskMapInfo;

// Names of the cache disks of the groups that are not mounted.
Texts NotMounted(const DiskGroups& groups) {
  Texts names;
  for (const DiskMapInfo* group : groups.All()) {
    if (!group->GetMounted()) {
      names.push_back(CacheDiskOf(*group->GetMapping()));
    }
  }
  return names;
}

bool IsMounted(const DiskGroups& groups, const std::string& cacheDisk) {
  const DiskMapInfo* const group = groups.Find(cacheDisk);
  return group != nullptr && group->GetMounted();
}

void PrintOutcome(const Texts& wanted, const DiskGroups& now, std::ostream& out) {
  if (wanted.empty()) {
    out << "Every disk group was mounted already.\n";
    return;
  }
  Table table({{"OUTCOME"}, {"CACHE DISK"}});
  for (const std::string& cacheDisk : wanted) {
    table.AddRow({IsMounted(now, cacheDisk) ? "mounted" : "not mounted", cacheDisk});
  }
  table.Print(out);
}

}  // namespace

ExitStatus RunClaim(const Host::ManagementApi& host, const ChangeOptions& options, std::ostream& out,
                    std::ostream& err) {
  const DiskGroups before = DiskGroups::Of(host);
  if (before.Info() == nullptr) {
    PrintFault(*before.Fault(), err);
    return ExitStatus::Fault;
  }
  const Host::Answer answer = host.Change(Nox::Operation::ClaimUnmountedDiskgroup());
  const DiskGroups now = DiskGroups::Of(host);
  for (const auto& fault : {answer.fault, now.Fault()}) {
    if (fault) {
      PrintFault(*fault, err);
    }
  }
  if (answer.fault || now.Info() == nullptr) {
    return ExitStatus::Fault;
  }
  const Texts wanted = NotMounted(before);
  if (options.dryRun) {
    NoteForgotten(options, err);
    return ExitStatus::Done;
  }
  if (options.output == "table") {
    PrintOutcome(wanted, now, out);
  } else {
    PrintObject(*now.Info(), options.output, out);
  }
  if (!wanted.empty()) {
    NoteForgotten(options, err);
  }
  const std::size_t left = NotMounted(now).size();
  if (left > 0) {
    err << "kovactl: " << left << (left == 1 ? " disk group is" : " disk groups are")
        << " still not mounted\n  The host's log tells why.\n";
  }
  return left > 0 ? ExitStatus::Fault : ExitStatus::Done;
}

}  // namespace Kovactl
