#include "orbis/xml/TreeBuilder.h"

#include <algorithm>
#include <cstring>
#include <new>
#include <type_traits>

#include "orbis/Namespaces.h"

namespace Orbis::Xml {

namespace {

constexpr std::string_view xmlNamespace = "http://www.w3.org/XML/1998/namespace";
// The actor that everybody is who gets a message.
constexpr std::string_view nextActor = "http://schemas.xmlsoap.org/soap/actor/next";

bool IsBlankCharacter(char c) {
  return c == ' ' || c == '\n' || c == '\t' || c == '\r';
}

bool IsBlank(std::string_view text) {
  return std::all_of(text.begin(), text.end(), IsBlankCharacter);
}

bool IsControl(char c) {
  return static_cast<unsigned char>(c) < 0x20 || c == 0x7F;
}

bool IsSchemaHint(std::string_view name) {
  return name == "schemaLocation" || name == "noNamespaceSchemaLocation";
}

std::string Quoted(std::string_view text) {
  return '"' + std::string(text) + '"';
}

std::string Counted(std::size_t count, const char* what) {
  return std::to_string(count) + ' ' + what;
}

// "/name" or "/name[2]", the index only among several siblings of the name.
std::string StepOf(const Element& element) {
  std::string step = '/' + std::string(element.name);
  std::size_t index = 0;
  std::size_t count = 0;
  for (const Element* sibling = element.parent != nullptr ? element.parent->firstChild : nullptr;
       sibling != nullptr; sibling = sibling->nextSibling) {
    if (sibling == &element) {
      index = count;
    }
    count += sibling->name == element.name ? 1 : 0;
  }
  return count > 1 ? step + '[' + std::to_string(index) + ']' : step;
}

}  // namespace

std::string PathOf(const Element& element) {
  std::vector<std::string> steps;
  for (const Element* at = &element; at != nullptr; at = at->parent) {
    steps.push_back(StepOf(*at));
  }
  std::string path;
  std::for_each(steps.rbegin(), steps.rend(), [&path](const std::string& step) { path += step; });
  return path;
}

Element* Arena::NewElement() {
  static_assert(std::is_trivially_destructible_v<Element>, "elements go with the arena, undestroyed");
  return new (_memory.allocate(sizeof(Element), alignof(Element))) Element{};
}

std::string_view Arena::Copy(std::string_view text) {
  if (text.empty()) {
    return {};
  }
  char* copy = static_cast<char*>(_memory.allocate(text.size(), 1));
  std::memcpy(copy, text.data(), text.size());
  return {copy, text.size()};
}

std::string_view Arena::Intern(std::string_view text) {
  if (text == _last) {
    return _last;
  }
  auto place = _interned.lower_bound(text);
  if (place == _interned.end() || *place != text) {
    place = _interned.insert(place, Copy(text));
  }
  _last = *place;
  return _last;
}

void NamespaceScope::Declare(std::string_view prefix, std::string_view uri) {
  const auto entry = _uris.try_emplace(prefix).first;
  _undo.push_back({entry, entry->second});
  entry->second = uri;
}

void NamespaceScope::BackTo(Mark mark) noexcept {
  while (_undo.size() > mark) {
    _undo.back().entry->second = _undo.back().outer;
    _undo.pop_back();
  }
}

std::optional<std::string_view> NamespaceScope::Find(std::string_view prefix) const {
  if (prefix == "xml") {
    return xmlNamespace;
  }
  if (const auto entry = _uris.find(prefix); entry != _uris.end() && entry->second) {
    return entry->second;
  }
  return prefix.empty() ? std::optional<std::string_view>("") : std::nullopt;
}

TreeBuilder::TreeBuilder(Arena& arena, const Limits& limits, Attributes attributes)
    : _arena(arena), _limits(limits), _attributes(attributes) {}

void TreeBuilder::DeclareNamespace(std::string_view prefix, std::string_view uri) {
  if (_scope.Here() - _scopeOfNext >= _limits.attributes) {
    Refuse("an element has more than " + Counted(_limits.attributes, "attributes"));
  }
  if (std::max(prefix.size(), uri.size()) > _limits.nameBytes) {
    Refuse("a namespace or its prefix is longer than " + Counted(_limits.nameBytes, "bytes"));
  }
  if (std::any_of(uri.begin(), uri.end(), IsControl)) {
    Refuse("a namespace holds a control character");
  }
  _scope.Declare(_arena.Intern(prefix), _arena.Intern(uri));
}

void TreeBuilder::OpenElement(const Name& name, std::size_t attributes, int line) {
  if (!_open.empty()) {
    CheckMayHaveChild(_open.back());
  }
  CheckName(name);
  if (_open.size() >= _limits.depth) {
    Refuse("elements are nested deeper than " + Counted(_limits.depth, "levels"));
  }
  if (++_elements > _limits.elements) {
    Refuse("the document has more than " + Counted(_limits.elements, "elements"));
  }
  Element* element = _arena.NewElement();
  element->nameSpace = _arena.Intern(name.nameSpace);
  element->name = _arena.Copy(name.local);
  Link(element, line);
  const std::size_t declarations = _scope.Here() - _scopeOfNext;
  _open.push_back({element, nullptr, _scopeOfNext, true, false, Cdata::None});
  _scopeOfNext = _scope.Here();
  _text.clear();
  if (attributes > _limits.attributes - declarations) {
    Refuse("the element has more than " + Counted(_limits.attributes, "attributes"));
  }
}

void TreeBuilder::CheckMayHaveChild(const OpenedElement& parent) const {
  if (!parent.blank || parent.cdata != Cdata::None) {
    Refuse("text stands beside child elements");
  }
}

void TreeBuilder::CheckName(const Name& name) const {
  if (name.nameSpace.size() + name.local.size() > _limits.nameBytes) {
    Refuse("a name with its namespace is longer than " + Counted(_limits.nameBytes, "bytes"));
  }
}

void TreeBuilder::Link(Element* element, int line) {
  element->line = line;
  if (_open.empty()) {
    _root = element;
    return;
  }
  OpenedElement& parent = _open.back();
  element->parent = parent.element;
  if (parent.lastChild == nullptr) {
    parent.element->firstChild = element;
  } else {
    parent.lastChild->nextSibling = element;
  }
  parent.lastChild = element;
}

void TreeBuilder::AddAttribute(const Name& name, std::string_view value) {
  CheckName(name);
  if (value.size() > _limits.textBytes) {
    Refuse("the value of attribute " + Quoted(name.local) + " is longer than " +
           Counted(_limits.textBytes, "bytes"));
  }
  Element& element = *_open.back().element;
  const bool xsi = name.nameSpace == instanceNamespace;
  if (xsi && name.local == "type") {
    element.type = ResolveType(value);
  } else if (xsi && name.local == "nil") {
    element.nil = ReadNil(value);
  } else if (_attributes == Attributes::RefuseOnData && xsi && IsSchemaHint(name.local)) {
    return;
  } else if (_attributes == Attributes::Refuse || element.nameSpace == apiNamespace) {
    Refuse("attribute " + Quoted(name.local) + " is not known here");
  } else if (name.nameSpace == envelopeNamespace && name.local == "mustUnderstand") {
    element.mustUnderstand = value == "1" || value == "true";
  } else if (name.nameSpace == envelopeNamespace && name.local == "actor") {
    element.forAnother = !value.empty() && value != nextActor;
  }
}

TypeName TreeBuilder::ResolveType(std::string_view qualifiedName) {
  if (qualifiedName.empty() || std::any_of(qualifiedName.begin(), qualifiedName.end(), IsBlankCharacter)) {
    Refuse("xsi:type is empty or holds a blank");
  }
  const std::size_t colon = qualifiedName.find(':');
  const bool prefixed = colon != std::string_view::npos;
  const std::string_view prefix = prefixed ? qualifiedName.substr(0, colon) : std::string_view();
  const std::string_view local = prefixed ? qualifiedName.substr(colon + 1) : qualifiedName;
  if (local.empty() || (prefixed && prefix.empty()) || local.find(':') != std::string_view::npos) {
    Refuse("xsi:type is not a qualified name");
  }
  if (std::max(prefix.size(), local.size()) > _limits.nameBytes) {
    Refuse("the name in xsi:type is longer than " + Counted(_limits.nameBytes, "bytes"));
  }
  const std::optional<std::string_view> nameSpace = _scope.Find(prefix);
  if (!nameSpace) {
    Refuse("xsi:type uses the undeclared prefix " + Quoted(prefix));
  }
  CheckName({*nameSpace, local});
  return {_arena.Intern(*nameSpace), _arena.Copy(local)};
}

bool TreeBuilder::ReadNil(std::string_view value) const {
  const bool yes = value == "true" || value == "1";
  if (!yes && value != "false" && value != "0") {
    Refuse("xsi:nil is neither true nor false");
  }
  return yes;
}

void TreeBuilder::AddText(std::string_view text) {
  OpenedElement& open = _open.back();
  const bool blank = IsBlank(text);
  if (open.lastChild != nullptr) {
    if (!blank) {
      Refuse("text stands beside child elements");
    }
    return;
  }
  if (open.cdata == Cdata::Closed) {
    Refuse("a CDATA section is mixed with other text");
  }
  if (text.size() > _limits.textBytes - _text.size()) {
    Refuse("the text is longer than " + Counted(_limits.textBytes, "bytes"));
  }
  open.blank = open.blank && blank;
  _text.append(text);
}

void TreeBuilder::AddComment(std::string_view text) {
  if (text.size() > _limits.textBytes) {
    Refuse("a comment is longer than " + Counted(_limits.textBytes, "bytes"));
  }
  if (!_open.empty()) {
    _open.back().comment = true;
  }
}

void TreeBuilder::BeginCdata() {
  OpenedElement& open = _open.back();
  if (open.lastChild != nullptr) {
    Refuse("text stands beside child elements");
  }
  if (!_text.empty() || open.cdata != Cdata::None) {
    Refuse("a CDATA section is mixed with other text");
  }
  open.cdata = Cdata::Open;
}

void TreeBuilder::EndCdata() {
  _open.back().cdata = Cdata::Closed;
}

void TreeBuilder::CloseElement() {
  const OpenedElement& open = _open.back();
  Element& element = *open.element;
  if (open.lastChild == nullptr) {
    // Blanks may be the value itself, so even they are not put together round a comment.
    if (open.comment && !_text.empty()) {
      Refuse("a comment stands inside a value");
    }
    element.text = _arena.Copy(_text);
  }
  if (element.nil && (open.lastChild != nullptr || !_text.empty())) {
    Refuse("the element has content although xsi:nil is true");
  }
  _scope.BackTo(open.outerScope);
  _scopeOfNext = open.outerScope;
  _open.pop_back();
  _text.clear();
}

std::string TreeBuilder::Path() const {
  return _open.empty() ? "/" : PathOf(*_open.back().element);
}

void TreeBuilder::Refuse(const std::string& reason) const {
  throw Refusal(Path(), reason);
}

}  // namespace Orbis::Xml
