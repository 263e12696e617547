#include "kovactl/GroupsCommand.h"

#include <ostream>

#include "kovactl/DiskGroups.h"
#include "kovactl/Print.h"
#include "kovactl/Table.h"
#include "kovactl/Words.h"
#include "nox/Kova.h"
#include "nox/Operations.h"

namespace Kovactl {
namespace {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DataVolume;
using Nox::Kova::Host::DiskMapInfo;

// Of that disk; null where the host tells none.
const DataVolume* VolumeOf(const DiskMapInfo& group, const ScsiDisk& disk) {
  if (group.GetVolume()) {
    for (const DataVolume* volume : *group.GetVolume()) {
      if (volume->GetDisk() == NameOf(disk)) {
        return volume;
      }
    }
  }
  return nullptr;
}

// `state` is that of the group, for its first line; a disk that has left says so itself. `volume` may be
// null.
void AddDisk(Table& table, const std::string& group, const std::string& role, const ScsiDisk* disk,
             const std::string& state, const DataVolume* volume) {
  if (disk == nullptr) {
    table.AddRow({group, role, "(missing)", "", "", state, ""});
    return;
  }
  const std::string left = HasLeft(*disk) ? "has left the host" : "";
  const std::string both = state.empty() || left.empty() ? state + left : state + ", " + left;
  table.AddRow({group, role, NameOf(*disk), KindOf(*disk), SizeOf(*disk), both,
                disk->HasDisplayName() ? disk->GetDisplayName() : "",
                volume == nullptr ? "" : volume->GetPath(),
                volume == nullptr ? "" : HumanSize(static_cast<std::uint64_t>(volume->GetBytes())),
                volume == nullptr ? "" : volume->GetCacheState()});
}

void PrintTable(const StorageInfo& info, std::ostream& out) {
  using Align = Table::Align;
  Table table({{"GROUP", Align::Right},
               {"ROLE"},
               {"DISK"},
               {"KIND"},
               {"SIZE", Align::Right},
               {"STATE"},
               {"DESCRIPTION"},
               {"VOLUME"},
               {"VOLUME SIZE", Align::Right},
               {"CACHE"}});
  std::size_t number = 0;
  const auto& groups = info.GetDiskMapInfo();
  if (groups) {
    for (const DiskMapInfo* group : *groups) {
      const auto& mapping = group->GetMapping();
      AddDisk(table, std::to_string(++number), "cache", mapping->GetSsd().Get(),
              group->GetMounted() ? "mounted" : "not mounted", nullptr);
      if (mapping->GetNonSsd()) {
        for (const ScsiDisk* disk : *mapping->GetNonSsd()) {
          AddDisk(table, "", "capacity", disk, "", disk == nullptr ? nullptr : VolumeOf(*group, *disk));
        }
      }
    }
  }
  if (number > 0) {
    table.Print(out);
    out << "\n";
  }
  out << number << (number == 1 ? " disk group" : " disk groups");
  if (info.HasAutoClaim()) {
    out << "; the host "
        << (info.GetAutoClaim() ? "claims disks on its own" : "waits to be told which disks to claim");
  }
  out << "\n";
}

}  // namespace

ExitStatus RunGroups(const Host::ManagementApi& host, const std::string& output, std::ostream& out,
                     std::ostream& err) {
  return PrintAnswer<StorageInfo>(host.Query(Nox::Operation::GetDiskGroups()), output, out, err, &PrintTable);
}

}  // namespace Kovactl
