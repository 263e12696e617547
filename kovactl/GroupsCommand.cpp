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
using Nox::Kova::Host::DiskMapInfo;

// `state` is that of the group, for its first line; a disk that has left says so itself.
void AddDisk(Table& table, const std::string& group, const std::string& role, const ScsiDisk* disk,
             const std::string& state) {
  if (disk == nullptr) {
    table.AddRow({group, role, "(missing)", "", "", state, ""});
    return;
  }
  const std::string left = HasLeft(*disk) ? "has left the host" : "";
  const std::string both = state.empty() || left.empty() ? state + left : state + ", " + left;
  table.AddRow({group, role, NameOf(*disk), KindOf(*disk), SizeOf(*disk), both,
                disk->HasDisplayName() ? disk->GetDisplayName() : ""});
}

void PrintTable(const StorageInfo& info, std::ostream& out) {
  using Align = Table::Align;
  Table table({{"GROUP", Align::Right},
               {"ROLE"},
               {"DISK"},
               {"KIND"},
               {"SIZE", Align::Right},
               {"STATE"},
               {"DESCRIPTION"}});
  std::size_t number = 0;
  const auto& groups = info.GetDiskMapInfo();
  if (groups) {
    for (const DiskMapInfo* group : *groups) {
      const auto& mapping = group->GetMapping();
      AddDisk(table, std::to_string(++number), "cache", mapping->GetSsd().Get(),
              group->GetMounted() ? "mounted" : "not mounted");
      if (mapping->GetNonSsd()) {
        for (const ScsiDisk* disk : *mapping->GetNonSsd()) {
          AddDisk(table, "", "capacity", disk, "");
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
