#include "orbis/Engine.h"

#include "orbis/Scalar.h"
#include "orbis/TypeDescriptor.h"

namespace Orbis {
namespace {

bool IsEmptyList(const Any* value) {
  if (value == nullptr) {
    return true;
  }
  if (const auto* objects = dynamic_cast<const DataArrayBase*>(value)) {
    return objects->IsEmpty();
  }
  const auto* texts = dynamic_cast<const TextList*>(value);
  return texts != nullptr && texts->Items().empty();
}

Ref<Any> CloneObject(const DataObject& object) {
  const TypeDescriptor& type = object.GetType();
  const Ref<DataObject> copy = type.copy(object);
  for (const FieldDescriptor* field : type.fields) {
    if (!IsScalar(field->kind)) {
      if (const Any* held = field->get(object)) {
        field->assign(*copy, CloneAny(held));
      }
    }
  }
  return copy;
}

bool EqualField(const FieldDescriptor& field, const DataObject& left, const DataObject& right) {
  if (!IsScalar(field.kind)) {
    const Any* const leftValue = field.get(left);
    const Any* const rightValue = field.get(right);
    if (field.presence == Presence::List && IsEmptyList(leftValue) && IsEmptyList(rightValue)) {
      return true;
    }
    return Equal(leftValue, rightValue);
  }
  const void* const leftValue = field.read(left);
  const void* const rightValue = field.read(right);
  if (leftValue == nullptr || rightValue == nullptr) {
    return leftValue == rightValue;
  }
  return EqualScalar(field.kind, leftValue, rightValue);
}

bool EqualObject(const DataObject& left, const DataObject& right) {
  for (const FieldDescriptor* field : left.GetType().fields) {
    if (!EqualField(*field, left, right)) {
      return false;
    }
  }
  return true;
}

bool EqualArray(const DataArrayBase& left, const DataArrayBase& right) {
  if (left.Size() != right.Size()) {
    return false;
  }
  for (std::size_t i = 0; i < left.Size(); ++i) {
    if (!Equal(left.Items()[i].Get(), right.Items()[i].Get())) {
      return false;
    }
  }
  return true;
}

void PrintScalar(FieldKind kind, const void* value, std::string& out) {
  const bool quoted = kind == FieldKind::String || kind == FieldKind::DateTime;
  out += quoted ? "\"" : "";
  AppendScalar(kind, value, out);
  out += quoted ? "\"" : "";
}

void PrintObject(const DataObject& object, std::string& out) {
  const char* separator = "";
  out += "(" + object.GetType().name + ") {";
  for (const FieldDescriptor* field : object.GetType().fields) {
    const void* const scalar = IsScalar(field->kind) ? field->read(object) : nullptr;
    const Any* const held = IsScalar(field->kind) ? nullptr : field->get(object);
    if (scalar == nullptr && (held == nullptr || (field->presence == Presence::List && IsEmptyList(held)))) {
      continue;
    }
    out.append(separator).append(field->name).append(" = ");
    separator = ", ";
    if (scalar != nullptr) {
      PrintScalar(field->kind, scalar, out);
    } else {
      Print(held, out);
    }
  }
  out += "}";
}

}  // namespace

std::string Any::ToString() const {
  std::string text;
  Print(this, text);
  return text;
}

Ref<Any> CloneAny(const Any* value) {
  if (value == nullptr) {
    return nullptr;
  }
  const TypeDescriptor& type = value->GetType();
  switch (type.kind) {
    case TypeKind::DataObject:
      return CloneObject(static_cast<const DataObject&>(*value));
    case TypeKind::ObjectArray: {
      const Ref<DataArrayBase> copy = type.createArray();
      for (const Ref<Any>& element : static_cast<const DataArrayBase&>(*value).Items()) {
        copy->AppendAny(CloneAny(element.Get()));
      }
      return copy;
    }
    case TypeKind::StringArray:
      return new TextList(static_cast<const TextList&>(*value));
    case TypeKind::Simple:
      break;
  }
  return CloneBoxed(*value);
}

bool Equal(const Any* left, const Any* right) {
  if (left == right) {
    return true;
  }
  if (left == nullptr || right == nullptr || &left->GetType() != &right->GetType()) {
    return false;
  }
  switch (left->GetType().kind) {
    case TypeKind::DataObject:
      return EqualObject(static_cast<const DataObject&>(*left), static_cast<const DataObject&>(*right));
    case TypeKind::ObjectArray:
      return EqualArray(static_cast<const DataArrayBase&>(*left), static_cast<const DataArrayBase&>(*right));
    case TypeKind::StringArray:
      return static_cast<const TextList&>(*left).Items() == static_cast<const TextList&>(*right).Items();
    case TypeKind::Simple:
      break;
  }
  return EqualScalar(left->GetType().simple, BoxedValue(*left), BoxedValue(*right));
}

void Print(const Any* value, std::string& out) {
  if (value == nullptr) {
    out += "null";
    return;
  }
  const char* separator = "";
  switch (value->GetType().kind) {
    case TypeKind::DataObject:
      PrintObject(static_cast<const DataObject&>(*value), out);
      return;
    case TypeKind::ObjectArray:
      out += "[";
      for (const Ref<Any>& element : static_cast<const DataArrayBase&>(*value).Items()) {
        out += separator;
        separator = ", ";
        Print(element.Get(), out);
      }
      out += "]";
      return;
    case TypeKind::StringArray:
      out += "[";
      for (const std::string& text : static_cast<const TextList&>(*value).Items()) {
        out.append(separator).append("\"").append(text).append("\"");
        separator = ", ";
      }
      out += "]";
      return;
    case TypeKind::Simple:
      PrintScalar(value->GetType().simple, BoxedValue(*value), out);
      return;
  }
}

}  // namespace Orbis
