// kovactl capacity-flash: which flash disks of a real machine are for the capacity tier.
#pragma once

#include <iosfwd>
#include <string>

#include "host/ManagementApi.h"
#include "kovactl/ExitStatus.h"

namespace Kovactl {

struct CapacityFlashOptions {
  std::string disk;      // canonical name
  bool isMarked = true;  // false: the mark is taken away
  std::string settings;  // the machine's settings file
  std::string output = "table";
};

// Only a flash disk of `host` can be marked; a mark can be taken from any name. Throws BadInput, and
// Host::HostError for a settings file that cannot be used.
ExitStatus RunCapacityFlash(const Host::ManagementApi& host, const CapacityFlashOptions& options,
                            std::ostream& out);

}  // namespace Kovactl
