// SOAP texts that this program's own writer wrote, turned into what clients are sent.
//
// The outcome is what reading the text and writing the object would give, to the letter, without the object
// and for a fraction of the time. A text that is not just as the writer writes it gives false, and `out` is
// as it was: whoever must have an answer then reads the text in full.
//
// Threads: any.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "orbis/Any.h"

namespace Orbis {

// Appends the value's JSON, as WriteJson does.
TESSA_API bool AppendJsonOfSoap(std::string_view text, std::string& out);

// Appends a message, as AppendSoapMessage does, of an object whose one field that is set is the list. The
// text must be that of a list of exactly that type.
TESSA_API bool AppendMessageOfSoap(std::string_view name, std::string_view field, const TypeDescriptor& list,
                                   std::string_view text, std::string& out);

struct ItemsOfSoap {
  const TypeDescriptor* list;  // the type of the list
  std::size_t all = 0;
  std::size_t withField = 0;
};

// How many items the text's list holds, and how many of them have that field. Nothing when it is no list, or
// no text as the writer writes it.
TESSA_API std::optional<ItemsOfSoap> CountItemsOfSoap(std::string_view text, std::string_view field);

}  // namespace Orbis
