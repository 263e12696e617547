// What a request came to: a result, a fault, or both.
#pragma once

#include <string>
#include <string_view>

#include "host/Outcome.h"
#include "orbis/Any.h"
#include "orbis/Types.h"

namespace Host {

struct Answer {
  Tessa::Ref<Orbis::Any> result;         // null: none
  Tessa::Ref<Orbis::MethodFault> fault;  // null: none
};

// An answer whose result is still the text that the plug-in wrote, for whoever only passes it on.
struct WrittenAnswer {
  std::string result;                    // a SOAP text; empty: none
  Tessa::Ref<Orbis::MethodFault> fault;  // null: none
};

// Whether it is a fault and nothing else: without a result, or with a list that holds nothing.
bool IsFaultAlone(const Answer& answer);

// Failed: a fault alone, or each disk group of the request failed. Partly: a fault beside a result, or some
// of the groups failed.
Outcome OutcomeOf(const Answer& answer);

// A result that cannot be read, which would be a mistake of the plug-in, becomes a SystemError.
Answer Read(const WrittenAnswer& answer);
// Throws what SerializeObjectToSoap throws.
WrittenAnswer Written(const Answer& answer);

// Reads what a hook appended to the texts it was given; an empty text is nothing. Throws
// Orbis::ParseException, which would be a mistake of the plug-in.
Answer ReadAnswer(const std::string& faultText, const std::string& resultText);

// The same from the JSON form {"result": .., "fault": ..}, either null, that an agent sends. `resultType` is
// the declared type of the result. Throws Orbis::ParseException.
Answer ReadJsonAnswer(std::string_view text, const Orbis::TypeDescriptor* resultType);

// And back, appended.
void WriteJsonAnswer(const Answer& answer, std::string& out);

// An answer that is only a SystemError with that reason.
Answer FailedWith(const std::string& reason);

}  // namespace Host
