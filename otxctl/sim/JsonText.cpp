#include "otxctl/sim/JsonText.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>
#include <vector>

#include "otxctl/sim/HostDescriptionError.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Sim {
namespace {

using nlohmann::json;

// Takes the parser's events and builds the document, watching the limits.
class DocumentBuilder {
 public:
  using number_integer_t = json::number_integer_t;
  using number_unsigned_t = json::number_unsigned_t;
  using number_float_t = json::number_float_t;
  using string_t = json::string_t;
  using binary_t = json::binary_t;

  DocumentBuilder(std::string_view text, const JsonLimits& limits) : _text(text), _limits(limits) {}

  json Take() { return std::move(_root); }

  // The names below are the parser's.
  bool null() { return Add(nullptr); }
  bool boolean(bool value) { return Add(value); }
  bool number_integer(number_integer_t value) { return Add(value); }
  bool number_unsigned(number_unsigned_t value) { return Add(value); }
  bool number_float(number_float_t value, const string_t&) { return Add(value); }
  bool string(string_t& value) { return Add(std::move(value)); }
  bool binary(binary_t&) { return false; }
  bool start_object(std::size_t) { return Open(json::object()); }
  bool start_array(std::size_t) { return Open(json::array()); }
  bool end_object() { return Close(); }
  bool end_array() { return Close(); }
  bool key(string_t& name);
  bool parse_error(std::size_t position, const std::string& token, const json::exception& failure);

 private:
  struct Level {
    json* container;
    std::string key;  // of the member that comes next
  };

  bool Add(json value);
  bool Open(json container);
  bool Close();
  json* Place(json value);
  std::string Path() const;

  std::string_view _text;
  JsonLimits _limits;
  json _root;
  std::vector<Level> _levels;
  std::size_t _values = 0;
};

bool DocumentBuilder::key(string_t& name) {
  Level& level = _levels.back();
  level.key = std::move(name);
  if (level.container->contains(level.key)) {
    throw HostDescriptionError(Path() + ": stands twice in its object");
  }
  return true;
}

bool DocumentBuilder::Add(json value) {
  Place(std::move(value));
  return true;
}

bool DocumentBuilder::Open(json container) {
  if (_levels.size() >= _limits.depth) {
    throw HostDescriptionError(Path() + ": nested deeper than " + std::to_string(_limits.depth) + " levels");
  }
  json* const placed = Place(std::move(container));
  _levels.push_back(Level{placed, {}});
  return true;
}

bool DocumentBuilder::Close() {
  _levels.pop_back();
  return true;
}

// Pointers to open containers stay valid: a container is not added to while one inside it is open.
json* DocumentBuilder::Place(json value) {
  if (++_values > _limits.values) {
    throw HostDescriptionError(Path() + ": more than " + std::to_string(_limits.values) +
                               " values in one document");
  }
  if (_levels.empty()) {
    _root = std::move(value);
    return &_root;
  }
  Level& level = _levels.back();
  if (level.container->is_array()) {
    level.container->push_back(std::move(value));
    return &level.container->back();
  }
  json& member = (*level.container)[level.key];
  member = std::move(value);
  return &member;
}

// Where the next value goes. An open array within the path holds the element that the path goes through.
std::string DocumentBuilder::Path() const {
  std::string path;
  for (std::size_t depth = 0; depth < _levels.size(); ++depth) {
    const Level& level = _levels[depth];
    if (level.container->is_array()) {
      const bool isLast = depth + 1 == _levels.size();
      const std::size_t index = level.container->size() - (isLast ? 0 : 1);
      path += "[" + std::to_string(index) + "]";
    } else {
      path += (path.empty() ? "" : ".") + Tessa::Abbreviate(Tessa::Sanitize(level.key));
    }
  }
  return path.empty() ? "document" : path;
}

// "[json.exception.parse_error.101] parse error at line 1, column 2: REASON" -> REASON
std::string ReasonOf(const json::exception& failure) {
  const std::string whole = failure.what();
  const std::size_t column = whole.find("column ");
  std::size_t start = whole.find(": ", column == std::string::npos ? 0 : column);
  start = start == std::string::npos ? whole.find("] ") : start;
  return Tessa::Abbreviate(Tessa::Sanitize(start == std::string::npos ? whole : whole.substr(start + 2)));
}

bool DocumentBuilder::parse_error(std::size_t position, const std::string&, const json::exception& failure) {
  // The parser counts the bytes it has read, the offending one included.
  const std::string_view before = _text.substr(0, position == 0 ? 0 : position - 1);
  const auto line = 1 + std::count(before.begin(), before.end(), '\n');
  const std::size_t lineStart = before.rfind('\n') == std::string_view::npos ? 0 : before.rfind('\n') + 1;
  const std::size_t column = 1 + before.size() - lineStart;
  throw HostDescriptionError("line " + std::to_string(line) + ", column " + std::to_string(column) + ": " +
                             ReasonOf(failure));
}

}  // namespace

json ParseJsonText(std::string_view text, const JsonLimits& limits) {
  if (text.size() > limits.bytes) {
    throw HostDescriptionError("document: larger than " + std::to_string(limits.bytes) + " bytes");
  }
  DocumentBuilder builder(text, limits);
  json::sax_parse(text.begin(), text.end(), &builder);
  return builder.Take();
}

}  // namespace OtxCtl::Sim
