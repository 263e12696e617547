#include <limits>
#include <string>

#include "orbis/Json.h"
#include "orbis/ParseException.h"
#include "orbis/Scalar.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/json/JsonText.h"

namespace Orbis {
namespace {

using Json::Kind;
using Json::Value;

constexpr std::string_view typeKey = "@type";
constexpr std::string_view valueKey = "@value";
constexpr std::string_view simplePrefix = "xsd:";

// Where a value stands; only printed when something is refused.
struct Place {
  static constexpr std::size_t noIndex = static_cast<std::size_t>(-1);

  const Place* parent;
  std::string_view name;
  std::size_t index = noIndex;  // of the element of a list, which has no name

  std::string ToString() const {
    if (parent == nullptr) {
      return std::string(name);
    }
    const std::string path = parent->ToString();
    if (index != noIndex) {
      return path + "[" + std::to_string(index) + "]";
    }
    return path + (path.empty() ? "" : ".") + (name.empty() ? "''" : std::string(name));
  }
};

[[noreturn]] void Refuse(const Value& value, const Place& place, const std::string& reason) {
  const std::string path = place.ToString();
  throw ParseException(path.empty() ? "(root)" : path, value.line, reason);
}

void Require(Kind kind, const char* wanted, const Value& value, const Place& place) {
  if (value.kind != kind) {
    Refuse(value, place, std::string("wanted ") + wanted + ", found " + Json::Describe(value));
  }
}

class JsonReader {
 public:
  explicit JsonReader(const JsonRules& rules) : _rules(rules) {}

  // A value whose declared type is null (any) or a data object's or list's.
  Ref<Any> Read(const Value& value, const TypeDescriptor* declared, const Place& place) const {
    const bool list = declared != nullptr &&
                      (declared->kind == TypeKind::ObjectArray || declared->kind == TypeKind::StringArray);
    if (list) {
      return ReadList(value, *declared, place);
    }
    const bool named = _rules.named != nullptr && declared != nullptr && declared->key != nullptr;
    if (named && value.kind == Kind::String) {
      return _rules.named(*declared, value.text);
    }
    Require(Kind::Object, named ? "an object or its name" : "an object", value, place);
    const TypeDescriptor& type = TypeOf(value, declared, place);
    return type.kind == TypeKind::DataObject ? ReadObject(value, type, place)
                                             : ReadWrapped(value, type, place);
  }

 private:
  const TypeDescriptor& TypeOf(const Value& value, const TypeDescriptor* declared, const Place& place) const {
    const Value* const name = value.Find(typeKey);
    if (name != nullptr) {
      Require(Kind::String, "the name of a type", *name, Place{&place, typeKey});
    }
    const TypeDescriptor* const type = name == nullptr ? declared : Named(name->text);
    if (name != nullptr && type == nullptr) {
      Refuse(*name, Place{&place, typeKey}, "unknown type '" + name->text + "'");
    }
    if (type == nullptr) {
      Refuse(value, place, "a value of any type needs \"@type\"");
    }
    if (declared != nullptr && !type->IsA(*declared)) {
      Refuse(*name, Place{&place, typeKey}, "type " + type->name + " is not a " + declared->name);
    }
    if (type->IsAbstract()) {
      Refuse(value, place,
             "type " + type->name + " has no objects of its own; \"@type\" must name one of its kinds");
    }
    return *type;
  }

  static const TypeDescriptor* Named(std::string_view name) {
    return name.substr(0, simplePrefix.size()) == simplePrefix
               ? FindSimpleType(name.substr(simplePrefix.size()))
               : FindType(name);
  }

  Ref<Any> ReadObject(const Value& value, const TypeDescriptor& type, const Place& place) const {
    const Ref<Any> made = type.create();
    auto& object = static_cast<DataObject&>(*made);
    std::size_t used = value.Find(typeKey) != nullptr ? 1 : 0;
    for (const FieldDescriptor* field : type.fields) {
      const Value* const member = value.Find(field->name);
      if (member != nullptr) {
        ReadField(*member, *field, object, Place{&place, field->name});
        ++used;
      } else if (field->presence == Presence::Required && IsNeeded(*field)) {
        Refuse(value, place, "required field '" + std::string(field->name) + "' is missing");
      }
    }
    if (used != value.members.size()) {
      RefuseUnknown(value, type, place);
    }
    return made;
  }

  bool IsNeeded(const FieldDescriptor& required) const {
    return _rules.missing == Missing::Refused ||
           (_rules.missing == Missing::InRequest && required.kind == FieldKind::Object && !required.output);
  }

