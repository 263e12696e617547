#include "tests/codec/Samples.h"

#include <iterator>
#include <limits>

#include "orbis/Scalar.h"

namespace Codec {
namespace {

using Orbis::Binary;
using Orbis::Bytes;
using Orbis::DataArrayBase;
using Orbis::DataObject;
using Orbis::DateTime;
using Orbis::FieldDescriptor;
using Orbis::FieldKind;
using Orbis::MakeRef;
using Orbis::Presence;
using Orbis::TextList;
using Orbis::TypeKind;

constexpr int deepest = 5;

// 0001-01-01T00:00:00Z to 9999-12-31T23:59:59.999999Z.
constexpr std::int64_t firstMicrosecond = -62'135'596'800'000'000;
constexpr std::int64_t lastMicrosecond = 253'402'300'799'999'999;

using namespace std::string_view_literals;

constexpr std::string_view cleanPieces[] = {"naa.5000"sv,
                                            "eui.02"sv,
                                            "a"sv,
                                            "Z"sv,
                                            "0"sv,
                                            " "sv,
                                            "  "sv,
                                            "\t"sv,
                                            "\n"sv,
                                            "\r"sv,
                                            "\r\n"sv,
                                            "<"sv,
                                            ">"sv,
                                            "&"sv,
                                            "\""sv,
                                            "'"sv,
                                            "]]>"sv,
                                            "&amp;"sv,
                                            "&#0;"sv,
                                            "<![CDATA["sv,
                                            "-->"sv,
                                            "<?"sv,
                                            "\\"sv,
                                            "\\u0000"sv,
                                            "%1"sv,
                                            "{"sv,
                                            "}"sv,
                                            "/"sv,
                                            "\x7f"sv,
                                            "\xc2\x85"sv,
                                            "\xc3\xa4"sv,
                                            "\xe2\x82\xac"sv,
                                            "\xe2\x80\xa8"sv,
                                            "\xee\x80\x80"sv,
                                            "\xef\xbf\xbd"sv,
                                            "\xef\xbb\xbf"sv,
                                            "\xed\x9f\xbf"sv,
                                            "\xf0\x9d\x84\x9e"sv,
                                            "\xf4\x8f\xbf\xbf"sv};

constexpr std::string_view dirtyPieces[] = {"\0"sv,
                                            "\x01"sv,
                                            "\x08"sv,
                                            "\x0b"sv,
                                            "\x1b[31m"sv,
                                            "\x1f"sv,
                                            "\x80"sv,
                                            "\xbf"sv,
                                            "\xc0\x80"sv,
                                            "\xc3"sv,
                                            "\xe2\x82"sv,
                                            "\xe0\x80\x80"sv,
                                            "\xed\xa0\x80"sv,
                                            "\xef\xbf\xbe"sv,
                                            "\xef\xbf\xbf"sv,
                                            "\xf0\x9d\x84"sv,
                                            "\xf0\x80"sv,
                                            "\xf4\x90\x80\x80"sv,
                                            "\xf8\x88\x80\x80\x80"sv,
                                            "\xfe"sv,
                                            "\xff"sv};

bool HasKinds(const TypeDescriptor& candidate, const TypeDescriptor& declared) {
  return !candidate.IsAbstract() && candidate.IsA(declared);
}

// The value that a sample has in a simple field.
void FillSampleScalar(const FieldDescriptor& field, void* value) {
  switch (field.kind) {
    case FieldKind::Boolean:
      *static_cast<bool*>(value) = true;
      return;
    case FieldKind::Int:
      *static_cast<std::int32_t*>(value) = 512;
      return;
    case FieldKind::Long:
      *static_cast<std::int64_t*>(value) = 7'814'037'168;
      return;
    case FieldKind::DateTime:
      *static_cast<DateTime*>(value) = DateTime{1};
      return;
    default:
      *static_cast<std::string*>(value) = field.name;
  }
}

// The first kind, by name, that has objects.
const TypeDescriptor& FirstKindOf(const TypeDescriptor& declared) {
  for (const TypeDescriptor* type : ConcreteTypes()) {
    if (HasKinds(*type, declared)) {
      return *type;
    }
  }
  return declared;
}

Ref<Any> MakeSampleValue(const FieldDescriptor& field) {
  switch (field.kind) {
    case FieldKind::Base64:
      return MakeRef<Binary>(Bytes{0, 1, 2, 0xff});
    case FieldKind::Strings:
      return MakeRef<TextList>(std::vector<std::string>{"first", "second"});
    case FieldKind::Any:
      return MakeRef<Orbis::Boxed<std::int32_t>>(3);
    default:
      break;
  }
  const TypeDescriptor& declared = field.declaredType();
  if (field.presence != Presence::List) {
    return FirstKindOf(declared).create();
  }
  const Ref<DataArrayBase> list = declared.array->createArray();
  for (int i = 0; i < 2; ++i) {
    const Ref<Any> element = FirstKindOf(declared).create();
    for (const FieldDescriptor* inner : element->GetType().fields) {
      if (inner->kind == FieldKind::Any) {
        inner->assign(static_cast<DataObject&>(*element), MakeSampleValue(*inner));
      }
    }
    list->AppendAny(element);
  }
  return list;
}

}  // namespace

std::vector<const TypeDescriptor*> ConcreteTypes() {
  std::vector<const TypeDescriptor*> types;
  for (const TypeDescriptor* type : Orbis::AllTypes()) {
    if (!type->IsAbstract()) {
      types.push_back(type);
    }
  }
  return types;
}

std::vector<std::string> TypeNames() {
  std::vector<std::string> names;
  for (const TypeDescriptor* type : Orbis::AllTypes()) {
    names.push_back(type->name);
  }
  return names;
}

Ref<Any> MakeSample(const TypeDescriptor& type) {
  if (type.IsAbstract()) {
    const Ref<DataArrayBase> list = type.array->createArray();
    for (const TypeDescriptor* kind : ConcreteTypes()) {
      if (HasKinds(*kind, type)) {
        list->AppendAny(kind->create());
      }
    }
    return list;
  }
  const Ref<Any> made = type.create();
  auto& object = static_cast<DataObject&>(*made);
  for (const FieldDescriptor* field : type.fields) {
    if (Orbis::IsScalar(field->kind)) {
      FillSampleScalar(*field, field->write(object));
    } else {
      field->assign(object, MakeSampleValue(*field));
    }
  }
  return made;
}

Ref<Any> RandomObjects::Make(const TypeDescriptor& type) {
  switch (type.kind) {
    case TypeKind::DataObject:
      return MakeKindOf(type);
    case TypeKind::ObjectArray:
      return MakeList(type);
    case TypeKind::StringArray:
      return MakeTextList();
    case TypeKind::Simple:
      break;
  }
  const Ref<Any> boxed = type.create();
  FillScalar(type.simple, Orbis::BoxedValue(*boxed));
  return boxed;
}

std::string RandomObjects::MakeText() {
  const std::size_t pieces = OneIn(500) ? 5'000 + Below(10'000) : Below(8);
  std::string text;
  for (std::size_t i = 0; i < pieces; ++i) {
    if (_texts == Texts::Dirty && OneIn(3)) {
      text += dirtyPieces[Below(std::size(dirtyPieces))];
    } else if (_texts == Texts::Dirty && OneIn(10)) {
      text += static_cast<char>(Below(256));
    } else {
      text += cleanPieces[Below(std::size(cleanPieces))];
    }
  }
  return text;
}

