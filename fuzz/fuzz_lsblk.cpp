// Any text: refused with the reader's exception, or imported as a host that a file may hold.

#include <cstdint>
#include <cstdlib>

#include "otxctl/sim/LsblkImport.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  OtxCtl::Sim::HostDescription host;
  try {
    host = OtxCtl::Sim::ImportLsblk({reinterpret_cast<const char*>(data), size}).host;
  } catch (const OtxCtl::Sim::HostDescriptionError&) {
    return 0;
  }
  OtxCtl::Sim::CheckHostDescription(host);  // throws, and so ends the run, if it is not
  return 0;
}
