// Objects as SOAP texts and back.
//
// A text holds one value:
//
//   <?xml version="1.0" encoding="UTF-8"?>
//   <object xmlns="urn:nox" xmlns:xsd=".." xmlns:xsi=".." xsi:type="HostScsiDisk">..</object>
//
// Fields stand in schema order, those of the bases first; unset fields and empty lists are left out; the
// type is named where it is not the declared one. Lists at the top are <object xsi:type="XList"> with
// <item> elements, so that an empty list keeps its type.
//
// Threads: any; the value must not be written meanwhile.
#pragma once

#include <functional>
#include <string>
#include <string_view>

#include "orbis/Any.h"
#include "orbis/Limits.h"

namespace Orbis {

class Version;

// Appends the text of the value; what `out` held stays in front, and is all it holds when this throws.
// With a version, types and fields newer than it are left out: a newer type is written as its nearest
// ancestor that the version has. Null: everything is written.
//
// Never fails on texts: what XML cannot hold is written as U+FFFD. Throws
// Tessa::NotInitializedException for a null in a list or in a required field, naming it.
TESSA_API void SerializeObjectToSoap(const Any& value, const Version* version, std::string& out);

// Says whether a text may hold objects of a type.
using TypeFilter = std::function<bool(const TypeDescriptor&)>;

// Reads a text that our own program wrote, or has let in. On success `value` is the object, never null;
// otherwise it is left as it was and a ParseException names path and line. With a version, types and
// fields newer than it are unknown; with a type, the object must be of it; with a filter, so must every
// type of the text.
TESSA_API void DeserializeSoapToObject(std::string_view text, Ref<Any>& value,
                                       const Version* version = nullptr, const TypeDescriptor* type = nullptr,
                                       const TypeFilter* filter = nullptr);

// The same with other limits, for texts from outside.
TESSA_API Ref<Any> ReadSoap(std::string_view text, const Limits& limits,
                            const TypeDescriptor* type = nullptr);

}  // namespace Orbis