Ref<Any> RandomObjects::MakeKindOf(const TypeDescriptor& declared) {
  if (!declared.IsAbstract() && !OneIn(4)) {
    return MakeObject(declared);
  }
  std::vector<const TypeDescriptor*> kinds;
  for (const TypeDescriptor* type : ConcreteTypes()) {
    if (HasKinds(*type, declared)) {
      kinds.push_back(type);
    }
  }
  return MakeObject(*kinds[Below(kinds.size())]);
}

Ref<Any> RandomObjects::MakeObject(const TypeDescriptor& type) {
  ++_depth;
  const Ref<Any> made = type.create();
  for (const FieldDescriptor* field : type.fields) {
    // Deep down only what must be, so that objects end.
    const bool needed = field->presence == Presence::Required;
    if (needed || (_depth < deepest ? OneIn(2) : OneIn(12) && Orbis::IsScalar(field->kind))) {
      FillField(*field, static_cast<DataObject&>(*made));
    }
  }
  --_depth;
  return made;
}

void RandomObjects::FillField(const FieldDescriptor& field, DataObject& object) {
  switch (field.kind) {
    case FieldKind::Object: {
      const TypeDescriptor& declared = field.declaredType();
      field.assign(object, Make(field.presence == Presence::List ? *declared.array : declared));
      return;
    }
    case FieldKind::Strings:
      field.assign(object, MakeTextList());
      return;
    case FieldKind::Base64:
      field.assign(object, Make(Binary::StaticType()));
      return;
    case FieldKind::Any:
      field.assign(object, MakeAnyValue());
      return;
    default:
      FillScalar(field.kind, field.write(object));
  }
}

