#include "orbis/json/JsonText.h"

#include <algorithm>
#include <cstddef>
#include <iterator>
#include <limits>
#include <nlohmann/json.hpp>
#include <set>

#include "orbis/ParseException.h"
#include "tessa/text/Escape.h"
#include "tessa/text/Utf8.h"

namespace Orbis::Json {
namespace {

using Library = nlohmann::json;

// How far the library has read.
struct Progress {
  int line = 1;
  bool atLineEnd = false;  // the last character read ends the line, which is not yet counted
};

// Walks the text for the library and counts the lines. The library reads one character beyond a number,
// so a line feed counts only when something behind it is read: else a number at the end of a line would
// be said to stand on the next.
class LineCounter {
 public:
  using value_type = char;
  using difference_type = std::ptrdiff_t;
  using pointer = const char*;
  using reference = const char&;
  using iterator_category = std::forward_iterator_tag;

  LineCounter(const char* at, Progress* progress) : _at(at), _progress(progress) {}
  reference operator*() const { return *_at; }
  LineCounter& operator++() {
    _progress->line += _progress->atLineEnd ? 1 : 0;
    _progress->atLineEnd = *_at == '\n';
    ++_at;
    return *this;
  }
  LineCounter operator++(int) {
    LineCounter before = *this;
    ++*this;
    return before;
  }
  bool operator==(const LineCounter& other) const { return _at == other._at; }
  bool operator!=(const LineCounter& other) const { return _at != other._at; }

 private:
  const char* _at;
  Progress* _progress;
};

// The library's words, which end in all that it read of a broken value, perhaps in the middle of a character.
std::string Readable(std::string_view words) {
  constexpr std::size_t most = 200;
  return Tessa::ReplaceInvalidUtf8(Tessa::Excerpt(words, most));
}

// Builds the tree from the library's events and refuses what passes the limits.
class Builder final : public Library::json_sax_t {
 public:
  Builder(const Limits& limits, const int& line, Value& root) : _limits(limits), _line(line), _root(root) {}

  bool null() override { return Add(Kind::Null) != nullptr; }
  bool boolean(bool value) override {
    Add(Kind::Boolean)->boolean = value;
    return true;
  }
  bool number_integer(std::int64_t value) override {
    Add(Kind::Integer)->integer = value;
    return true;
  }
  bool number_unsigned(std::uint64_t value) override {
    if (value <= static_cast<std::uint64_t>(std::numeric_limits<std::int64_t>::max())) {
      return number_integer(static_cast<std::int64_t>(value));
    }
    Add(Kind::Number)->text = std::to_string(value);
    return true;
  }
  bool number_float(double, const std::string& digits) override {
    CheckLength(digits.size(), _limits.textBytes, "number");
    Add(Kind::Number)->text = digits;
    return true;
  }
  bool string(std::string& text) override {
    CheckLength(text.size(), _limits.textBytes, "text");
    Add(Kind::String)->text = std::move(text);
    return true;
  }
  bool binary(Library::binary_t&) override { return false; }

  bool start_object(std::size_t) override { return Open(Kind::Object); }
  bool start_array(std::size_t) override { return Open(Kind::Array); }
  bool end_object() override { return Close(); }
  bool end_array() override { return Close(); }

  bool key(std::string& name) override {
    CheckLength(name.size(), _limits.nameBytes, "key");
    Level& level = _open.back();
    if (!level.keys.insert(name).second) {
      Refuse("key '" + name + "' stands twice");
    }
    level.value->members.push_back({std::move(name), Value()});
    return true;
  }

  bool parse_error(std::size_t, const std::string&, const nlohmann::detail::exception& error) override {
    // The library's text begins with its own numbering and place; ours follows.
    const std::string text = error.what();
    const std::size_t place = text.find("column ");
    const std::string_view mark = place == std::string::npos ? "] " : ": ";
    const std::size_t reason = text.find(mark, place == std::string::npos ? 0 : place);
    Refuse(Readable(reason == std::string::npos ? text : std::string_view(text).substr(reason + 2)));
  }

 private:
  struct Level {
    Value* value;
    std::set<std::string> keys;  // ordered, not hashed: a sender must not be able to choose collisions
  };

  Value* Add(Kind kind) {
    if (++_count > _limits.elements) {
      Refuse("more than " + std::to_string(_limits.elements) + " values");
    }
    Value* added = &_root;
    if (!_open.empty()) {
      Value& parent = *_open.back().value;
      added = parent.kind == Kind::Array ? &parent.items.emplace_back() : &parent.members.back().value;
    }
    added->kind = kind;
    added->line = _line;
    return added;
  }

  bool Open(Kind kind) {
    if (_open.size() == _limits.depth) {
      Refuse("nested deeper than " + std::to_string(_limits.depth));
    }
    _open.push_back({Add(kind), {}});
    return true;
  }

  bool Close() {
    _open.pop_back();
    return true;
  }

  void CheckLength(std::size_t length, std::size_t limit, const char* what) const {
    if (length > limit) {
      Refuse(std::string(what) + " longer than " + std::to_string(limit) + " bytes");
    }
  }

  [[noreturn]] void Refuse(const std::string& reason) const {
    std::string path;
    for (const Level& level : _open) {
      if (level.value->kind == Kind::Array) {
        path += "[" + std::to_string(level.value->items.empty() ? 0 : level.value->items.size() - 1) + "]";
      } else if (!level.value->members.empty()) {
        path += (path.empty() ? "" : ".") + level.value->members.back().key;
      }
    }
    throw ParseException(path.empty() ? "(root)" : path, _line, reason);
  }

  const Limits& _limits;
  const int& _line;
  Value& _root;
  std::vector<Level> _open;  // pointers stay good: a parent grows only after its last child has closed
  std::size_t _count = 0;
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
  if (text.size() > limits.documentBytes) {
    throw ParseException("(root)", 0, "larger than " + std::to_string(limits.documentBytes) + " bytes");
  }
  Progress progress;
  Value root;
  Builder builder(limits, progress.line, root);
  Library::sax_parse(LineCounter(text.data(), &progress), LineCounter(text.data() + text.size(), &progress),
                     &builder);
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
