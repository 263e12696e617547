// Any message: refused with an exception of the reader, or read into a request that is written and read again
// to an equal one.

#include <cstdint>
#include <cstdlib>

#include "nox/OperationTable.h"
#include "orbis/Engine.h"
#include "orbis/Envelope.h"
#include "orbis/TypeDescriptor.h"

namespace {

// The type of the request, chosen by the message's name as a server does.
const Orbis::TypeDescriptor& TypeOf(std::string_view name) {
  const Nox::OperationDescriptor* const operation = Nox::FindOperation(name);
  return operation != nullptr ? operation->request : Nox::FindOperation("RemoveDiskMapping")->request;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Orbis::Ref<Orbis::Any> request;
  try {
    const Orbis::SoapMessage message({reinterpret_cast<const char*>(data), size}, Orbis::Limits::Untrusted());
    request = message.Read(TypeOf(message.GetName()));
  } catch (const Orbis::ParseException&) {
    return 0;
  }
  std::string text;
  Orbis::AppendSoapMessage("Again", static_cast<const Orbis::DataObject&>(*request), text);
  const Orbis::SoapMessage again(text, Orbis::Limits::OwnOutput());
  if (!Orbis::Equal(request.Get(), again.Read(request->GetType()).Get())) {
    std::abort();
  }
  return 0;
}
