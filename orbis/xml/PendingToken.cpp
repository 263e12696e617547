#include "orbis/xml/PendingToken.h"

namespace Orbis::Xml {

namespace {

// Room for the longest delimiters round a comment, a declaration or a reference.
constexpr std::size_t delimiterBytes = 16;

bool IsTag(std::string_view token) {
  return token.size() > 1 && token[0] == '<' && token[1] != '!' && token[1] != '?';
}

bool IsOtherMarkup(std::string_view token) {
  return token.size() > 1 && (token[0] == '<' || token[0] == '&');
}

bool EndsName(char c) {
  return c == ' ' || c == '\n' || c == '\t' || c == '\r' || c == '=' || c == '/';
}

}  // namespace

std::string_view PendingToken::Examine(std::string_view text, std::size_t start) {
  if (start != _start) {
    *this = PendingToken(_limits);
    _start = start;
    _next = start + 1;
  }
  const std::string_view token = text.substr(start);
  if (IsTag(token)) {
    return ExamineTag(text);
  }
  if (IsOtherMarkup(token) && token.size() > delimiterBytes &&
      token.size() - delimiterBytes > _limits.textBytes) {
    return "a comment, declaration or reference is too long";
  }
  return {};
}

std::string_view PendingToken::ExamineTag(std::string_view text) {
  // A name may be a prefix and a local part, each as long as a whole name.
  const std::size_t longestName = 2 * _limits.nameBytes + 1;
  for (; _next < text.size(); ++_next) {
    const char c = text[_next];
    if (_quote == '\0' && c == '>') {
      return {};  // finished after all
    }
    _quote == '\0' ? StepOutsideQuotes(c) : StepInsideQuotes(c);
    if (_nameBytes > longestName) {
      return "a name is too long";
    }
    if (_valueBytes > _limits.textBytes) {
      return "the value of an attribute is too long";
    }
    if (_values > _limits.attributes) {
      return "an element has too many attributes";
    }
  }
  return {};
}

void PendingToken::StepOutsideQuotes(char c) {
  if (c == '"' || c == '\'') {
    _quote = c;
    _nameBytes = 0;
    _valueBytes = 0;
    ++_values;
  } else {
    _nameBytes = EndsName(c) ? 0 : _nameBytes + 1;
  }
}

void PendingToken::StepInsideQuotes(char c) {
  if (c == _quote) {
    _quote = '\0';
    _reference = false;
    return;
  }
  // A reference stands for at least one byte, however long it is written.
  _valueBytes += _reference ? 0 : 1;
  _reference = c == '&' || (_reference && c != ';');
}

}  // namespace Orbis::Xml
