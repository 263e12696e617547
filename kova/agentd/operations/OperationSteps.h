// What the operations that change disks have in common: reading the request, and turning exceptions into the
// operation's fault. What differs between them stands in each operation.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/marshal/ExceptionMarshal.h"
#include "orbis/DataArray.h"
#include "orbis/Soap.h"
#include "orbis/Types.h"
#include "tessa/Logger.h"
#include "tessa/Narrow.h"
#include "tessa/Ref.h"

namespace Kovasvc {

// What the panic over a text of another type names as its line, for each operation that reads objects.
// Labels, not lines of today's files: they stay as they are, so that panics of any build can be told apart
// alike.
enum class WrongTypeLine {
  AddDisks = 1908,
  InitializeDisks = 2070,
  RemoveDiskMapping = 2280,
  UnmountDiskMapping = 2549,
};

// A host program never hands over a text of another type, so one ends the process.
[[noreturn]] void PanicOverWrongType(WrongTypeLine line);

// The object of the text. A text that cannot be read throws Orbis::ParseException.
template <class T>
Tessa::Ref<T> ReadObject(const std::string& text, WrongTypeLine line) {
  Tessa::Ref<Orbis::Any> object;
  Orbis::DeserializeSoapToObject(text, object);
  try {
    return Tessa::NarrowToType<T>(object);
  } catch (const Tessa::TypeMismatchException&) {
    PanicOverWrongType(line);
  }
}

// The objects of the texts, in order.
template <class T>
Tessa::Ref<Orbis::DataArray<T>> ReadObjects(const std::vector<std::string>& texts, WrongTypeLine line) {
  const auto objects = Tessa::MakeRef<Orbis::DataArray<T>>();
  for (const std::string& text : texts) {
    objects->Append(ReadObject<T>(text, line));
  }
  return objects;
}

// Tells the log which disk that has left a request is about. Its UUID.
std::string ReadAbsentDisk(Tessa::Service::Logger& logger, const std::string& disk);

// Does the work. A fault that it throws becomes the operation's, in place of any before; false then.
template <class Work>
bool RunIntoFault(Tessa::Service::Logger& logger, Tessa::Ref<Orbis::MethodFault>& fault, Work work) {
  try {
    work();
    return true;
  } catch (const Orbis::MethodFault::Exception& exception) {
    LogInternal(logger, Tessa::Service::LogLevel::Verbose, "Got fault %1", exception.what());
    fault = exception.GetFault();
    return false;
  }
}

// Asks the kernel for something. Its refusal is a warning, of which %1 is the kernel's text, and the fault.
template <class Work>
void AskKernel(Tessa::Service::Logger& logger, std::string_view warning,
               Tessa::Ref<Orbis::MethodFault>& fault, Work work) {
  try {
    work();
  } catch (const HostCtl::Lib::HostCtlException& exception) {
    LogInternal(logger, Tessa::Service::LogLevel::Warning, warning, exception.Describe());
    MarshalHostCtlException(exception, fault);
  }
}

}  // namespace Kovasvc
