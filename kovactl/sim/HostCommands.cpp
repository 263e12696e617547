#include "kovactl/sim/HostCommands.h"

#include <array>
#include <istream>
#include <ostream>

#include "kovactl/Table.h"
#include "otxctl/sim/HostFile.h"
#include "otxctl/sim/LsblkImport.h"
#include "otxctl/sim/SimRules.h"
#include "tessa/text/Escape.h"

namespace Kovactl {
namespace {

constexpr std::size_t longestImport = std::size_t{64} << 20;
constexpr const char* standardInput = "-";

std::string ReadInput(const std::string& file, std::istream& in) {
  if (file != standardInput) {
    return OtxCtl::Sim::ReadTextFile(file, longestImport);
  }
  std::string text;
  std::array<char, 64 * 1024> chunk;
  while (in.read(chunk.data(), chunk.size()), in.gcount() > 0) {
    text.append(chunk.data(), static_cast<std::size_t>(in.gcount()));
    if (text.size() > longestImport) {
      throw BadInput("standard input is larger than " + std::to_string(longestImport) + " bytes");
    }
  }
  return text;
}

std::string NameOf(const std::string& file) {
  return file == standardInput ? "standard input" : file;
}

std::string Count(std::size_t count, const std::string& what) {
  return std::to_string(count) + " " + what + (count == 1 ? "" : "s");
}

// What was taken over and what not, each with the reason.
void PrintReport(const OtxCtl::Sim::LsblkImport& import, std::ostream& out) {
  Table disks({{"DISK"}, {"DEVICE"}, {"STATE"}, {"WHY NOT"}});
  std::size_t eligible = 0;
  for (std::size_t i = 0; i < import.host.disks.size(); ++i) {
    const OtxCtl::Sim::HostDisk& disk = import.host.disks[i];
    const bool isEligible = VerdictOn(import.host, disk, nullptr).state ==
                            static_cast<std::int32_t>(HostCtl::Kova::DiskState::Eligible);
    eligible += isEligible ? 1 : 0;
    disks.AddRow({disk.name, import.kernelNames[i], isEligible ? "eligible" : "ineligible", disk.detail});
  }
  out << "Took " << Count(import.host.disks.size(), "disk") << ", " << eligible << " of them eligible.\n";
  if (!import.host.disks.empty()) {
    disks.Print(out);
  }
  if (!import.leftOut.empty()) {
    out << "Left out " << Count(import.leftOut.size(), "device") << ".\n";
    Table devices({{"DEVICE"}, {"WHY"}});
    for (const OtxCtl::Sim::LeftOutDevice& device : import.leftOut) {
      devices.AddRow({device.name, device.why});
    }
    devices.Print(out);
  }
}

OtxCtl::Sim::LsblkImport Import(const ImportOptions& options, std::istream& in) {
  try {
    return OtxCtl::Sim::ImportLsblk(ReadInput(options.file, in),
                                    {.hostName = options.name, .minimumDiskBytes = options.minimumDiskBytes});
  } catch (const OtxCtl::Sim::HostDescriptionError& refused) {
    throw BadInput(NameOf(options.file) + ": " + refused.what());
  } catch (const OtxCtl::Sim::HostFileError& failed) {
    throw BadInput(failed.what());
  }
}

void WriteFile(const OtxCtl::Sim::HostDescription& host, const std::string& file, std::ostream& out) {
  try {
    const std::optional<std::string> warning = OtxCtl::Sim::HostFileWriter(file).Save(host);
    out << "Wrote " << file << ": " << Count(host.disks.size(), "disk") << ".\n";
    if (warning) {
      out << "Warning: " << *warning << ".\n";
    }
  } catch (const OtxCtl::Sim::HostFileError& failed) {
    throw BadInput(failed.what());
  }
}

}  // namespace

ExitStatus RunHostImport(const ImportOptions& options, std::istream& in, std::ostream& out,
                         std::ostream& err) {
  const OtxCtl::Sim::LsblkImport import = Import(options, in);
  if (options.output.empty()) {
    out << OtxCtl::Sim::WriteHostDescription(import.host);
  } else {
    WriteFile(import.host, options.output, out);
  }
  PrintReport(import, options.output.empty() ? err : out);
  return ExitStatus::Done;
}

ExitStatus RunHostCheck(const std::string& file, std::ostream& out) {
  try {
    const OtxCtl::Sim::HostDescription host = OtxCtl::Sim::LoadHostFile(file);
    const std::string name = host.name.empty() ? "unnamed host" : "host " + Tessa::Escape(host.name);
    out << file << ": " << name << ", " << Count(host.disks.size(), "disk") << ", "
        << Count(host.groups.size(), "disk group") << ": sound\n";
    return ExitStatus::Done;
  } catch (const OtxCtl::Sim::HostFileError& refused) {
    throw BadInput(refused.what());
  }
}

}  // namespace Kovactl
