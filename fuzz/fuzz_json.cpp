// Any text: refused with an exception of the reader, or read into an object that is written and read again
// to an equal one.

#include <cstdint>
#include <cstdlib>

#include "nox/Kova.h"
#include "orbis/Engine.h"
#include "orbis/Json.h"
#include "orbis/ParseException.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const Orbis::TypeDescriptor& type = Nox::Kova::Host::DiskMapResult::StaticType();
  Orbis::Ref<Orbis::Any> value;
  try {
    value = Orbis::ReadJson({reinterpret_cast<const char*>(data), size}, Orbis::Limits::Untrusted(), &type);
  } catch (const Orbis::ParseException&) {
    return 0;
  }
  std::string text;
  Orbis::WriteJson(*value, text);
  if (!Orbis::Equal(value.Get(), Orbis::ReadJson(text, Orbis::Limits::OwnOutput(), &type).Get())) {
    std::abort();
  }
  return 0;
}
