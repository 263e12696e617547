#include "host/Answer.h"

#include "nox/Kova.h"
#include "orbis/Json.h"
#include "orbis/ParseException.h"
#include "orbis/Soap.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/json/JsonText.h"

namespace Host {

using Orbis::Json::Kind;
using Orbis::Json::Value;
using Tessa::Ref;

namespace {

Ref<Orbis::MethodFault> AsFault(const Ref<Orbis::Any>& value) {
  return Ref<Orbis::MethodFault>(static_cast<Orbis::MethodFault*>(value.Get()));
}

// A member that must be there, and is a value of that type or null.
Ref<Orbis::Any> ReadMember(const Value& object, const char* name, const Orbis::TypeDescriptor* type) {
  const Value* const member = object.Find(name);
  if (member == nullptr) {
    throw Orbis::ParseException("(root)", object.line,
                                "required member '" + std::string(name) + "' is missing");
  }
  return member->kind == Kind::Null ? nullptr : Orbis::ReadJson(*member, type, name);
}

template <class T>
void AppendOrNull(const Ref<T>& value, std::string& out) {
  if (value) {
    Orbis::WriteJson(*value, out);
  } else {
    out += "null";
  }
}

using GroupResults = Orbis::DataArray<Nox::Kova::Host::DiskMapResult>;

bool HoldsNothing(const Ref<Orbis::Any>& result) {
  const auto* const list = dynamic_cast<const Orbis::DataArrayBase*>(result.Get());
  return !result || (list != nullptr && list->IsEmpty());
}

}  // namespace

bool IsFaultAlone(const Answer& answer) {
  return answer.fault && HoldsNothing(answer.result);
}

Outcome OutcomeOf(const Answer& answer) {
  if (IsFaultAlone(answer)) {
    return Outcome::Failed;
  }
  const auto* const groups = dynamic_cast<const GroupResults*>(answer.result.Get());
  if (groups != nullptr && !groups->IsEmpty()) {
    std::size_t failed = 0;
    for (const Nox::Kova::Host::DiskMapResult* group : *groups) {
      failed += group->GetError() ? 1 : 0;
    }
    if (failed != 0) {
      return failed == groups->Size() ? Outcome::Failed : Outcome::Partly;
    }
  }
  return answer.fault ? Outcome::Partly : Outcome::Done;
}

Answer Read(const WrittenAnswer& answer) {
  try {
    return {.result = ReadAnswer("", answer.result).result, .fault = answer.fault};
  } catch (const Orbis::ParseException& mistake) {
    return FailedWith(mistake.what());
  }
}

WrittenAnswer Written(const Answer& answer) {
  WrittenAnswer written{.result = {}, .fault = answer.fault};
  if (answer.result) {
    Orbis::SerializeObjectToSoap(*answer.result, nullptr, written.result);
  }
  return written;
}

Answer ReadAnswer(const std::string& faultText, const std::string& resultText) {
  Answer answer;
  if (!resultText.empty()) {
    Orbis::DeserializeSoapToObject(resultText, answer.result);
  }
  if (!faultText.empty()) {
    Ref<Orbis::Any> fault;
    Orbis::DeserializeSoapToObject(faultText, fault, nullptr, &Orbis::MethodFault::StaticType());
    answer.fault = AsFault(fault);
  }
  return answer;
}

Answer ReadJsonAnswer(std::string_view text, const Orbis::TypeDescriptor* resultType) {
  const Value root = Orbis::Json::Parse(text, Orbis::Limits::OwnOutput());
  if (root.kind != Kind::Object) {
    throw Orbis::ParseException("(root)", root.line,
                                "wanted an object, found " + Orbis::Json::Describe(root));
  }
  return {.result = ReadMember(root, "result", resultType),
          .fault = AsFault(ReadMember(root, "fault", &Orbis::MethodFault::StaticType()))};
}

void WriteJsonAnswer(const Answer& answer, std::string& out) {
  out += "{\"result\":";
  AppendOrNull(answer.result, out);
  out += ",\"fault\":";
  AppendOrNull(answer.fault, out);
  out += "}";
}

Answer FailedWith(const std::string& reason) {
  return {.result = nullptr, .fault = Tessa::MakeRef<Orbis::Fault::SystemError>(reason)};
}

}  // namespace Host
