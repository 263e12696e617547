#include "orbis/json/JsonText.h"

#include <algorithm>
#include <cstddef>
#include <limits>
#include <nlohmann/json.hpp>
#include <utility>

#include "orbis/ParseException.h"
#include "orbis/json/JsonEvents.h"
#include "tessa/text/Escape.h"
#include "tessa/text/Utf8.h"

namespace Orbis::Json {
namespace {

using Library = nlohmann::json;

// The library's words, which end in all that it read of a broken value, perhaps in the middle of a character.
std::string Readable(std::string_view words) {
  constexpr std::size_t most = 200;
  return Tessa::ReplaceInvalidUtf8(Tessa::Excerpt(words, most));
}

// What a scalar is in the tree.
struct ScalarWriter {
  Value& value;

  void operator()(std::nullptr_t) const { value.kind = Kind::Null; }
  void operator()(bool boolean) const {
    value.kind = Kind::Boolean;
    value.boolean = boolean;
  }
  void operator()(std::int64_t integer) const {
    value.kind = Kind::Integer;
    value.integer = integer;
  }
  void operator()(std::uint64_t integer) const {
    if (integer <= static_cast<std::uint64_t>(std::numeric_limits<std::int64_t>::max())) {
      (*this)(static_cast<std::int64_t>(integer));
      return;
    }
    value.kind = Kind::Number;
    value.text = std::to_string(integer);
  }
  void operator()(Float&& number) const {
    value.kind = Kind::Number;
    value.text = std::move(number.digits);
  }
  void operator()(std::string&& text) const {
    value.kind = Kind::String;
    value.text = std::move(text);
  }
};

// Builds the tree from the events.
class TreeBuilder final : public EventHandler {
 public:
  explicit TreeBuilder(Value& root) : _root(root) {}

  void OnScalar(Scalar&& scalar, int line) override {
    std::visit(ScalarWriter{Add(line)}, std::move(scalar));
  }
  void OnOpen(bool isArray, int line) override {
    Value& opened = Add(line);
    opened.kind = isArray ? Kind::Array : Kind::Object;
    _open.push_back(&opened);
  }
  void OnClose() override { _open.pop_back(); }
  void OnKey(std::string key) override { _open.back()->members.push_back({std::move(key), Value()}); }

  void OnRefusal(const Refusal& refusal) override {
    std::string path;
    for (const Level& level : refusal.levels) {
      if (level.isArray) {
        path += "[" + std::to_string(level.count == 0 ? 0 : level.count - 1) + "]";
      } else if (level.key != nullptr) {
        path += (path.empty() ? "" : ".") + *level.key;
      }
    }
    throw ParseException(path.empty() ? "(root)" : path, refusal.line,
                         refusal.bound == Bound::Syntax ? Readable(refusal.reason) : refusal.reason);
  }

 private:
  Value& Add(int line) {
    Value* added = &_root;
    if (!_open.empty()) {
      Value& parent = *_open.back();
      added = parent.kind == Kind::Array ? &parent.items.emplace_back() : &parent.members.back().value;
    }
    added->line = line;
    return *added;
  }

  Value& _root;
  std::vector<Value*> _open;  // stay good: a parent grows only after its last child has closed
};

bool IsPlain(std::string_view text) {
  return std::all_of(text.begin(), text.end(), [](char character) { return Json::IsPlain(character); });
}

}  // namespace

const Value* Value::Find(std::string_view key) const noexcept {
  for (const auto& [name, value] : members) {
    if (name == key) {
      return &value;
    }
  }
  return nullptr;
}

std::string Describe(const Value& value) {
  switch (value.kind) {
    case Kind::Null:
      return "null";
    case Kind::Boolean:
      return value.boolean ? "true" : "false";
    case Kind::Integer:
      return "the number " + std::to_string(value.integer);
    case Kind::Number:
      return "the number " + std::string(Tessa::Excerpt(value.text));
    case Kind::String:
      return "the text '" + std::string(Tessa::Excerpt(value.text)) + "'";
    case Kind::Array:
      return "an array";
    case Kind::Object:
      return "an object";
  }
  return "";
}

Value Parse(std::string_view text, const Limits& limits) {
  Value root;
  TreeBuilder builder(root);
  ReadEvents(text, limits, builder);
  return root;
}

void AppendString(std::string_view text, std::string& out) {
  if (IsPlain(text)) {
    out.append("\"").append(text).append("\"");  // as nearly all texts are: the library takes its time
    return;
  }
  out += Library(text).dump(-1, ' ', false, Library::error_handler_t::replace);
}

}  // namespace Orbis::Json
