// Matchers for faults, log lines and the texts of answers.
#pragma once

#include <gmock/gmock.h>

#include <string>
#include <typeinfo>
#include <vector>

#include "nox/Faults.h"
#include "orbis/Soap.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/Types.h"
#include "tessa/Narrow.h"
#include "tests/support/RecordingLogger.h"

namespace TestSupport {

// A line of exactly this level and raw format, with these printed arguments.
template <class... Arguments>
auto LogLineIs(Tessa::Service::LogLevel level, const std::string& format, Arguments... arguments) {
  return testing::AllOf(testing::Field("level", &LogLine::level, level),
                        testing::Field("format", &LogLine::format, format),
                        testing::Field("arguments", &LogLine::arguments, testing::ElementsAre(arguments...)));
}

// A reference to a fault of exactly this class.
template <class Fault>
class IsExactlyMatcher {
 public:
  using is_gtest_matcher = void;
  bool MatchAndExplain(const Tessa::Ref<Orbis::MethodFault>& fault,
                       testing::MatchResultListener* listener) const {
    if (!fault) {
      *listener << "which is null";
      return false;
    }
    *listener << "which is " << fault->ToString();
    return &fault->GetType() == &Fault::StaticType();
  }
  void DescribeTo(std::ostream* out) const { *out << "is a " << Fault::StaticType().name; }
  void DescribeNegationTo(std::ostream* out) const { *out << "is no " << Fault::StaticType().name; }
};

template <class Fault>
testing::Matcher<const Tessa::Ref<Orbis::MethodFault>&> IsExactly() {
  return IsExactlyMatcher<Fault>();
}

// A fault of exactly this class that names the device.
MATCHER_P2(NamesDevice, type, device, "is " + std::string(type) + " of " + std::string(device)) {
  const auto* const diskFault = dynamic_cast<const Nox::Fault::KovaDiskFault*>(arg.Get());
  *result_listener << (arg ? arg->ToString() : "null");
  return diskFault != nullptr && diskFault->GetType().name == std::string_view(type) &&
         diskFault->HasDevice() && diskFault->GetDevice() == device;
}

// A SystemError with this reason.
MATCHER_P(IsSystemError, reason, "is a SystemError: " + std::string(reason)) {
  const auto* const error = dynamic_cast<const Orbis::Fault::SystemError*>(arg.Get());
  *result_listener << (arg ? arg->ToString() : "null");
  return error != nullptr && error->GetReason() == reason;
}

// An exception that carries a SystemError with this reason.
MATCHER_P(CarriesSystemError, reason, "carries a SystemError: " + std::string(reason)) {
  return testing::ExplainMatchResult(IsSystemError(reason), arg.GetFault(), result_listener);
}

// What a SOAP text of the plug-in holds. Throws when it is no such text, or of another type.
template <class T>
Tessa::Ref<T> ReadAnswer(const std::string& text) {
  Tessa::Ref<Orbis::Any> value;
  Orbis::DeserializeSoapToObject(text, value);
  return Tessa::NarrowToType<T>(value);
}

// The elements of a list, borrowed, for container matchers.
template <class T>
std::vector<T*> Elements(const Orbis::DataArray<T>& list) {
  std::vector<T*> elements;
  for (T* element : list) {
    elements.push_back(element);
  }
  return elements;
}

// The keys of a fault's messages, in order.
inline std::vector<std::string> MessageKeys(const Orbis::MethodFault& fault) {
  std::vector<std::string> keys;
  const auto messages = fault.GetFaultMessage();
  for (const Orbis::LocalizableMessage* message : *messages) {
    keys.push_back(message->GetKey());
  }
  return keys;
}

}  // namespace TestSupport
