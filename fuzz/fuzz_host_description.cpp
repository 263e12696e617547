// Any text: refused with the reader's exception, or read into a host that is written and read again to an
// equal one.

#include <cstdint>
#include <cstdlib>

#include "otxctl/sim/HostDescription.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using OtxCtl::Sim::HostDescription;
  HostDescription host;
  try {
    host = OtxCtl::Sim::ParseHostDescription({reinterpret_cast<const char*>(data), size});
  } catch (const OtxCtl::Sim::HostDescriptionError&) {
    return 0;
  }
  if (!(OtxCtl::Sim::ParseHostDescription(OtxCtl::Sim::WriteHostDescription(host)) == host)) {
    std::abort();
  }
  return 0;
}
