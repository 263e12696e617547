#include "orbis/soap/WrittenText.h"

#include <utility>

#include "orbis/Soap.h"

namespace Orbis::Soap {
namespace {

constexpr std::string_view typeAttribute = " xsi:type=\"";

const std::string& Head() {
  static const std::string head = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<object xmlns=\"" +
                                  std::string(apiNamespace) + "\" xmlns:xsd=\"" +
                                  std::string(schemaNamespace) + "\" xmlns:xsi=\"" +
                                  std::string(instanceNamespace) + "\"" + std::string(typeAttribute);
  return head;
}

constexpr bool EndsName(char character) {
  return character == '>' || character == ' ' || character == '<' || character == '/';
}

// Everything that the writer escapes in values.
constexpr std::pair<std::string_view, char> escapes[] = {
    {"&amp;", '&'}, {"&lt;", '<'}, {"&gt;", '>'}, {"&#13;", '\r'}};

}  // namespace

std::string_view WrittenText::OpenRoot() {
  Take(Head());
  const std::string_view type = TakeUntil('"');
  Take("\">");
  return type;
}

void WrittenText::CloseRoot() {
  Close("object");
  if (!_rest.empty()) {
    throw Unfamiliar();
  }
}

bool WrittenText::IsAtElement(std::string_view name) const {
  const std::size_t end = 1 + name.size();
  // The end of the name first: it tells most names apart.
  return _rest.size() > end && (_rest[end] == '>' || _rest[end] == ' ') && _rest.front() == '<' &&
         _rest.compare(1, name.size(), name) == 0;
}

WrittenTag WrittenText::Open() {
  Take('<');
  std::size_t end = 0;
  while (end < _rest.size() && !EndsName(_rest[end])) {
    ++end;
  }
  if (end == 0 || end == _rest.size()) {
    throw Unfamiliar();
  }
  const std::string_view name = _rest.substr(0, end);
  _rest.remove_prefix(end);
  return {name, TakeTypeAndTagEnd()};
}

std::string_view WrittenText::OpenKnown(std::string_view name) {
  _rest.remove_prefix(1 + name.size());
  return TakeTypeAndTagEnd();
}

std::string_view WrittenText::TakeTypeAndTagEnd() {
  std::string_view type;
  if (_rest.front() != '>') {
    Take(typeAttribute);
    type = TakeUntil('"');
    Take('"');
  }
  Take('>');
  return type;
}

void WrittenText::Close(std::string_view name) {
  Take('<');
  Take('/');
  Take(name);
  Take('>');
}

std::string_view WrittenText::TakeValue() {
  return TakeUntil('<');
}

std::string_view WrittenText::TakeContent() {
  std::size_t depth = 0;
  for (std::size_t at = _rest.find('<'); at != std::string_view::npos; at = _rest.find('<', at + 1)) {
    const bool ends = _rest.substr(at + 1, 1) == "/";
    if (ends && depth == 0) {
      const std::string_view content = _rest.substr(0, at);
      _rest.remove_prefix(at);
      return content;
    }
    depth += ends ? -1 : 1;
  }
  throw Unfamiliar();
}

void WrittenText::Take(std::string_view expected) {
  if (_rest.compare(0, expected.size(), expected) != 0) {
    throw Unfamiliar();
  }
  _rest.remove_prefix(expected.size());
}

void WrittenText::Take(char expected) {
  if (_rest.empty() || _rest.front() != expected) {
    throw Unfamiliar();
  }
  _rest.remove_prefix(1);
}

std::string_view WrittenText::TakeUntil(char end) {
  const std::size_t size = _rest.find(end);
  if (size == std::string_view::npos) {
    throw Unfamiliar();
  }
  const std::string_view taken = _rest.substr(0, size);
  _rest.remove_prefix(size);
  return taken;
}

void AppendUnescaped(std::string_view value, std::string& out) {
  for (std::size_t at = value.find('&'); at != std::string_view::npos; at = value.find('&')) {
    out.append(value.substr(0, at));
    value.remove_prefix(at);
    const auto* escape = std::begin(escapes);
    while (escape != std::end(escapes) && value.compare(0, escape->first.size(), escape->first) != 0) {
      ++escape;
    }
    if (escape == std::end(escapes)) {
      throw Unfamiliar();
    }
    out.push_back(escape->second);
    value.remove_prefix(escape->first.size());
  }
  out.append(value);
}

}  // namespace Orbis::Soap
