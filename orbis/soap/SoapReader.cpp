#include <algorithm>
#include <string>
#include <vector>

#include "orbis/Namespaces.h"
#include "orbis/ParseException.h"
#include "orbis/Scalar.h"
#include "orbis/Soap.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/Version.h"
#include "orbis/soap/ElementCodec.h"
#include "orbis/xml/XmlReader.h"
#include "tessa/text/Escape.h"

namespace Orbis {
namespace {

using Xml::Element;

[[noreturn]] void Refuse(const Element& element, const std::string& reason) {
  throw ParseException(Xml::PathOf(element), element.line, reason);
}

std::string Quoted(std::string_view text) {
  return "'" + std::string(text) + "'";
}

enum class Reading {
  Exact,     // of what we wrote: in our order, complete
  Generous,  // of requests, which clients of other makes write: see ReadRequestElement
};

class SoapReader {
 public:
  explicit SoapReader(Reading reading, const Version* version = nullptr, const TypeFilter* filter = nullptr)
      : _reading(reading), _version(version), _filter(filter) {}

  // A value whose declared type is null (any) or a data object's or list's.
  Ref<Any> ReadValue(const Element& element, const TypeDescriptor* declared) const {
    const TypeDescriptor& type = TypeOf(element, declared);
    switch (type.kind) {
      case TypeKind::DataObject:
        return ReadObject(element, type);
      case TypeKind::ObjectArray:
        return ReadList(element, type);
      case TypeKind::StringArray:
        return ReadTextList(element);
      case TypeKind::Simple:
        break;
    }
    const Ref<Any> boxed = type.create();
    ReadScalar(element, type.simple, BoxedValue(*boxed));
    return boxed;
  }

  // An element that is nil holds no fields.
  Ref<Any> ReadRoot(const Element& element, const TypeDescriptor& declared) const {
    return element.nil ? ReadObject(element, declared) : ReadValue(element, &declared);
  }

 private:
  bool Has(int since) const { return _version == nullptr || _version->Has(since); }

  // The concrete type of a value: what xsi:type says, else the declared one.
  const TypeDescriptor& TypeOf(const Element& element, const TypeDescriptor* declared) const {
    CheckNotNil(element);
    const TypeDescriptor* const type = element.type.name.empty() ? declared : NamedType(element);
    if (type == nullptr) {
      Refuse(element, "a value of any type needs xsi:type");
    }
    if (declared != nullptr && !type->IsA(*declared)) {
      Refuse(element, "type " + type->name + " is not a " + declared->name);
    }
    if (type->IsAbstract()) {
      Refuse(element,
             "type " + type->name + " has no objects of its own; xsi:type must name one of its kinds");
    }
    if (_filter != nullptr && !(*_filter)(*type)) {
      Refuse(element, "type " + type->name + " is not allowed here");
    }
    return *type;
  }

  const TypeDescriptor* NamedType(const Element& element) const {
    const TypeDescriptor* type = nullptr;
    if (element.type.nameSpace == apiNamespace) {
      type = FindType(element.type.name);
    } else if (element.type.nameSpace == schemaNamespace) {
      type = FindSimpleType(element.type.name);
    }
    if (type == nullptr || !Has(type->since)) {
      Refuse(element,
             "unknown type " + Quoted(element.type.name) + " in namespace " + Quoted(element.type.nameSpace));
    }
    return type;
  }

  Ref<Any> ReadObject(const Element& element, const TypeDescriptor& type) const {
    CheckNoText(element);
    const Ref<Any> value = type.create();
    auto& object = static_cast<DataObject&>(*value);
    if (_reading == Reading::Generous) {
      ReadInAnyOrder(element, type, object);
      return value;
    }
    const Element* child = element.firstChild;
    for (const FieldDescriptor* field : type.fields) {
      if (Has(field->since)) {
        child = ReadField(element, child, *field, object);
      }
    }
    if (child != nullptr) {
      RefuseExtra(*child, type);
    }
    return value;
  }

