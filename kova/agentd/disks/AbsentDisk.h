// Disks that have left the host but that the kernel still remembers.
//
// Requests and results name such a disk "kova:" followed by its KOVA UUID of 36 characters.
#pragma once

#include <string>

#include "nox/Fwd.h"
#include "tessa/Ref.h"

namespace Kovasvc {

// Whether the name begins with "kova:", in exactly these letters.
bool IsPDLDiskInput(const std::string& diskName);

// Sets `uuid` to the UUID in the name, or to nothing when the name is not that of an absent disk.
void PDLDiskToKovaUuid(const std::string& diskName, std::string& uuid);

// Replaces `disk` with a new one that stands in for the absent disk of that UUID.
void GeneratePDLScsiDisk(const std::string& kovaUuid, bool ssd, Tessa::Ref<Nox::Host::ScsiDisk>& disk);

}  // namespace Kovasvc
