#include "kovactl/replay/ReplayRequest.h"

#include <algorithm>
#include <functional>
#include <limits>

#include "nox/OperationTable.h"
#include "orbis/Json.h"
#include "orbis/ParseException.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/json/JsonText.h"

namespace Kovactl {
namespace {

using Orbis::FieldDescriptor;
using Orbis::FieldKind;
using Orbis::Json::Kind;
using Orbis::Json::Value;

constexpr std::string_view raw = "raw";
constexpr std::string_view host = "host";
constexpr std::string_view tagKey = "requestTag";

[[noreturn]] void Refuse(const Value& value, const std::string& path, const std::string& reason) {
  throw Orbis::ParseException(path, value.line, reason);
}

void Require(Kind kind, const char* wanted, const Value& value, const std::string& path) {
  if (value.kind != kind) {
    Refuse(value, path, std::string("wanted ") + wanted + ", found " + Orbis::Json::Describe(value));
  }
}

const std::string& TextOf(const Value& value, const std::string& path) {
  Require(Kind::String, "a text", value, path);
  return value.text;
}

std::vector<std::string> TextsOf(const Value& value, const std::string& path) {
  Require(Kind::Array, "an array", value, path);
  std::vector<std::string> texts;
  for (const Value& item : value.items) {
    texts.push_back(TextOf(item, path + "[" + std::to_string(texts.size()) + "]"));
  }
  return texts;
}

std::int32_t IntOf(const Value& value, const std::string& path) {
  Require(Kind::Integer, "an integer", value, path);
  if (value.integer < std::numeric_limits<std::int32_t>::min() ||
      value.integer > std::numeric_limits<std::int32_t>::max()) {
    Refuse(value, path, "does not fit in 32 bits");
  }
  return static_cast<std::int32_t>(value.integer);
}

// What hooks are given beside objects, by the names of parameters.
template <class Type>
struct Member {
  std::string_view name;
  Type HookArguments::*member;
};

constexpr Member<std::string> textMembers[] = {{"disk", &HookArguments::disk},
                                               {tagKey, &HookArguments::requestTag},
                                               {"passThrough", &HookArguments::passThrough},
                                               {"optionText", &HookArguments::optionText}};
constexpr Member<std::int32_t> intMembers[] = {{"optionFirst", &HookArguments::optionFirst},
                                               {"optionSecond", &HookArguments::optionSecond}};
constexpr Member<std::vector<std::string>> listMembers[] = {{"names", &HookArguments::names},
                                                            {"texts", &HookArguments::texts}};

// Whether the hook is given something of that name.
bool ReadArgument(const std::string& key, const Value& value, HookArguments& arguments) {
  const auto read = [&](const auto& members, const auto& reader) {
    for (const auto& one : members) {
      if (one.name == key) {
        arguments.*one.member = reader(value, key);
        return true;
      }
    }
    return false;
  };
  return read(textMembers, TextOf) || read(intMembers, IntOf) || read(listMembers, TextsOf);
}

// A parameter that the log may give: label and wait are the agent's.
bool Takes(const Nox::OperationDescriptor& operation, std::string_view key) {
  return key != "label" && key != "wait" && operation.request.FindField(key) != nullptr;
}

Tessa::Ref<Orbis::DataObject> MakeNamed(const Orbis::TypeDescriptor&, const std::string& name) {
  return Tessa::MakeRef<NamedDisk>(name);
}

// The objects among the parameters. One that the log does not give is null, and missing fields of objects
// have defaults.
Tessa::Ref<Orbis::DataObject> ReadParameters(const Nox::OperationDescriptor& operation, const Value& root) {
  Value parameters = root;
  std::erase_if(parameters.members, [&](const auto& member) { return !Takes(operation, member.key); });
  const Orbis::JsonRules rules{.missing = Orbis::Missing::Default, .named = &MakeNamed};
  const auto read = Orbis::ReadJson(parameters, &operation.request, {}, rules);
  auto& request = static_cast<Orbis::DataObject&>(*read);
  for (const FieldDescriptor* field : operation.request.fields) {
    if (field->kind == FieldKind::Object && root.Find(field->name) == nullptr) {
      field->assign(request, nullptr);
    }
  }
  return Tessa::Ref<Orbis::DataObject>(&request);
}

const HookCall* FindCall(std::string_view HookCall::*name, std::string_view wanted) {
  const auto calls = HookCalls();
  const auto found =
      std::find_if(calls.begin(), calls.end(), [&](const HookCall& call) { return call.*name == wanted; });
  return found == calls.end() ? nullptr : &*found;
}

void CheckKeys(const Value& root, const std::string& operation,
               const std::function<bool(const std::string&)>& takes) {
  for (const auto& [key, value] : root.members) {
    if (key != "operation" && !takes(key)) {
      Refuse(value, key, "unknown key; " + operation + " has none of that name");
    }
  }
}

void ParseOperation(const Value& root, ReplayRequest& request) {
  const Nox::OperationDescriptor& operation = *Nox::FindOperation(request.operation);
  CheckKeys(root, request.operation, [&](const std::string& key) {
    return Takes(operation, key) || (request.hook->takesTag && key == tagKey);
  });
  request.parameters = ReadParameters(operation, root);
  for (const auto& [key, value] : root.members) {
    ReadArgument(key, value, request.arguments);
  }
}

void ParseRaw(const Value& root, ReplayRequest& request) {
  CheckKeys(root, request.operation, [&](const std::string& key) {
    return key == "hook" || ReadArgument(key, *root.Find(key), request.arguments);
  });
  const Value* const hook = root.Find("hook");
  if (hook == nullptr) {
    Refuse(root, "hook", "is missing");
  }
  request.hook = FindCall(&HookCall::hook, TextOf(*hook, "hook"));
  if (request.hook == nullptr) {
    Refuse(*hook, "hook", "unknown hook '" + hook->text + "'");
  }
}

void ParseHost(const Value& root, std::string_view line, ReplayRequest& request) {
  const auto read = [&](const std::string& key, nlohmann::json& part) {
    if (const Value* const value = root.Find(key)) {
      Require(Kind::Object, "an object", *value, key);
      part = nlohmann::json::parse(line)[key];  // sound and free of double keys: it was read before
    }
  };
  CheckKeys(root, request.operation, [](const std::string& key) { return key == "set" || key == "disk"; });
  read("set", request.hostSet);
  read("disk", request.hostDisk);
}

}  // namespace

ReplayRequest ParseReplayRequest(std::string_view line) {
  const Value root = Orbis::Json::Parse(line, Orbis::Limits::OwnOutput());
  Require(Kind::Object, "an object", root, "(root)");
  const Value* const operation = root.Find("operation");
  if (operation == nullptr) {
    Refuse(root, "operation", "is missing");
  }
  ReplayRequest request;
  request.operation = TextOf(*operation, "operation");
  request.hook = FindCall(&HookCall::operation, request.operation);
  if (request.operation == raw) {
    ParseRaw(root, request);
  } else if (request.operation == host) {
    ParseHost(root, line, request);
  } else if (request.hook != nullptr) {
    ParseOperation(root, request);
  } else {
    Refuse(*operation, "operation", "unknown operation '" + request.operation + "'");
  }
  return request;
}

}  // namespace Kovactl