  [[noreturn]] static void RefuseUnknown(const Value& value, const TypeDescriptor& type, const Place& place) {
    for (const auto& [key, member] : value.members) {
      if (key != typeKey && type.FindField(key) == nullptr) {
        Refuse(member, Place{&place, key}, "unknown field; " + type.name + " has none of that name");
      }
    }
    Refuse(value, place, "unknown field");
  }

  // {"@type": .., "@value": ..}: a simple value, or a list where any value may stand.
  Ref<Any> ReadWrapped(const Value& value, const TypeDescriptor& type, const Place& place) const {
    const Value* const inner = value.Find(valueKey);
    if (inner == nullptr || value.members.size() != 2) {
      Refuse(value, place, "a value of type " + type.name + " has exactly \"@type\" and \"@value\"");
    }
    const Place innerPlace{&place, valueKey};
    if (type.kind != TypeKind::Simple) {
      return ReadList(*inner, type, innerPlace);
    }
    const Ref<Any> boxed = type.create();
    ReadScalar(*inner, type.simple, BoxedValue(*boxed), innerPlace);
    return boxed;
  }

  Ref<Any> ReadList(const Value& value, const TypeDescriptor& type, const Place& place) const {
    Require(Kind::Array, "an array", value, place);
    Place itemPlace{&place, {}, 0};
    if (type.kind == TypeKind::StringArray) {
      const Ref<TextList> texts = MakeRef<TextList>();
      for (const Value& item : value.items) {
        ReadScalar(item, FieldKind::String, &texts->Items().emplace_back(), itemPlace);
        ++itemPlace.index;
      }
      return texts;
    }
    const Ref<DataArrayBase> list = type.createArray();
    for (const Value& item : value.items) {
      list->AppendAny(Read(item, type.element, itemPlace));
      ++itemPlace.index;
    }
    return list;
  }

  void ReadField(const Value& value, const FieldDescriptor& field, DataObject& object,
                 const Place& place) const {
    switch (field.kind) {
      case FieldKind::Object: {
        const TypeDescriptor& declared = field.declaredType();
        field.assign(object,
                     Read(value, field.presence == Presence::List ? declared.array : &declared, place));
        return;
      }
      case FieldKind::Strings:
        field.assign(object, ReadList(value, TextList::StaticType(), place));
        return;
      case FieldKind::Any:
        field.assign(object, Read(value, nullptr, place));
        return;
      case FieldKind::Base64: {
        const Ref<Binary> bytes = MakeRef<Binary>();
        ReadScalar(value, FieldKind::Base64, &bytes->Value(), place);
        field.assign(object, bytes);
        return;
      }
      default:
        ReadScalar(value, field.kind, field.write(object), place);
    }
  }

  static void ReadScalar(const Value& value, FieldKind kind, void* target, const Place& place) {
    bool sound = false;
    switch (kind) {
      case FieldKind::Boolean:
        sound = value.kind == Kind::Boolean;
        *static_cast<bool*>(target) = value.boolean;
        break;
      case FieldKind::Int:
        sound = value.kind == Kind::Integer && value.integer >= std::numeric_limits<std::int32_t>::min() &&
                value.integer <= std::numeric_limits<std::int32_t>::max();
        *static_cast<std::int32_t*>(target) = sound ? static_cast<std::int32_t>(value.integer) : 0;
        break;
      case FieldKind::Long:
        sound = value.kind == Kind::Integer;
        *static_cast<std::int64_t*>(target) = value.integer;
        break;
      default:
        sound = value.kind == Kind::String && ParseScalar(kind, value.text, target);
    }
    if (!sound) {
      Refuse(value, place, "wanted " + std::string(DescribeKind(kind)) + ", found " + Json::Describe(value));
    }
  }

  const JsonRules& _rules;
};

}  // namespace

Ref<DataObject> ObjectOfKey(const TypeDescriptor& type, const std::string& key) {
  const Ref<DataObject> object(static_cast<DataObject*>(type.create().Get()));
  *static_cast<std::string*>(type.key->write(*object)) = key;
  return object;
}

Ref<Any> ReadJson(std::string_view text, const Limits& limits, const TypeDescriptor* declared,
                  const JsonRules& rules) {
  return ReadJson(Json::Parse(text, limits), declared, {}, rules);
}

Ref<Any> ReadJson(const Json::Value& value, const TypeDescriptor* declared, std::string_view path,
                  const JsonRules& rules) {
  return JsonReader(rules).Read(value, declared, Place{nullptr, path});
}

}  // namespace Orbis
