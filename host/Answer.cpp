#include "host/Answer.h"

#include <optional>
#include <utility>

#include "nox/Kova.h"
#include "orbis/Json.h"
#include "orbis/ParseException.h"
#include "orbis/Soap.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/WrittenSoap.h"
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

Ref<Orbis::MethodFault> ReadFault(const std::string& text) {
  Ref<Orbis::Any> fault;
  Orbis::DeserializeSoapToObject(text, fault, nullptr, &Orbis::MethodFault::StaticType());
  return AsFault(fault);
}

using GroupResults = Orbis::DataArray<Nox::Kova::Host::DiskMapResult>;

// The groups of a change's result, and how many of them failed; all 0 for a result of another kind.
struct GroupCounts {
  std::size_t all = 0;
  std::size_t failed = 0;
};

GroupCounts CountGroups(const Result& result) {
  GroupCounts counts;
  if (const auto* const groups = dynamic_cast<const GroupResults*>(result.Get())) {
    for (const Nox::Kova::Host::DiskMapResult* group : *groups) {
      ++counts.all;
      counts.failed += group->GetError() ? 1 : 0;
    }
  }
  return counts;
}

// The same of a text that is as the plug-in's writer writes it, without reading it.
std::optional<Orbis::ItemsOfSoap> ItemsOf(const Result& result) {
  return result.GetText() == nullptr ? std::nullopt : Orbis::CountItemsOfSoap(*result.GetText(), "error");
}

bool HoldsNothing(const Result& result) {
  if (const auto items = ItemsOf(result)) {
    return items->all == 0;
  }
  const auto* const list = dynamic_cast<const Orbis::DataArrayBase*>(result.Get());
  return !result || (list != nullptr && list->IsEmpty());
}

GroupCounts GroupsOf(const Result& result) {
  const auto items = ItemsOf(result);
  if (!items) {
    return CountGroups(result);
  }
  const bool isGroups = items->list == &GroupResults::StaticType();
  return isGroups ? GroupCounts{.all = items->all, .failed = items->withField} : GroupCounts{};
}

}  // namespace

Result Result::OfText(std::string text) {
  Result result;
  if (!text.empty()) {
    result._text = std::make_shared<const std::string>(std::move(text));
  }
  return result;
}

Orbis::Any* Result::Get() const {
  if (!_value && _text) {
    Orbis::DeserializeSoapToObject(*_text, _value);
  }
  return _value.Get();
}

bool IsFaultAlone(const Answer& answer) {
  return answer.fault && HoldsNothing(answer.result);
}

Outcome OutcomeOf(const Answer& answer) {
  if (IsFaultAlone(answer)) {
    return Outcome::Failed;
  }
  const GroupCounts groups = GroupsOf(answer.result);
  if (groups.failed != 0) {
    return groups.failed == groups.all ? Outcome::Failed : Outcome::Partly;
  }
  return answer.fault ? Outcome::Partly : Outcome::Done;
}

Outcome OutcomeOfQuery(const Answer& answer) {
  return !answer.fault ? Outcome::Done : IsFaultAlone(answer) ? Outcome::Failed : Outcome::Partly;
}

Answer AnswerOf(const std::string& faultText, std::string resultText) {
  return {.result = Result::OfText(std::move(resultText)),
          .fault = faultText.empty() ? nullptr : ReadFault(faultText)};
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

// A text that is as the plug-in's writer writes it needs not be read for this.
void WriteJsonResult(const Result& result, std::string& out) {
  if (!result) {
    out += "null";
  } else if (result.GetText() == nullptr || !Orbis::AppendJsonOfSoap(*result.GetText(), out)) {
    Orbis::WriteJson(*result.Get(), out);
  }
}

void WriteJsonFault(const Orbis::MethodFault* fault, std::string& out) {
  if (fault == nullptr) {
    out += "null";
  } else {
    Orbis::WriteJson(*fault, out);
  }
}

void WriteJsonAnswer(const Answer& answer, std::string& out) {
  out += "{\"result\":";
  WriteJsonResult(answer.result, out);
  out += ",\"fault\":";
  WriteJsonFault(answer.fault.Get(), out);
  out += "}";
}

Answer FailedWith(const std::string& reason) {
  return {.result = nullptr, .fault = Tessa::MakeRef<Orbis::Fault::SystemError>(reason)};
}

}  // namespace Host
