// Accessor functions of one member, for descriptors. Only generated sources include this.
#pragma once

#include <optional>
#include <type_traits>

#include "orbis/LazyArray.h"
#include "orbis/TypeDescriptor.h"
#include "tessa/Narrow.h"

namespace Orbis::Generated {

template <class Member>
struct MemberOf;
template <class C, class T>
struct MemberOf<T C::*> {
  using Class = C;
  using Type = T;
};

template <class T>
inline constexpr bool isOptional = false;
template <class T>
inline constexpr bool isOptional<std::optional<T>> = true;

// A field whose value stands in the object itself, in a T or a std::optional<T>.
template <auto member>
FieldDescriptor Scalar(std::string_view name, FieldKind kind, Presence presence) {
  using Class = typename MemberOf<decltype(member)>::Class;
  using Type = typename MemberOf<decltype(member)>::Type;
  FieldDescriptor field{.name = name, .kind = kind, .presence = presence, .declaredType = nullptr};
  field.read = [](const DataObject& object) -> const void* {
    const Type& value = static_cast<const Class&>(object).*member;
    if constexpr (isOptional<Type>) {
      return value ? &*value : nullptr;
    } else {
      return &value;
    }
  };
  field.write = [](DataObject& object) -> void* {
    Type& value = static_cast<Class&>(object).*member;
    if constexpr (isOptional<Type>) {
      return &value.emplace();
    } else {
      return &value;
    }
  };
  return field;
}

// A field that refers to an object, in a Ref<T> or a LazyArray<T>.
template <auto member>
FieldDescriptor Reference(std::string_view name, FieldKind kind, Presence presence,
                          const TypeDescriptor& (*declaredType)() = nullptr) {
  using Class = typename MemberOf<decltype(member)>::Class;
  FieldDescriptor field{.name = name, .kind = kind, .presence = presence, .declaredType = declaredType};
  field.get = [](const DataObject& object) -> const Any* {
    return (static_cast<const Class&>(object).*member).Get();
  };
  field.assign = [](DataObject& object, Ref<Any> value) {
    auto& reference = static_cast<Class&>(object).*member;
    reference = Tessa::NarrowToType<std::remove_pointer_t<decltype(reference.Get())>>(value);
  };
  return field;
}

// The same field, which requests may leave out.
inline FieldDescriptor Output(FieldDescriptor field) {
  field.output = true;
  return field;
}

// The same field, which identifies its object.
inline FieldDescriptor Key(FieldDescriptor field) {
  field.key = true;
  return field;
}

template <class T>
Ref<Any> Create() {
  return new T;
}
template <class T>
Ref<DataObject> Copy(const DataObject& object) {
  return new T(static_cast<const T&>(object));
}
template <class T>
Ref<DataArrayBase> CreateArray() {
  return new DataArray<T>;
}

}  // namespace Orbis::Generated
