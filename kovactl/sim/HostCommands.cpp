#include "kovactl/sim/HostCommands.h"

#include <array>
#include <istream>
#include <ostream>

#include "otxctl/sim/HostFile.h"
#include "otxctl/sim/LsblkImport.h"
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

}  // namespace

ExitStatus RunHostImport(const ImportOptions& options, std::istream& in, std::ostream& out) {
  using OtxCtl::Sim::HostDescriptionError;
  std::string description;
  try {
    const OtxCtl::Sim::HostDescription host =
        OtxCtl::Sim::ImportLsblk(ReadInput(options.file, in),
                                 {.hostName = options.name, .minimumDiskBytes = options.minimumDiskBytes});
    description = OtxCtl::Sim::WriteHostDescription(host);
    if (!options.output.empty()) {
      const std::optional<std::string> warning = OtxCtl::Sim::HostFileWriter(options.output).Save(host);
      out << "Wrote " << options.output << ": " << Count(host.disks.size(), "disk") << ".\n";
      if (warning) {
        out << "Warning: " << *warning << ".\n";
      }
      return ExitStatus::Done;
    }
  } catch (const HostDescriptionError& refused) {
    throw BadInput(NameOf(options.file) + ": " + refused.what());
  } catch (const OtxCtl::Sim::HostFileError& failed) {
    throw BadInput(failed.what());
  }
  out << description;
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
