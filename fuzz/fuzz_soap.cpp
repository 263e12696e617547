// Any text: refused with an exception of the reader, or read into an object that is written and read again
// to an equal one.

#include <cstdint>
#include <cstdlib>

#include "nox/Host.h"
#include "orbis/Engine.h"
#include "orbis/ParseException.h"
#include "orbis/Soap.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  // The types are registered by the library that this line keeps linked.
  static const Orbis::TypeDescriptor& keepsTheTypes = Nox::Host::ScsiDisk::StaticType();
  (void)keepsTheTypes;
  Orbis::Ref<Orbis::Any> value;
  try {
    value = Orbis::ReadSoap({reinterpret_cast<const char*>(data), size}, Orbis::Limits::Untrusted());
  } catch (const Orbis::ParseException&) {
    return 0;
  }
  std::string text;
  Orbis::SerializeObjectToSoap(*value, nullptr, text);
  if (!Orbis::Equal(value.Get(), Orbis::ReadSoap(text, Orbis::Limits::OwnOutput()).Get())) {
    std::abort();
  }
  return 0;
}
