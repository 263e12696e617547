#include "orbis/soap/WrittenText.h"

#include <utility>

#include "orbis/Namespaces.h"

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
  TakeKnown(Head());
  const std::string_view type = TakeUntil('"');
  TakeKnown("\">");
  return type;
}

void WrittenText::CloseRoot() {
  Close("object");
  if (_at != _end) {
    throw Unfamiliar();
  }
}

WrittenTag WrittenText::Open() {
  TakeKnown("<");
  const std::string_view name = TakeWhile([](char character) { return !EndsName(character); });
  if (name.empty()) {
    throw Unfamiliar();
  }
  return {name, TakeTypeAndTagEnd()};
}

std::string_view WrittenText::TakeType() {
  TakeKnown(typeAttribute);
  const std::string_view type = TakeUntil('"');
  TakeKnown("\">");
  return type;
}

std::string_view WrittenText::TakeContent() {
  const char* const begin = _at;
  for (std::size_t depth = 0;; ++_at) {
    TakeUntil('<');
    if (!IsAtEndTag()) {
      ++depth;
    } else if (depth-- == 0) {
      return {begin, static_cast<std::size_t>(_at - begin)};
    }
  }
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