  void ReadInAnyOrder(const Element& element, const TypeDescriptor& type, DataObject& object) const {
    std::vector<bool> found(type.fields.size());
    std::vector<Ref<Any>> lists(type.fields.size());
    for (const Element* child = element.firstChild; child != nullptr; child = child->nextSibling) {
      const std::size_t index = IndexOfField(*child, type);
      const FieldDescriptor& field = *type.fields[index];
      if (child->nil && MayBeLeftOut(field)) {
        continue;
      }
      if (field.presence == Presence::List) {
        ReadItem(*child, field, object, lists[index]);
      } else if (found[index]) {
        Refuse(*child, "element " + Quoted(child->name) + " is repeated");
      } else {
        ReadSingle(*child, field, object);
      }
      found[index] = true;
    }
    for (std::size_t i = 0; i < found.size(); ++i) {
      if (!found[i] && !MayBeLeftOut(*type.fields[i])) {
        Refuse(element, "required element " + Quoted(type.fields[i]->name) + " is missing");
      }
    }
  }

  static bool MayBeLeftOut(const FieldDescriptor& field) {
    return field.presence != Presence::Required || field.output;
  }

  static std::size_t IndexOfField(const Element& child, const TypeDescriptor& type) {
    const auto isIt = [&child](const FieldDescriptor* field) { return IsNamed(&child, field->name); };
    const auto field = std::find_if(type.fields.begin(), type.fields.end(), isIt);
    if (field == type.fields.end()) {
      RefuseUnknown(child, type);
    }
    return static_cast<std::size_t>(field - type.fields.begin());
  }

  // One more element of a list, which is made with the first.
  void ReadItem(const Element& child, const FieldDescriptor& field, DataObject& object,
                Ref<Any>& list) const {
    const bool ofTexts = field.kind == FieldKind::Strings;
    if (!list) {
      list = ofTexts ? Ref<Any>(MakeRef<TextList>()) : Ref<Any>(field.declaredType().array->createArray());
      field.assign(object, list);
    }
    if (ofTexts) {
      ReadText(child, static_cast<TextList&>(*list));
    } else {
      static_cast<DataArrayBase&>(*list).AppendAny(ReadValue(child, &field.declaredType()));
    }
  }

  static bool IsNamed(const Element* element, std::string_view name) {
    return element != nullptr && element->name == name && element->nameSpace == apiNamespace;
  }

  static std::string Described(const Element* element) {
    if (element == nullptr) {
      return "the end";
    }
    const bool ours = element->nameSpace == apiNamespace;
    return Quoted(element->name) + (ours ? "" : " in namespace " + Quoted(element->nameSpace));
  }

  // Takes the children that belong to the field and returns the first that does not.
  const Element* ReadField(const Element& parent, const Element* child, const FieldDescriptor& field,
                           DataObject& object) const {
    if (!IsNamed(child, field.name)) {
      if (field.presence == Presence::Required) {
        Refuse(child == nullptr ? parent : *child,
               "required element " + Quoted(field.name) + " is missing, found " + Described(child));
      }
      return child;
    }
    if (field.presence == Presence::List) {
      return ReadListField(child, field, object);
    }
    ReadSingle(*child, field, object);
    return child->nextSibling;
  }

  // The value of a field that is no list.
  void ReadSingle(const Element& child, const FieldDescriptor& field, DataObject& object) const {
    if (IsScalar(field.kind)) {
      CheckDeclaredSimple(child, field.kind);
      ReadScalar(child, field.kind, field.write(object));
    } else if (field.kind == FieldKind::Base64) {
      CheckDeclaredSimple(child, field.kind);
      const Ref<Binary> bytes = MakeRef<Binary>();
      ReadScalar(child, FieldKind::Base64, &bytes->Value());
      field.assign(object, bytes);
    } else {
      field.assign(object, ReadValue(child, field.kind == FieldKind::Any ? nullptr : &field.declaredType()));
    }
  }

  const Element* ReadListField(const Element* child, const FieldDescriptor& field, DataObject& object) const {
    if (field.kind == FieldKind::Strings) {
      const Ref<TextList> texts = MakeRef<TextList>();
      for (; IsNamed(child, field.name); child = child->nextSibling) {
        ReadText(*child, *texts);
      }
      field.assign(object, texts);
      return child;
    }
    const TypeDescriptor& declared = field.declaredType();
    const Ref<DataArrayBase> list = declared.array->createArray();
    for (; IsNamed(child, field.name); child = child->nextSibling) {
      list->AppendAny(ReadValue(*child, &declared));
    }
    field.assign(object, list);
    return child;
  }

