#include "orbis/TypeDescriptor.h"

#include <functional>
#include <map>
#include <mutex>

#include "tessa/Throwable.h"

namespace Orbis {
namespace {

// What the name of a list adds to that of its elements.
constexpr std::string_view listSuffix = "List";

// Types register while libraries are loaded; afterwards the registry is only read, but a library may
// still be loaded then, so it is guarded. Never destroyed, like the descriptors.
struct Registry {
  std::mutex mutex;
  std::map<std::string, const TypeDescriptor*, std::less<>> types;
};
Registry& TheRegistry() {
  static Registry* const registry = new Registry;
  return *registry;
}

// What XML Schema calls each simple type.
template <class T>
struct SimpleName;
template <>
struct SimpleName<bool> {
  static constexpr const char* name = "boolean";
  static constexpr FieldKind kind = FieldKind::Boolean;
};
template <>
struct SimpleName<std::int32_t> {
  static constexpr const char* name = "int";
  static constexpr FieldKind kind = FieldKind::Int;
};
template <>
struct SimpleName<std::int64_t> {
  static constexpr const char* name = "long";
  static constexpr FieldKind kind = FieldKind::Long;
};
template <>
struct SimpleName<DateTime> {
  static constexpr const char* name = "dateTime";
  static constexpr FieldKind kind = FieldKind::DateTime;
};
template <>
struct SimpleName<std::string> {
  static constexpr const char* name = "string";
  static constexpr FieldKind kind = FieldKind::String;
};
template <>
struct SimpleName<Bytes> {
  static constexpr const char* name = "base64Binary";
  static constexpr FieldKind kind = FieldKind::Base64;
};

}  // namespace

Any::~Any() = default;
DataObject::~DataObject() = default;
DataArrayBase::~DataArrayBase() = default;

template <class T>
const TypeDescriptor& Boxed<T>::StaticType() {
  static const TypeDescriptor& type =
      *new TypeDescriptor{.name = SimpleName<T>::name,
                          .source = SimpleName<T>::name,
                          .kind = TypeKind::Simple,
                          .simple = SimpleName<T>::kind,
                          .create = []() -> Ref<Any> { return new Boxed<T>; }};
  return type;
}

template class Boxed<bool>;
template class Boxed<std::int32_t>;
template class Boxed<std::int64_t>;
template class Boxed<DateTime>;
template class Boxed<std::string>;
template class Boxed<Bytes>;

const TypeDescriptor& TextList::StaticType() {
  static const TypeDescriptor& type =
      *new TypeDescriptor{.name = "TextList",
                          .source = "Orbis::TextList",
                          .kind = TypeKind::StringArray,
                          .create = []() -> Ref<Any> { return new TextList; }};
  return type;
}

const TypeDescriptor& DataObject::StaticType() {
  static const TypeDescriptor& type =
      *new TypeDescriptor{.name = "DataObject", .source = "Orbis::DataObject"};
  return type;
}

void DataArrayBase::AppendAny(Ref<Any> element) {
  const TypeDescriptor& wanted = *GetType().element;
  if (element && !element->GetType().IsA(wanted)) {
    Tessa::TypeMismatchException::Throw(wanted.name, element->GetType().name);
  }
  _items.push_back(std::move(element));
}

bool TypeDescriptor::IsA(const TypeDescriptor& other) const noexcept {
  for (const TypeDescriptor* type = this; type != nullptr; type = type->base) {
    if (type == &other) {
      return true;
    }
  }
  return false;
}

const FieldDescriptor* TypeDescriptor::FindField(std::string_view wanted) const noexcept {
  for (const FieldDescriptor* field : fields) {
    if (field->name == wanted) {
      return field;
    }
  }
  return nullptr;
}

const TypeDescriptor& Complete(TypeDescriptor description, Ref<DataArrayBase> (*createArray)()) {
  auto* const type = new TypeDescriptor(std::move(description));
  type->fields = type->base->fields;
  type->key = type->base->key;
  for (const FieldDescriptor& field : type->ownFields) {
    type->fields.push_back(&field);
    type->key = field.key ? &field : type->key;
  }
  type->array = new TypeDescriptor{.name = type->name + std::string(listSuffix),
                                   .source = "Orbis::DataArray",
                                   .kind = TypeKind::ObjectArray,
                                   .element = type,
                                   .createArray = createArray,
                                   .since = type->since};
  return *type;
}

const TypeDescriptor& ArrayTypeOf(const TypeDescriptor& element) {
  return *element.array;
}

TypeRegistration::TypeRegistration(std::initializer_list<const TypeDescriptor& (*)()> types) {
  Registry& registry = TheRegistry();
  for (const auto& typeOf : types) {
    const TypeDescriptor& type = typeOf();
    const std::lock_guard guard(registry.mutex);
    registry.types.emplace(type.name, &type);
  }
}

const TypeDescriptor* FindType(std::string_view name) {
  if (name == TextList::StaticType().name) {
    return &TextList::StaticType();
  }
  const bool list = name.ends_with(listSuffix);
  Registry& registry = TheRegistry();
  const TypeDescriptor* type = nullptr;
  {
    const std::lock_guard guard(registry.mutex);
    const auto found = registry.types.find(list ? name.substr(0, name.size() - listSuffix.size()) : name);
    if (found != registry.types.end()) {
      type = found->second;
    }
  }
  return type != nullptr && list ? type->array : type;
}

const TypeDescriptor* FindSimpleType(std::string_view name) {
  for (const TypeDescriptor* type :
       {&Boxed<std::string>::StaticType(), &Boxed<bool>::StaticType(), &Boxed<std::int32_t>::StaticType(),
        &Boxed<std::int64_t>::StaticType(), &Boxed<DateTime>::StaticType(), &Binary::StaticType()}) {
    if (type->name == name) {
      return type;
    }
  }
  return nullptr;
}

std::vector<const TypeDescriptor*> AllTypes() {
  Registry& registry = TheRegistry();
  const std::lock_guard guard(registry.mutex);
  std::vector<const TypeDescriptor*> types;
  for (const auto& [name, type] : registry.types) {
    types.push_back(type);
  }
  return types;
}

}  // namespace Orbis
