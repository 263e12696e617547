// kovactl add, init, remove, remove-group, unmount, claim: the disk groups of the host, changed.
#pragma once

#include <iosfwd>
#include <string>

#include "kovactl/Change.h"
#include "kovactl/ExitStatus.h"
#include "kovactl/change/Consent.h"

namespace Kovactl {

struct ChangeOptions {
  std::string output = "table";
  bool forgotten = false;  // the host is a description in memory that nobody saves
  bool dryRun = false;     // the commands that would change disks were printed, and none was run
};

// Says that a change is forgotten, or was not made, where it is so.
void NoteForgotten(const ChangeOptions& options, std::ostream& err);

// Asks for consent where data may be lost, makes the change and prints what became of it. Nothing is changed
// without consent: then the status is BadInput. Fault when any part of the change failed. Throws BadInput.
ExitStatus RunChange(const Host::ManagementApi& host, Change& change, const Consent& consent,
                     const ChangeOptions& options, std::ostream& out, std::ostream& err);

// Mounts every disk group that is not. The host tells nothing of how that went, so its groups are looked at
// before and behind; Fault when one is still not mounted.
ExitStatus RunClaim(const Host::ManagementApi& host, const ChangeOptions& options, std::ostream& out,
                    std::ostream& err);

}  // namespace Kovactl
