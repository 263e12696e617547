// What a request came to: a result, a fault, or both.
//
// A result stays the text that the plug-in wrote until somebody looks into it: whoever only passes it on
// works on the text.
//
// Threads: an answer belongs to one thread at a time; a copy is another answer.
#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>

#include "host/Outcome.h"
#include "orbis/Any.h"
#include "orbis/Types.h"

namespace Host {

class Result {
 public:
  // None.
  Result() = default;
  Result(std::nullptr_t) {}  // NOLINT(google-explicit-constructor)

  // Of an object at hand; null: none.
  Result(Tessa::Ref<Orbis::Any> value) : _value(std::move(value)) {}  // NOLINT(google-explicit-constructor)
  template <class T>
  Result(const Tessa::Ref<T>& value) : _value(value) {}  // NOLINT(google-explicit-constructor)

  // Of a SOAP text; an empty one: none.
  static Result OfText(std::string text);

  // Whether there is one.
  explicit operator bool() const noexcept { return _value || _text; }

  // The text; null for a result that is an object.
  const std::string* GetText() const noexcept { return _text.get(); }

  // The object, null: none. A text is read when this is first called; throws Orbis::ParseException for one
  // that cannot be, which would be a mistake of the plug-in.
  Orbis::Any* Get() const;

  Orbis::Any& operator*() const { return *Get(); }

  // Roughly the bytes that the result's text takes; nothing is written to learn it.
  std::size_t TextSize() const noexcept { return _text ? _text->size() : 0; }

 private:
  mutable Tessa::Ref<Orbis::Any> _value;
  std::shared_ptr<const std::string> _text;  // shared by copies
};

struct Answer {
  Result result;
  Tessa::Ref<Orbis::MethodFault> fault;  // null: none
};

// Whether it is a fault and nothing else: without a result, or with a list that holds nothing.
bool IsFaultAlone(const Answer& answer);

// Failed: a fault alone, or each disk group of the request failed. Partly: a fault beside a result, or some
// of the groups failed.
Outcome OutcomeOf(const Answer& answer);

// The same of an answer that is not about disk groups, without a look into a result that stands alone.
Outcome OutcomeOfQuery(const Answer& answer);

// What a hook appended to the texts it was given; an empty text is nothing. Throws Orbis::ParseException for
// a fault that cannot be read, which would be a mistake of the plug-in.
Answer AnswerOf(const std::string& faultText, std::string resultText);

// From the JSON form {"result": .., "fault": ..}, either null, that an agent sends. `resultType` is the
// declared type of the result; null: it has none. Throws Orbis::ParseException.
Answer ReadJsonAnswer(std::string_view text, const Orbis::TypeDescriptor* resultType);

// And back, appended: from the text of the result, if it is one. Throws as Result::Get.
void WriteJsonAnswer(const Answer& answer, std::string& out);
// The result alone, and the fault; null for none.
void WriteJsonResult(const Result& result, std::string& out);
void WriteJsonFault(const Orbis::MethodFault* fault, std::string& out);

// An answer that is only a SystemError with that reason.
Answer FailedWith(const std::string& reason);

}  // namespace Host
