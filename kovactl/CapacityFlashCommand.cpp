#include "kovactl/CapacityFlashCommand.h"

#include <nlohmann/json.hpp>
#include <ostream>

#include "host/FaultWords.h"
#include "host/HostError.h"
#include "kovactl/Words.h"
#include "machines/HostSettingsFile.h"
#include "nox/Kova.h"
#include "nox/Operations.h"
#include "tessa/text/Escape.h"

namespace Kovactl {
namespace {

using Nox::Kova::Host::DiskResult;
using DiskResults = Orbis::DataArray<DiskResult>;

// A simulated host is described in a file of its own.
void CheckIsReal(const Host::ManagementApi& host, const std::string& disk) {
  try {
    host.DescribeHost();
  } catch (const Host::HostError&) {
    return;
  }
  throw BadInput("this is a simulated host; mark its disk with: kovactl sim set " + disk +
                 " --capacity-flash");
}

void CheckIsFlash(const Host::ManagementApi& host, const std::string& name) {
  const Host::Answer answer = host.Query(
      Nox::Operation::QueryDisksForKova(Tessa::MakeRef<Orbis::TextList>(std::vector<std::string>{name})));
  if (answer.fault) {
    throw BadInput("the host cannot be asked about its disks: " + Host::WordsFor(*answer.fault));
  }
  const auto* const disks = dynamic_cast<const DiskResults*>(answer.result.Get());
  if (disks == nullptr || disks->IsEmpty()) {
    throw BadInput("this host has no disk '" + Tessa::Escape(name) + "'");
  }
  const Nox::Host::ScsiDisk& disk = *(*disks)[0]->GetDisk();
  if (!disk.HasSsd() || !disk.GetSsd()) {
    throw BadInput(Tessa::Escape(name) + " is no flash disk, but: " + KindOf(disk));
  }
}

}  // namespace

ExitStatus RunCapacityFlash(const Host::ManagementApi& host, const CapacityFlashOptions& options,
                            std::ostream& out) {
  CheckIsReal(host, options.disk);
  if (options.isMarked) {
    CheckIsFlash(host, options.disk);
  }
  const bool isChanged = Machines::MarkCapacityFlash(options.settings, options.disk, options.isMarked);
  if (options.output == "json") {
    out << nlohmann::ordered_json{{"disk", options.disk},
                                  {"capacityFlash", options.isMarked},
                                  {"changed", isChanged}}
        << "\n";
    return ExitStatus::Done;
  }
  out << Tessa::Escape(options.disk)
      << (options.isMarked ? " is for the capacity tier" : " is for the cache tier")
      << (isChanged ? ".\n" : ", as before.\n");
  return ExitStatus::Done;
}

}  // namespace Kovactl
