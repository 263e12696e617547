// Builds the tree of a document from the events of a parser, and refuses what a document of ours never holds.
//
// Everything that is a rule about elements, values and names stands here; how the text is cut into
// events does not. Each event checks its bounds before it stores anything, so memory follows the limits.
//
// Threads: one builder per document, used by one thread.
// Ownership: the tree and its strings live in the arena that the builder is given.
#pragma once

#include <map>
#include <memory_resource>
#include <optional>
#include <set>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "orbis/Limits.h"
#include "orbis/xml/XmlReader.h"

namespace Orbis::Xml {

// Why a document is not accepted, and where. The line is known to the one who reads the text.
class Refusal : public std::runtime_error {
 public:
  Refusal(std::string path, const std::string& reason) : std::runtime_error(reason), _path(std::move(path)) {}
  const std::string& Path() const noexcept { return _path; }

 private:
  std::string _path;
};

// A name as its namespace makes it; valid during the event only.
struct Name {
  std::string_view nameSpace;
  std::string_view local;
};

// Memory of one document: never freed piece by piece.
class Arena {
 public:
  explicit Arena(std::size_t firstBytes) : _memory(firstBytes) {}

  Element* NewElement();
  std::string_view Copy(std::string_view text);
  // Equal texts share one copy. Ordered, not hashed: a sender must not be able to choose collisions.
  std::string_view Intern(std::string_view text);

 private:
  std::pmr::monotonic_buffer_resource _memory;
  std::set<std::string_view> _interned;
  std::string_view _last;
};

// Which prefix stands for which namespace, while elements open and close.
class NamespaceScope {
 public:
  using Mark = std::size_t;

  Mark Here() const noexcept { return _undo.size(); }
  void Declare(std::string_view prefix, std::string_view uri);
  void BackTo(Mark mark) noexcept;
  // The empty prefix is always bound, to no namespace if nothing else was declared.
  std::optional<std::string_view> Find(std::string_view prefix) const;

 private:
  struct Undo {
    std::map<std::string_view, std::optional<std::string_view>>::iterator entry;
    std::optional<std::string_view> outer;
  };
  // Entries of closed elements stay, unbound: the next element is likely to declare the same prefixes.
  std::map<std::string_view, std::optional<std::string_view>> _uris;
  std::vector<Undo> _undo;
};

// Every function but Path() and Root() may throw Refusal; after that the builder is only good for Path().
class TreeBuilder {
 public:
  TreeBuilder(Arena& arena, const Limits& limits, Attributes attributes);

  // For the element that opens next. An empty uri takes the default namespace away.
  void DeclareNamespace(std::string_view prefix, std::string_view uri);
  // `attributes`: how many AddAttribute calls follow.
  void OpenElement(const Name& name, std::size_t attributes, int line);
  void AddAttribute(const Name& name, std::string_view value);
  void AddText(std::string_view text);
  void AddComment(std::string_view text);
  void BeginCdata();
  void EndCdata();
  void CloseElement();

  // Of the innermost open element; "/" outside the root.
  std::string Path() const;
  const Element* Root() const noexcept { return _root; }

 private:
  enum class Cdata { None, Open, Closed };
  struct OpenedElement {
    Element* element;
    Element* lastChild;
    NamespaceScope::Mark outerScope;
    bool blank;    // no character data so far but white space
    bool comment;  // a comment stood here
    Cdata cdata;
  };

  [[noreturn]] void Refuse(const std::string& reason) const;
  void CheckMayHaveChild(const OpenedElement& parent) const;
  void CheckName(const Name& name) const;
  void Link(Element* element, int line);
  TypeName ResolveType(std::string_view qualifiedName);
  bool ReadNil(std::string_view value) const;

  Arena& _arena;
  const Limits _limits;
  const Attributes _attributes;
  NamespaceScope _scope;
  NamespaceScope::Mark _scopeOfNext = 0;
  std::vector<OpenedElement> _open;
  std::string _text;  // of the innermost element, as long as it has no child
  std::size_t _elements = 0;
  const Element* _root = nullptr;
};

}  // namespace Orbis::Xml
