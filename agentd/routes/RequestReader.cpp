#include "agentd/routes/RequestReader.h"

#include <algorithm>
#include <array>
#include <limits>

#include "host/Text.h"
#include "nox/Host.h"
#include "orbis/Json.h"
#include "orbis/ParseException.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/json/JsonText.h"

namespace Agentd {
namespace {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Orbis::Json::Kind;
using Orbis::Json::Value;
using Tessa::MakeRef;
using Tessa::Ref;

[[noreturn]] void Refuse(const Value& value, const std::string& path, const std::string& reason) {
  throw Orbis::ParseException(path, value.line, reason);
}

void Demand(Kind kind, const char* wanted, const Value& value, const std::string& path) {
  if (value.kind != kind) {
    Refuse(value, path, std::string("wanted ") + wanted + ", found " + Orbis::Json::Describe(value));
  }
}

// A key of the client's, in a place: '' for one without a letter.
std::string Named(std::string_view key) {
  return key.empty() ? "''" : Host::Printable(key);
}

std::string ReadText(const Value& value, const std::string& path) {
  Demand(Kind::String, "a text", value, path);
  return value.text;
}

std::int32_t ReadInt(const Value& value, const std::string& path) {
  Demand(Kind::Integer, "an integer", value, path);
  using Limits = std::numeric_limits<std::int32_t>;
  if (value.integer < Limits::min() || value.integer > Limits::max()) {
    Refuse(value, path, "does not fit in 32 bits");
  }
  return static_cast<std::int32_t>(value.integer);
}

// Calls `read` with each item and its path.
template <class Read>
void ReadList(const Value& value, const std::string& path, Read read) {
  Demand(Kind::Array, "a list", value, path);
  for (std::size_t i = 0; i < value.items.size(); ++i) {
    read(value.items[i], path + "[" + std::to_string(i) + "]");
  }
}

Ref<ScsiDisk> ReadDisk(const Value& value, const std::string& path) {
  if (value.kind == Kind::String) {
    auto named = MakeRef<ScsiDisk>();
    named->SetCanonicalName(value.text);
    return named;
  }
  Demand(Kind::Object, "a disk or its name", value, path);
  const auto object = Orbis::ReadJson(value, &ScsiDisk::StaticType(), path, Orbis::Missing::Default);
  return Ref<ScsiDisk>(static_cast<ScsiDisk*>(object.Get()));
}

Ref<Host::DiskList> ReadDisks(const Value& value, const std::string& path) {
  auto disks = MakeRef<Host::DiskList>();
  ReadList(value, path,
           [&disks](const Value& item, const std::string& place) { disks->Append(ReadDisk(item, place)); });
  return disks;
}

Ref<DiskMapping> ReadMapping(const Value& value, const std::string& path) {
  Demand(Kind::Object, "a disk group", value, path);
  auto mapping = MakeRef<DiskMapping>();
  if (value.Find("ssd") == nullptr) {
    Refuse(value, path + ".ssd", "is missing");
  }
  for (const auto& [key, member] : value.members) {
    const std::string place = path + "." + Named(key);
    if (key == "ssd") {
      mapping->SetSsd(ReadDisk(member, place));
    } else if (key == "nonSsd") {
      mapping->SetNonSsd(ReadDisks(member, place));
    } else if (key != "@type" || ReadText(member, place) != DiskMapping::StaticType().name) {
      Refuse(member, place, "a disk group has ssd and nonSsd");
    }
  }
  return mapping;
}

std::string ReadLabel(const Value& value, const std::string& path) {
  std::string label = ReadText(value, path);
  CheckLabel(label, value.line);
  return label;
}

// How the parameter of each name is read.
struct Reader {
  std::string_view name;
  void (*read)(const Value& value, const std::string& path, ReadRequest& request);
};

constexpr std::array<Reader, 11> readers = {{
    {"names",
     [](const Value& value, const std::string& path, ReadRequest& request) {
       ReadList(value, path, [&request](const Value& item, const std::string& place) {
         request.arguments.names.push_back(ReadText(item, place));
       });
     }},
    {"disks", [](const Value& value, const std::string& path,
                 ReadRequest& request) { request.arguments.disks = ReadDisks(value, path); }},
    {"mappings",
     [](const Value& value, const std::string& path, ReadRequest& request) {
       ReadList(value, path, [&request](const Value& item, const std::string& place) {
         request.arguments.mappings->Append(ReadMapping(item, place));
       });
     }},
    {"mapping", [](const Value& value, const std::string& path,
                   ReadRequest& request) { request.arguments.mapping = ReadMapping(value, path); }},
    {"disk", [](const Value& value, const std::string& path,
                ReadRequest& request) { request.arguments.disk = ReadText(value, path); }},
    {"passThrough",
     [](const Value& value, const std::string& path, ReadRequest& request) {
       request.arguments.removal.passThrough = ReadText(value, path);
     }},
    {"optionText",
     [](const Value& value, const std::string& path, ReadRequest& request) {
       request.arguments.removal.optionText = ReadText(value, path);
     }},
    {"optionFirst",
     [](const Value& value, const std::string& path, ReadRequest& request) {
       request.arguments.removal.optionFirst = ReadInt(value, path);
     }},
    {"optionSecond",
     [](const Value& value, const std::string& path, ReadRequest& request) {
       request.arguments.removal.optionSecond = ReadInt(value, path);
     }},
    {"label", [](const Value& value, const std::string& path,
                 ReadRequest& request) { request.label = ReadLabel(value, path); }},
    {"wait",
     [](const Value& value, const std::string& path, ReadRequest& request) {
       Demand(Kind::Boolean, "true or false", value, path);
       request.wait = value.boolean;
     }},
}};

// Every changing operation has these.
constexpr std::array<std::string_view, 2> taskParameters = {"label", "wait"};

bool Takes(const Operation& operation, std::string_view name) {
  const auto isOfThatName = [name](const Parameter& parameter) { return parameter.name == name; };
  return std::any_of(operation.parameters.begin(), operation.parameters.end(), isOfThatName) ||
         (operation.changes &&
          std::find(taskParameters.begin(), taskParameters.end(), name) != taskParameters.end());
}

std::string ParametersOf(const Operation& operation) {
  std::string names;
  for (const Reader& reader : readers) {
    if (Takes(operation, reader.name)) {
      names += (names.empty() ? "" : ", ") + std::string(reader.name);
    }
  }
  return names.empty() ? "no parameters" : names;
}

}  // namespace

void CheckLabel(const std::string& label, int line) {
  if (label.size() > longestLabel) {
    throw Orbis::ParseException("label", line,
                                "a label of more than " + std::to_string(longestLabel) + " bytes");
  }
  if (!Host::IsClean(label)) {
    throw Orbis::ParseException("label", line, "a label has no control characters");
  }
}

ReadRequest ReadJsonRequest(const Operation& operation, std::string_view body) {
  const Value root = Orbis::Json::Parse(body, Orbis::Limits::Untrusted());
  Demand(Kind::Object, "an object", root, "(root)");
  ReadRequest request;
  for (const auto& [key, value] : root.members) {
    if (!Takes(operation, key)) {
      Refuse(value, Named(key),
             "unknown parameter; " + std::string(operation.name) + " takes " + ParametersOf(operation));
    }
    const auto reader = std::find_if(readers.begin(), readers.end(),
                                     [&key = key](const Reader& one) { return one.name == key; });
    reader->read(value, key, request);
  }
  for (const Parameter& parameter : operation.parameters) {
    if (parameter.isRequired && root.Find(parameter.name) == nullptr) {
      Refuse(root, std::string(parameter.name), "is missing");
    }
  }
  return request;
}

}  // namespace Agentd
