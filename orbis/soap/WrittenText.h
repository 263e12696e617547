// Steps through a text that the SOAP writer wrote, without making anything of it.
//
// Such a text holds elements and values only: no comment, no CDATA section, no blank between elements, no
// attribute but xsi:type, an end tag for every element. Whatever else is met is Unfamiliar, and for the full
// reader to judge.
//
// Threads: one cursor per thread. Views point into the text.
#pragma once

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
  explicit WrittenText(std::string_view text) : _rest(text) {}

  // The beginning of a text, up to and with the tag of its root; its type.
  std::string_view OpenRoot();
  // The end of the root, and of the text.
  void CloseRoot();

  bool IsAtEndTag() const { return _rest.substr(0, 2) == "</"; }
  // Whether the element of that name begins here.
  bool IsAtElement(std::string_view name) const;
  WrittenTag Open();
  // The same where the element of that name is known to begin; its type.
  std::string_view OpenKnown(std::string_view name);
  void Close(std::string_view name);
  // A value, escaped as it stands; what is behind the tag of an element without children.
  std::string_view TakeValue();
  // All that stands in the element that was opened last, elements and all.
  std::string_view TakeContent();

 private:
  void Take(std::string_view expected);
  void Take(char expected);
  std::string_view TakeTypeAndTagEnd();
  std::string_view TakeUntil(char end);

  std::string_view _rest;
};

// The value as it was before it was escaped, appended.
void AppendUnescaped(std::string_view value, std::string& out);

}  // namespace Orbis::Soap
