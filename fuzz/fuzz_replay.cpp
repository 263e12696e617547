// Any line: refused with the reader's exception, or understood as a request.

#include <cstdint>

#include "kovactl/replay/ReplayRequest.h"
#include "nox/Host.h"
#include "orbis/ParseException.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  try {
    Kovactl::ParseReplayRequest({reinterpret_cast<const char*>(data), size});
  } catch (const Orbis::ParseException&) {
    return 0;
  }
  return 0;
}
