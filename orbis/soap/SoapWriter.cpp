#include <string>

#include "orbis/Namespaces.h"
#include "orbis/Scalar.h"
#include "orbis/Soap.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/Version.h"
#include "orbis/soap/ElementCodec.h"
#include "orbis/xml/XmlWriter.h"
#include "tessa/Throwable.h"

namespace Orbis {
namespace {

constexpr std::string_view declaration = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n";

class SoapWriter {
 public:
  SoapWriter(const Version* version, std::string& out) : _version(version), _out(out) {}

  void WriteRoot(const Any& value) {
    _out.append(declaration).append("<object xmlns=\"").append(apiNamespace);
    _out.append("\" xmlns:xsd=\"").append(schemaNamespace);
    _out.append("\" xmlns:xsi=\"").append(instanceNamespace).append("\"");
    WriteTypedBody("object", value, nullptr);
  }

  void WriteInNamespace(std::string_view name, const Any& value, const TypeDescriptor* declared) {
    _out.append("<").append(name).append(" xmlns=\"").append(apiNamespace).append("\"");
    WriteTypedBody(name, value, declared);
  }

 private:
  bool Has(int since) const { return _version == nullptr || _version->Has(since); }

  // The type that a reader of this version knows the value by. A list is as new as its elements.
  const TypeDescriptor& KnownType(const TypeDescriptor& type) const {
    if (type.kind == TypeKind::ObjectArray && !Has(type.since)) {
      const TypeDescriptor* const list = KnownType(*type.element).array;
      return list != nullptr ? *list : type;
    }
    const TypeDescriptor* known = &type;
    while (!Has(known->since) && known->base != nullptr) {
      known = known->base;
    }
    return *known;
  }

  // Behind "<name" and its namespaces: the type unless it is the declared one, the content, the end tag.
  void WriteTypedBody(std::string_view name, const Any& value, const TypeDescriptor* declared) {
    const TypeDescriptor& type = KnownType(value.GetType());
    if (&type != declared) {
      _out.append(" xsi:type=\"").append(type.kind == TypeKind::Simple ? "xsd:" : "").append(type.name);
      _out.push_back('"');
    }
    _out.push_back('>');
    WriteContent(value, type);
    End(name);
  }

  void WriteContent(const Any& value, const TypeDescriptor& type) {
    switch (type.kind) {
      case TypeKind::DataObject:
        for (const FieldDescriptor* field : type.fields) {
          if (Has(field->since)) {
            WriteField(*field, static_cast<const DataObject&>(value));
          }
        }
        return;
      case TypeKind::ObjectArray:
        WriteElements("item", static_cast<const DataArrayBase&>(value), *type.element);
        return;
      case TypeKind::StringArray:
        WriteTexts("item", static_cast<const TextList&>(value));
        return;
      case TypeKind::Simple:
        WriteScalarText(type.simple, BoxedValue(value));
        return;
    }
  }

  void WriteField(const FieldDescriptor& field, const DataObject& object) {
    if (IsScalar(field.kind)) {
      if (const void* value = field.read(object)) {
        WriteScalar(field.name, field.kind, value);
      }
      return;
    }
    const Any* const value = field.get(object);
    if (value == nullptr) {
      if (field.presence == Presence::Required) {
        Refuse(object.GetType(), field.name);
      }
      return;
    }
    if (field.kind == FieldKind::Strings) {
      WriteTexts(field.name, static_cast<const TextList&>(*value));
    } else if (field.kind == FieldKind::Base64) {
      WriteScalar(field.name, FieldKind::Base64, BoxedValue(*value));
    } else if (field.presence == Presence::List) {
      WriteElements(field.name, static_cast<const DataArrayBase&>(*value), field.declaredType());
    } else {
      WriteElement(field.name, *value, field.kind == FieldKind::Any ? nullptr : &field.declaredType());
    }
  }

  void WriteElement(std::string_view name, const Any& value, const TypeDescriptor* declared) {
    _out.append("<").append(name);
    WriteTypedBody(name, value, declared);
  }

  void WriteElements(std::string_view name, const DataArrayBase& list, const TypeDescriptor& declared) {
    for (const Ref<Any>& element : list.Items()) {
      if (!element) {
        Refuse(list.GetType(), name);
      }
      WriteElement(name, *element, &declared);
    }
  }

  void WriteTexts(std::string_view name, const TextList& list) {
    for (const std::string& text : list.Items()) {
      WriteScalar(name, FieldKind::String, &text);
    }
  }

  void WriteScalar(std::string_view name, FieldKind kind, const void* value) {
    _out.append("<").append(name).append(">");
    WriteScalarText(kind, value);
    End(name);
  }

  void WriteScalarText(FieldKind kind, const void* value) {
    if (kind == FieldKind::String) {
      Xml::AppendText(_out, *static_cast<const std::string*>(value));
    } else {
      AppendScalar(kind, value, _out);
    }
  }

  void End(std::string_view name) { _out.append("</").append(name).append(">"); }

  [[noreturn]] static void Refuse(const TypeDescriptor& type, std::string_view field) {
    throw Tessa::NotInitializedException("cannot write null in " + type.name + "." + std::string(field));
  }

  const Version* _version;
  std::string& _out;
};

}  // namespace

void Soap::AppendElement(std::string_view name, const Any& value, const TypeDescriptor* declared,
                         std::string& out) {
  SoapWriter(nullptr, out).WriteInNamespace(name, value, declared);
}

void SerializeObjectToSoap(const Any& value, const Version* version, std::string& out) {
  const std::size_t before = out.size();
  try {
    SoapWriter(version, out).WriteRoot(value);
  } catch (...) {
    out.resize(before);
    throw;
  }
}

}  // namespace Orbis