  Ref<Any> ReadList(const Element& element, const TypeDescriptor& type) const {
    CheckNoText(element);
    const Ref<DataArrayBase> list = type.createArray();
    for (const Element* item = element.firstChild; item != nullptr; item = item->nextSibling) {
      CheckItem(*item);
      list->AppendAny(ReadValue(*item, type.element));
    }
    return list;
  }

  Ref<Any> ReadTextList(const Element& element) const {
    CheckNoText(element);
    const Ref<TextList> list = MakeRef<TextList>();
    for (const Element* item = element.firstChild; item != nullptr; item = item->nextSibling) {
      CheckItem(*item);
      ReadText(*item, *list);
    }
    return list;
  }

  void ReadText(const Element& element, TextList& list) const {
    CheckDeclaredSimple(element, FieldKind::String);
    ReadScalar(element, FieldKind::String, &list.Items().emplace_back());
  }

  static void ReadScalar(const Element& element, FieldKind kind, void* value) {
    if (element.firstChild != nullptr) {
      Refuse(*element.firstChild, "unexpected element inside a simple value");
    }
    if (!ParseScalar(kind, element.text, value)) {
      Refuse(element, Quoted(Tessa::Excerpt(element.text)) + " is not " + std::string(DescribeKind(kind)));
    }
  }

  // A simple field may repeat its own type, and name no other.
  void CheckDeclaredSimple(const Element& element, FieldKind kind) const {
    CheckNotNil(element);
    if (!element.type.name.empty()) {
      const TypeDescriptor* const type = NamedType(element);
      if (type->kind != TypeKind::Simple || type->simple != kind) {
        Refuse(element, "type " + type->name + " does not fit: wanted " + std::string(DescribeKind(kind)));
      }
    }
  }

  static void CheckNotNil(const Element& element) {
    if (element.nil) {
      Refuse(element, "xsi:nil is not allowed; leave the element out");
    }
  }

  static void CheckNoText(const Element& element) {
    if (element.text.find_first_not_of(" \t\r\n") != std::string_view::npos) {
      Refuse(element, "unexpected text " + Quoted(Tessa::Excerpt(element.text)));
    }
  }

  static void CheckItem(const Element& element) {
    if (!IsNamed(&element, "item")) {
      Refuse(element, "unexpected element " + Quoted(element.name) +
                          " in a list; wanted 'item' in namespace " + Quoted(apiNamespace));
    }
  }

  [[noreturn]] void RefuseExtra(const Element& element, const TypeDescriptor& type) const {
    for (const FieldDescriptor* field : type.fields) {
      if (IsNamed(&element, field->name) && Has(field->since)) {
        Refuse(element, "element " + Quoted(element.name) + " is repeated or out of order");
      }
    }
    RefuseUnknown(element, type);
  }

  [[noreturn]] static void RefuseUnknown(const Element& element, const TypeDescriptor& type) {
    Refuse(element, "unknown element " + Quoted(element.name) + " in namespace " + Quoted(element.nameSpace) +
                        "; " + type.name + " has no such field");
  }

  const Reading _reading;
  const Version* _version;
  const TypeFilter* _filter;
};

Ref<Any> ReadDocument(std::string_view text, const Limits& limits, const Version* version,
                      const TypeDescriptor* type, const TypeFilter* filter) {
  const Xml::Document document(text, limits);
  const Element& root = document.Root();
  if (root.name != "object" || root.nameSpace != apiNamespace) {
    Refuse(root, "the root element must be 'object' in namespace " + Quoted(apiNamespace));
  }
  if (root.type.name.empty()) {
    Refuse(root, "the root element needs xsi:type");
  }
  return SoapReader(Reading::Exact, version, filter).ReadValue(root, type);
}

}  // namespace

Ref<Any> Soap::ReadRequestElement(const Element& element, const TypeDescriptor& declared) {
  return SoapReader(Reading::Generous).ReadRoot(element, declared);
}

void DeserializeSoapToObject(std::string_view text, Ref<Any>& value, const Version* version,
                             const TypeDescriptor* type, const TypeFilter* filter) {
  value = ReadDocument(text, Limits::OwnOutput(), version, type, filter);
}

Ref<Any> ReadSoap(std::string_view text, const Limits& limits, const TypeDescriptor* type) {
  return ReadDocument(text, limits, nullptr, type, nullptr);
}

}  // namespace Orbis
