#include "orbis/json/JsonEvents.h"

#include <cstdlib>
#include <iterator>
#include <nlohmann/json.hpp>
#include <utility>

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
  // NOLINTBEGIN(readability-identifier-naming): what the library's algorithms ask for
  using value_type = char;
  using difference_type = std::ptrdiff_t;
  using pointer = const char*;
  using reference = const char&;
  using iterator_category = std::forward_iterator_tag;
  // NOLINTEND(readability-identifier-naming)

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

// The library's text begins with its own numbering and place; its reason follows.
std::string ReasonOf(const std::string& text) {
  const std::size_t place = text.find("column ");
  const std::string_view mark = place == std::string::npos ? "] " : ": ";
  const std::size_t reason = text.find(mark, place == std::string::npos ? 0 : place);
  return reason == std::string::npos ? text : text.substr(reason + 2);
}

// The handler throws.
[[noreturn]] void PassRefusal(EventHandler& handler, const Refusal& refusal) {
  handler.OnRefusal(refusal);
  std::abort();
}

// Passes the library's events on and refuses what passes the limits. Its names are the library's.
class BoundedEvents final : public Library::json_sax_t {
 public:
  BoundedEvents(const Limits& limits, const int& line, EventHandler& handler)
      : _limits(limits), _line(line), _handler(handler) {}

  bool null() override { return Pass(nullptr); }
  bool boolean(bool value) override { return Pass(value); }
  bool number_integer(std::int64_t value) override { return Pass(value); }
  bool number_unsigned(std::uint64_t value) override { return Pass(value); }
  bool number_float(double value, const std::string& digits) override {
    CheckLength(digits.size(), _limits.textBytes, "number");
    return Pass(Float{value, digits});
  }
  bool string(std::string& text) override {
    CheckLength(text.size(), _limits.textBytes, "text");
    return Pass(std::move(text));
  }
  bool binary(Library::binary_t&) override { return false; }

  bool start_object(std::size_t) override { return Open(false); }
  bool start_array(std::size_t) override { return Open(true); }
  bool end_object() override { return Close(); }
  bool end_array() override { return Close(); }

  bool key(std::string& name) override {
    CheckLength(name.size(), _limits.nameBytes, "key");
    Level& level = _levels.back();
    const auto [key, isNew] = level.keys.insert(name);
    if (!isNew) {
      PassRefusal(_handler, {Bound::UniqueKeys, "key '" + name + "' stands twice", _line, 0, name, _levels});
    }
    level.key = &*key;
    _handler.OnKey(std::move(name));
    return true;
  }

  bool parse_error(std::size_t position, const std::string&,
                   const nlohmann::detail::exception& error) override {
    PassRefusal(_handler, {Bound::Syntax, ReasonOf(error.what()), _line, position, {}, _levels});
  }

 private:
  bool Pass(Scalar&& value) {
    Count();
    _handler.OnScalar(std::move(value), _line);
    return true;
  }

  bool Open(bool isArray) {
    if (_levels.size() >= _limits.depth) {
      Refuse(Bound::Depth, "nested deeper than " + std::to_string(_limits.depth));
    }
    Count();
    _handler.OnOpen(isArray, _line);
    _levels.push_back({isArray, 0, nullptr, {}});
    return true;
  }

  bool Close() {
    _levels.pop_back();
    _handler.OnClose();
    return true;
  }

  void Count() {
    if (++_count > _limits.elements) {
      Refuse(Bound::Values, "more than " + std::to_string(_limits.elements) + " values");
    }
    if (!_levels.empty()) {
      ++_levels.back().count;
    }
  }

  void CheckLength(std::size_t length, std::size_t limit, const char* what) const {
    if (length > limit) {
      Refuse(Bound::Length, std::string(what) + " longer than " + std::to_string(limit) + " bytes");
    }
  }

  [[noreturn]] void Refuse(Bound bound, const std::string& reason) const {
    PassRefusal(_handler, {bound, reason, _line, 0, {}, _levels});
  }

  const Limits& _limits;
  const int& _line;
  EventHandler& _handler;
  std::vector<Level> _levels;
  std::size_t _count = 0;
};

}  // namespace

void ReadEvents(std::string_view text, const Limits& limits, EventHandler& handler) {
  if (text.size() > limits.documentBytes) {
    const std::string reason = "larger than " + std::to_string(limits.documentBytes) + " bytes";
    PassRefusal(handler, {Bound::Bytes, reason, 0, 0, {}, std::vector<Level>()});
  }
  Progress progress;
  BoundedEvents events(limits, progress.line, handler);
  Library::sax_parse(LineCounter(text.data(), &progress), LineCounter(text.data() + text.size(), &progress),
                     &events);
}

}  // namespace Orbis::Json
