#include <string>
#include <utility>

#include "orbis/Json.h"
#include "orbis/Scalar.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/json/JsonText.h"
#include "tessa/Throwable.h"

namespace Orbis {
namespace {

class JsonWriter {
 public:
  explicit JsonWriter(std::string& out) : _out(out) {}

  void WriteFields(const DataObject& object) {
    _out += '{';
    _isFirst = true;
    for (const FieldDescriptor* field : object.GetType().fields) {
      WriteField(*field, object);
    }
    _out += '}';
  }

  // `any`: the value stands where any may stand, so a list must say its type.
  void Write(const Any& value, bool any) {
    const TypeDescriptor& type = value.GetType();
    switch (type.kind) {
      case TypeKind::DataObject:
        WriteObject(static_cast<const DataObject&>(value));
        return;
      case TypeKind::ObjectArray:
      case TypeKind::StringArray:
        if (any) {
          WriteHead(type.name);
          WriteList(value);
          _out += '}';
        } else {
          WriteList(value);
        }
        return;
      case TypeKind::Simple:
        WriteHead("xsd:" + type.name);
        WriteScalar(type.simple, BoxedValue(value));
        _out += '}';
        return;
    }
  }

 private:
  void WriteHead(const std::string& type) {
    _out.append("{\"@type\":\"").append(type).append("\",\"@value\":");
  }

  void WriteObject(const DataObject& object) {
    _out.append("{\"@type\":\"").append(object.GetType().name).append("\"");
    for (const FieldDescriptor* field : object.GetType().fields) {
      WriteField(*field, object);
    }
    _out += '}';
  }

  void WriteKey(std::string_view name) {
    _out.append(std::exchange(_isFirst, false) ? "\"" : ",\"").append(name).append("\":");
  }

  void WriteField(const FieldDescriptor& field, const DataObject& object) {
    if (IsScalar(field.kind)) {
      if (const void* value = field.read(object)) {
        WriteKey(field.name);
        WriteScalar(field.kind, value);
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
    if (field.presence == Presence::List && IsEmpty(*value)) {
      return;
    }
    WriteKey(field.name);
    if (field.kind == FieldKind::Base64) {
      WriteScalar(FieldKind::Base64, BoxedValue(*value));
    } else {
      Write(*value, field.kind == FieldKind::Any);
    }
  }

  static bool IsEmpty(const Any& list) {
    return list.GetType().kind == TypeKind::StringArray ? static_cast<const TextList&>(list).Items().empty()
                                                        : static_cast<const DataArrayBase&>(list).IsEmpty();
  }

  void WriteList(const Any& list) {
    const char* separator = "";
    _out += '[';
    if (list.GetType().kind == TypeKind::StringArray) {
      for (const std::string& text : static_cast<const TextList&>(list).Items()) {
        _out += separator;
        Json::AppendString(text, _out);
        separator = ",";
      }
    } else {
      for (const Ref<Any>& element : static_cast<const DataArrayBase&>(list).Items()) {
        if (!element) {
          Refuse(list.GetType(), "item");
        }
        _out += separator;
        Write(*element, false);
        separator = ",";
      }
    }
    _out += ']';
  }

  void WriteScalar(FieldKind kind, const void* value) {
    if (kind == FieldKind::String) {
      Json::AppendString(*static_cast<const std::string*>(value), _out);
      return;
    }
    const bool quoted = kind == FieldKind::DateTime || kind == FieldKind::Base64;
    _out += quoted ? "\"" : "";
    AppendScalar(kind, value, _out);
    _out += quoted ? "\"" : "";
  }

  [[noreturn]] static void Refuse(const TypeDescriptor& type, std::string_view field) {
    throw Tessa::NotInitializedException("cannot write null in " + type.name + "." + std::string(field));
  }

  std::string& _out;
  bool _isFirst = false;  // of an object that does not say its type
};

// What has been appended is taken back when it throws.
template <class Write>
void AppendOrLeave(std::string& out, Write write) {
  const std::size_t before = out.size();
  try {
    write();
  } catch (...) {
    out.resize(before);
    throw;
  }
}

}  // namespace

void WriteJson(const Any& value, std::string& out) {
  AppendOrLeave(out, [&] { JsonWriter(out).Write(value, false); });
}

void WriteJsonFields(const DataObject& object, std::string& out) {
  AppendOrLeave(out, [&] { JsonWriter(out).WriteFields(object); });
}

}  // namespace Orbis
