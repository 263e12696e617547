// Steps through a text that the SOAP writer wrote, without making anything of it.
//
// Such a text holds elements and values only: no comment, no CDATA section, no blank between elements, no
// attribute but xsi:type, an end tag for every element. Whatever else is met is Unfamiliar, and for the full
// reader to judge.
//
// Threads: one cursor per thread. Views point into the text.
//
// The steps that are made once for each element stand here, so that they need not be called.
#pragma once

#include <cstddef>
#include <cstring>
#include <string>
#include <string_view>

namespace Orbis::Soap {

struct Unfamiliar {};  // thrown

struct WrittenTag {
  std::string_view name;
  std::string_view type;  // as in xsi:type; empty: the declared one
};

class WrittenText {
 public:
  explicit WrittenText(std::string_view text) : _at(text.data()), _end(_at + text.size()) {}

  // The beginning of a text, up to and with the tag of its root; its type.
  std::string_view OpenRoot();
  // The end of the root, and of the text.
  void CloseRoot();

  bool IsAtTag() const { return StartsWith("<"); }
  bool IsAtEndTag() const { return StartsWith("</"); }
  // Whether the element of that name begins here.
  bool IsAtElement(std::string_view name) const {
    const std::size_t size = 1 + name.size();
    // The end of the name first: it tells most names apart.
    return Left() > size && (_at[size] == '>' || _at[size] == ' ') && *_at == '<' &&
           std::memcmp(_at + 1, name.data(), name.size()) == 0;
  }
  WrittenTag Open();
  // The same where the element of that name is known to begin; its type.
  std::string_view OpenKnown(std::string_view name) {
    _at += 1 + name.size();
    return TakeTypeAndTagEnd();
  }
  void Close(std::string_view name) {
    const std::size_t size = 2 + name.size();
    if (Left() <= size || _at[size] != '>' || !IsAtEndTag() ||
        std::memcmp(_at + 2, name.data(), name.size()) != 0) {
      throw Unfamiliar();
    }
    _at += size + 1;
  }

  // A value, or what is left of it, escaped as it stands.
  std::string_view TakeValue() { return TakeUntil('<'); }
  // What comes next of a value and is made of such characters only, `<` not being one; may be empty.
  template <class IsOne>
  std::string_view TakeWhile(IsOne isOne) {
    const char* end = _at;
    while (end != _end && isOne(*end)) {
      ++end;
    }
    return TakeTo(end);
  }
  // All that stands in the element that was opened last, elements and all.
  std::string_view TakeContent();

 private:
  std::size_t Left() const { return static_cast<std::size_t>(_end - _at); }
  bool StartsWith(std::string_view expected) const {
    return Left() >= expected.size() && std::memcmp(_at, expected.data(), expected.size()) == 0;
  }
  std::string_view TakeTo(const char* end) {
    const std::string_view taken(_at, static_cast<std::size_t>(end - _at));
    _at = end;
    return taken;
  }
  std::string_view TakeUntil(char mark) {
    const void* const found = std::memchr(_at, mark, Left());
    if (found == nullptr) {
      throw Unfamiliar();
    }
    return TakeTo(static_cast<const char*>(found));
  }
  void TakeKnown(std::string_view expected) {
    if (!StartsWith(expected)) {
      throw Unfamiliar();
    }
    _at += expected.size();
  }
  std::string_view TakeTypeAndTagEnd() {
    if (StartsWith(">")) {
      ++_at;
      return {};
    }
    return TakeType();
  }
  std::string_view TakeType();

  const char* _at;
  const char* _end;
};

// The value as it was before it was escaped, appended.
void AppendUnescaped(std::string_view value, std::string& out);

}  // namespace Orbis::Soap
