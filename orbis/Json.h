// Objects as JSON texts and back.
//
// An object is {"@type": "KovaHostDiskResult", "disk": {...}, "state": "eligible"}: the type first, then
// the fields in schema order; unset fields and empty lists are left out; bytes are base64. A simple value
// where any value may stand is {"@type": "xsd:int", "@value": 3}. "@type" is always written; when reading,
// it may be missing where the declared type has objects of its own. A list at the top is an array; in a
// place for any value it is {"@type": "XList", "@value": [...]}.
//
// Threads: any; the value must not be written meanwhile.
#pragma once

#include <string>
#include <string_view>

#include "orbis/Any.h"
#include "orbis/DataObject.h"
#include "orbis/Limits.h"

namespace Orbis {

namespace Json {
struct Value;
}

// Appends the text of the value; what `out` held stays in front, and is all it holds when this throws.
// Never fails on texts: broken UTF-8 is written as U+FFFD. Throws Tessa::NotInitializedException for a
// null in a list or in a required field, naming it.
TESSA_API void WriteJson(const Any& value, std::string& out);

// The same of an object where its type goes without saying: no "@type" in front of its fields.
TESSA_API void WriteJsonFields(const DataObject& object, std::string& out);

// What a missing required field means.
enum class Missing {
  Refused,
  Default,    // the value of a new object: for texts that people write by hand
  InRequest,  // the same, but an object that not only answers need must be there
};

// Makes the object that a text alone stands for, where the type has a key.
using NamedObject = Ref<DataObject> (*)(const TypeDescriptor& type, const std::string& key);

// An object with nothing but its key.
TESSA_API Ref<DataObject> ObjectOfKey(const TypeDescriptor& type, const std::string& key);

struct JsonRules {
  Missing missing = Missing::Refused;
  NamedObject named = nullptr;  // null: a text stands for no object
};

// Reads a whole text. Bounded and strict: keys twice, unknown keys, wrong types, numbers out of range and
// anything behind the value are refused by a ParseException that names the path ("mapping.nonSsd[2].ssd")
// and the line. `declared` is the type of the value, a list's element type with it (see ArrayTypeOf);
// null: the text must name it.
TESSA_API Ref<Any> ReadJson(std::string_view text, const Limits& limits, const TypeDescriptor* declared,
                            const JsonRules& rules = {});

// The same for a value of a text that was read before (orbis/json/JsonText.h). `path` is where it stands.
TESSA_API Ref<Any> ReadJson(const Json::Value& value, const TypeDescriptor* declared,
                            std::string_view path = {}, const JsonRules& rules = {});

}  // namespace Orbis
