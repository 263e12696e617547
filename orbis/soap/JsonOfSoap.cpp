#include <array>
#include <string>

#include "orbis/GrowingText.h"
#include "orbis/Limits.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/WrittenSoap.h"
#include "orbis/json/JsonText.h"
#include "orbis/soap/WrittenText.h"

namespace Orbis {
namespace {

using Soap::Unfamiliar;
using Soap::WrittenText;

constexpr std::string_view simplePrefix = "xsd:";

// By character: whether it is the same in a value of the text and in a string of JSON.
constexpr std::array<bool, 256> SameInBoth() {
  std::array<bool, 256> same{};
  for (std::size_t character = 0; character < same.size(); ++character) {
    same[character] = Json::IsPlain(static_cast<char>(character)) && character != '<' && character != '&';
  }
  return same;
}
constexpr std::array<bool, 256> sameInBoth = SameInBoth();

// Walks the text along the descriptors, and writes each value as soon as it is met.
class Transcriber {
 public:
  Transcriber(std::string_view text, GrowingText& out) : _text(text), _out(out) {}

  void WriteRoot() {
    WriteContent(TypeNamed(_text.OpenRoot()), false);
    _text.CloseRoot();
  }

 private:
  static const TypeDescriptor& TypeNamed(std::string_view name) {
    const bool isSimple = name.substr(0, simplePrefix.size()) == simplePrefix;
    const TypeDescriptor* const type =
        isSimple ? FindSimpleType(name.substr(simplePrefix.size())) : FindType(name);
    if (type == nullptr || type->IsAbstract()) {
      throw Unfamiliar();
    }
    return *type;
  }

  // The element of that name, which begins here. Its declared type may be null (any).
  void WriteElement(std::string_view name, const TypeDescriptor* declared) {
    const std::string_view typeName = _text.OpenKnown(name);
    if (typeName.empty() && (declared == nullptr || declared->IsAbstract())) {
      throw Unfamiliar();
    }
    const TypeDescriptor& type = typeName.empty() ? *declared : TypeNamed(typeName);
    if (declared != nullptr && !type.IsA(*declared)) {
      throw Unfamiliar();
    }
    WriteContent(type, declared == nullptr);
    _text.Close(name);
  }

  // `any`: the value stands where any may stand, so a list must say its type.
  void WriteContent(const TypeDescriptor& type, bool any) {
    if (++_depth > Limits::OwnOutput().depth) {
      throw Unfamiliar();
    }
    if (type.kind == TypeKind::DataObject) {
      WriteObject(type);
    } else if (type.kind == TypeKind::Simple) {
      WriteHead(simplePrefix, type.name);
      WriteValue(type.simple);
      _out.Append("}");
    } else {
      if (any) {
        WriteHead("", type.name);
      }
      WriteList("item", type.kind == TypeKind::StringArray ? nullptr : type.element);
      if (any) {
        _out.Append("}");
      }
    }
    --_depth;
  }

  void WriteHead(std::string_view prefix, std::string_view type) {
    _out.Append("{\"@type\":\"", prefix, type, "\",\"@value\":");
  }

  void WriteObject(const TypeDescriptor& type) {
    _out.Append("{\"@type\":\"", type.name, "\"");
    for (const FieldDescriptor* field : type.fields) {
      if (_text.IsAtElement(field->name)) {
        _out.Append(",\"", field->name, "\":");
        WriteField(*field);
      } else if (field->presence == Presence::Required) {
        throw Unfamiliar();
      }
    }
    _out.Append("}");
  }

  void WriteField(const FieldDescriptor& field) {
    if (field.presence == Presence::List) {
      WriteList(field.name, field.kind == FieldKind::Strings ? nullptr : &field.declaredType());
    } else if (IsScalar(field.kind) || field.kind == FieldKind::Base64) {
      WriteSimpleElement(field.name, field.kind);
    } else {
      WriteElement(field.name, field.kind == FieldKind::Any ? nullptr : &field.declaredType());
    }
  }

  // The elements of that name that follow one another. No element type: they are texts.
  void WriteList(std::string_view name, const TypeDescriptor* element) {
    _out.Append("[");
    for (std::string_view separator; _text.IsAtElement(name); separator = ",") {
      _out.Append(separator);
      if (element == nullptr) {
        WriteSimpleElement(name, FieldKind::String);
      } else {
        WriteElement(name, element);
      }
    }
    _out.Append("]");
  }

  void WriteSimpleElement(std::string_view name, FieldKind kind) {
    if (!_text.OpenKnown(name).empty()) {
      throw Unfamiliar();
    }
    WriteValue(kind);
    _text.Close(name);
  }

  void WriteValue(FieldKind kind) {
    if (kind == FieldKind::String) {
      WriteText();
    } else if (kind == FieldKind::DateTime || kind == FieldKind::Base64) {
      _out.Append("\"", _text.TakeValue(), "\"");
    } else {
      _out.Append(_text.TakeValue());
    }
  }

  void WriteText() {
    const std::string_view same =
        _text.TakeWhile([](char character) { return sameInBoth[static_cast<unsigned char>(character)]; });
    if (_text.IsAtTag()) {  // as nearly all texts end there
      _out.Append("\"", same, "\"");
      return;
    }
    _unescaped = same;
    Soap::AppendUnescaped(_text.TakeValue(), _unescaped);
    _quoted.clear();
    Json::AppendString(_unescaped, _quoted);
    _out.Append(_quoted);
  }

  WrittenText _text;
  GrowingText& _out;
  std::string _unescaped;
  std::string _quoted;
  std::size_t _depth = 0;
};

}  // namespace

bool AppendJsonOfSoap(std::string_view text, std::string& out) {
  const std::size_t before = out.size();
  try {
    GrowingText json(out, text.size());  // JSON is the shorter of the two
    Transcriber(text, json).WriteRoot();
    return true;
  } catch (const Unfamiliar&) {
    out.resize(before);
    return false;
  }
}

}  // namespace Orbis
