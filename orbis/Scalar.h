// Simple values as texts: the forms that SOAP and JSON share.
#pragma once

#include <string>
#include <string_view>

#include "orbis/TypeDescriptor.h"

namespace Orbis {

// Values are passed by address; their type is the kind's (see FieldKind; Base64: Bytes).

// Appends the text as XML Schema writes it. Strings are appended as they are.
void AppendScalar(FieldKind kind, const void* value, std::string& out);

// Reads a whole text. False, and the value as it was, if the text is not one of that kind: blanks,
// overflow, junk. Dates need a zone and at most 6 digits of fraction.
bool ParseScalar(FieldKind kind, std::string_view text, void* value);

bool EqualScalar(FieldKind kind, const void* left, const void* right);

// The value inside a Boxed<T>.
const void* BoxedValue(const Any& boxed);
void* BoxedValue(Any& boxed);
Ref<Any> CloneBoxed(const Any& boxed);

// "an integer of 32 bits", for messages about refused texts.
std::string_view DescribeKind(FieldKind kind);

}  // namespace Orbis