Ref<Any> RandomObjects::MakeList(const TypeDescriptor& type) {
  const Ref<DataArrayBase> list = type.createArray();
  for (std::size_t count = _depth < deepest ? Below(4) : 0; count > 0; --count) {
    list->AppendAny(MakeKindOf(*type.element));
  }
  return list;
}

Ref<Any> RandomObjects::MakeTextList() {
  const Ref<TextList> list = MakeRef<TextList>();
  for (std::size_t count = Below(4); count > 0; --count) {
    list->Items().push_back(MakeText());
  }
  return list;
}

Ref<Any> RandomObjects::MakeAnyValue() {
  constexpr const char* simple[] = {"boolean", "int", "long", "dateTime", "string", "base64Binary"};
  const std::vector<const TypeDescriptor*> types = ConcreteTypes();
  switch (_depth < deepest ? Below(4) : 0) {
    case 0:
      return Make(*Orbis::FindSimpleType(simple[Below(std::size(simple))]));
    case 1:
      return MakeTextList();
    case 2:
      return MakeObject(*types[Below(types.size())]);
    default:
      return MakeList(*types[Below(types.size())]->array);
  }
}

template <class T>
T RandomObjects::AnyNumber() {
  constexpr T edges[] = {0, 1, -1, std::numeric_limits<T>::min(), std::numeric_limits<T>::max()};
  return OneIn(2) ? edges[Below(std::size(edges))] : static_cast<T>(_random());
}

void RandomObjects::FillScalar(FieldKind kind, void* value) {
  switch (kind) {
    case FieldKind::Boolean:
      *static_cast<bool*>(value) = OneIn(2);
      return;
    case FieldKind::Int:
      *static_cast<std::int32_t*>(value) = AnyNumber<std::int32_t>();
      return;
    case FieldKind::Long:
      *static_cast<std::int64_t*>(value) = AnyNumber<std::int64_t>();
      return;
    case FieldKind::DateTime:
      static_cast<DateTime*>(value)->microseconds =
          std::uniform_int_distribution<std::int64_t>(firstMicrosecond, lastMicrosecond)(_random);
      return;
    case FieldKind::Base64: {
      Bytes& bytes = *static_cast<Bytes*>(value);
      bytes.resize(Below(20));
      for (std::uint8_t& byte : bytes) {
        byte = static_cast<std::uint8_t>(_random());
      }
      return;
    }
    default:
      *static_cast<std::string*>(value) = MakeText();
  }
}

}  // namespace Codec
