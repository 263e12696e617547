// What the data binding knows of each type: its name, its base, its fields and how to reach them.
//
// Generated code fills descriptors in; the engine (Clone, Equal, Print, the SOAP and JSON codecs) walks
// them. Descriptors are made on first use, never change afterwards and are never destroyed.
#pragma once

#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "orbis/Any.h"
#include "orbis/DataArray.h"
#include "orbis/DataObject.h"

namespace Orbis {

// What stands in a field.
enum class FieldKind {
  Boolean,   // bool
  Int,       // std::int32_t
  Long,      // std::int64_t
  DateTime,  // Orbis::DateTime
  String,    // std::string
  Base64,    // Ref<Binary>
  Object,    // Ref of a data object, or of a list of them
  Strings,   // Ref<TextList>
  Any,       // Ref<Any>
};

constexpr bool IsScalar(FieldKind kind) {
  return kind <= FieldKind::String;
}

enum class Presence { Required, Optional, List };

struct FieldDescriptor {
  std::string_view name;
  FieldKind kind;
  Presence presence;
  const TypeDescriptor& (*declaredType)();  // kind Object: the declared type of the object or element
  int since = 0;                            // order of the first version that has the field
  bool output = false;                      // a required one that a request may leave out
  bool key = false;                         // an optional text that identifies the object

  // Scalars: the value, or null when unset; and the value to write to, set if it was not.
  const void* (*read)(const DataObject&) = nullptr;
  void* (*write)(DataObject&) = nullptr;
  // Everything else: the object, or null; `assign` throws Tessa::TypeMismatchException.
  const Any* (*get)(const DataObject&) = nullptr;
  void (*assign)(DataObject&, Ref<Any>) = nullptr;
};

enum class TypeKind {
  DataObject,
  ObjectArray,  // DataArray<T>
  StringArray,  // TextList
  Simple,       // Boxed<T>
};

struct TypeDescriptor {
  std::string name;         // on the wire, without namespace: "HostScsiDisk", "int"
  std::string_view source;  // in the source: "Nox::Host::ScsiDisk"
  TypeKind kind = TypeKind::DataObject;
  const TypeDescriptor* base = nullptr;
  FieldKind simple = FieldKind::Any;                     // Simple: what is boxed
  const TypeDescriptor* element = nullptr;               // ObjectArray: the type of the elements
  std::vector<FieldDescriptor> ownFields = {};           // without those of the bases
  Ref<Any> (*create)() = nullptr;                        // null for an abstract type
  Ref<DataObject> (*copy)(const DataObject&) = nullptr;  // shares the objects that fields hold
  Ref<DataArrayBase> (*createArray)() = nullptr;         // ObjectArray
  int since = 0;                                         // order of the first version that has the type

  // Filled by Complete(), for data objects.
  std::vector<const FieldDescriptor*> fields = {};  // all fields, those of the bases first
  const FieldDescriptor* key = nullptr;             // the one of them that identifies the object, if any
  const TypeDescriptor* array = nullptr;            // the type of a list of them

  bool IsAbstract() const noexcept { return kind == TypeKind::DataObject && create == nullptr; }
  // Whether it is `other` or derives from it.
  bool IsA(const TypeDescriptor& other) const noexcept;
  // The field of that name, its bases' among them; or null.
  const FieldDescriptor* FindField(std::string_view wanted) const noexcept;
};

// A finished descriptor that lives for ever: takes over the fields of its base and makes the list type
// that belongs to it.
const TypeDescriptor& Complete(TypeDescriptor type, Ref<DataArrayBase> (*createArray)());

// Makes types known by name. For static objects beside generated types.
class TESSA_API TypeRegistration {
 public:
  TypeRegistration(std::initializer_list<const TypeDescriptor& (*)()> types);
};

// The data object, list ("XList") or abstract type of that name, or null. Simple types are not found
// here: they have a namespace of their own.
const TypeDescriptor* FindType(std::string_view name);
// The simple type of that XML Schema name: boolean, int, long, dateTime, string, base64Binary; or null.
const TypeDescriptor* FindSimpleType(std::string_view name);
// Every registered type, by name.
std::vector<const TypeDescriptor*> AllTypes();

}  // namespace Orbis
