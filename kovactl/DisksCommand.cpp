#include "kovactl/DisksCommand.h"

#include <map>
#include <ostream>
#include <set>

#include "kovactl/Print.h"
#include "kovactl/Table.h"
#include "kovactl/Words.h"
#include "nox/Kova.h"
#include "nox/Operations.h"
#include "tessa/text/Escape.h"

namespace Kovactl {
namespace {

using Nox::Kova::Host::DiskResult;
using DiskResults = Orbis::DataArray<DiskResult>;

std::string DescriptionOf(const DiskResult& result) {
  return result.GetDisk()->HasDisplayName() ? result.GetDisk()->GetDisplayName() : "";
}

// "12 disks: 8 eligible, 4 ineligible"
void PrintSummary(const DiskResults& disks, std::ostream& out) {
  std::map<std::string, int> counts;
  for (const DiskResult* disk : disks) {
    ++counts[StateOf(*disk)];
  }
  out << disks.Size() << (disks.Size() == 1 ? " disk" : " disks");
  const char* separator = ": ";
  for (const auto& [state, count] : counts) {
    out << separator << count << " " << Tessa::Escape(state);
    separator = ", ";
  }
  out << "\n";
}

void PrintTable(const DiskResults& disks, std::ostream& out) {
  using Align = Table::Align;
  Table table({{"DISK"}, {"KIND"}, {"SIZE", Align::Right}, {"STATE"}, {"WHY NOT"}, {"DESCRIPTION"}});
  for (const DiskResult* disk : disks) {
    table.AddRow({NameOf(*disk->GetDisk()), KindOf(*disk->GetDisk()), SizeOf(*disk->GetDisk()),
                  StateOf(*disk), ReasonOf(*disk), DescriptionOf(*disk)});
  }
  if (!disks.IsEmpty()) {
    table.Print(out);
    out << "\n";
  }
  PrintSummary(disks, out);
}

}  // namespace

ExitStatus RunDisks(const Host::ManagementApi& host, const std::vector<std::string>& names,
                    const std::string& output, std::ostream& out, std::ostream& err) {
  const Host::Answer answer =
      host.Query(Nox::Operation::QueryDisksForKova(Tessa::MakeRef<Orbis::TextList>(names)));
  const ExitStatus status = PrintAnswer<DiskResults>(answer, output, out, err, &PrintTable);
  const auto* const disks = dynamic_cast<const DiskResults*>(answer.result.Get());
  if (disks == nullptr) {
    return status;
  }
  std::set<std::string> unknown(names.begin(), names.end());
  for (const DiskResult* disk : *disks) {
    unknown.erase(NameOf(*disk->GetDisk()));
  }
  for (const std::string& name : unknown) {
    err << "kovactl: this host has no disk '" << Tessa::Escape(name) << "'\n";
  }
  return status == ExitStatus::Done && !unknown.empty() ? ExitStatus::BadInput : status;
}

}  // namespace Kovactl
