// A bounded, strict reader of small XML documents: text in, tree of elements out.
//
// The one place that knows the XML library. It accepts UTF-8 only, no DOCTYPE, no processing
// instruction, and nothing beyond the limits it is given; every refusal is an Orbis::ParseException
// that names the path of the element and the line. Time and memory stay proportional to the limits,
// whatever the text.
//
// Threads: a document is built by one thread and may then be read by several.
// Ownership: every string_view in the tree points into the document, not into the text it was read from.
#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>

#include "orbis/Limits.h"

namespace Orbis::Xml {

// The value of xsi:type, resolved by namespace, never by prefix.
struct TypeName {
  std::string_view nameSpace;
  std::string_view name;  // empty: the element has no xsi:type
};

struct Element {
  std::string_view nameSpace;
  std::string_view name;
  // Character data of an element without child elements, comments and CDATA boundaries removed.
  // Of an element with children: empty (anything but white space between children is refused).
  std::string_view text;
  TypeName type;  // xsi:type is the only attribute besides xsi:nil that an element may carry, see below
  bool nil = false;
  bool mustUnderstand = false;  // an envelope's attribute of that name says so
  bool forAnother = false;      // its attribute "actor" names somebody on the way, not who gets the message
  int line = 0;
  const Element* firstChild = nullptr;
  const Element* nextSibling = nullptr;
  const Element* parent = nullptr;
};

// What to make of attributes in no namespace or another than xsi. Data objects have none.
enum class Attributes {
  Refuse,        // an error that names the attribute
  RefuseOnData,  // the same on elements of the API's namespace, which are data; others are an envelope's,
                 // whose attributes other software chooses. Where a schema is to be found is passed over
};

class Document {
 public:
  // Reads `text`. Throws Orbis::ParseException.
  Document(std::string_view text, const Limits& limits, Attributes attributes = Attributes::Refuse);
  ~Document();
  Document(Document&&) noexcept;
  Document& operator=(Document&&) noexcept;

  const Element& Root() const noexcept;

 private:
  struct Store;
  std::unique_ptr<Store> _store;
};

// Where an element stands: "/object/diskResult[2]/disk". Repeated siblings of one name are counted
// from 0; a name that stands alone has no index.
std::string PathOf(const Element& element);

}  // namespace Orbis::Xml
