#include "orbis/TypeDescriptor.h"
#include "orbis/WrittenSoap.h"
#include "orbis/soap/WrittenText.h"

namespace Orbis {
namespace {

using Soap::WrittenText;

// Passes over an item, which begins here. Whether it has the field.
bool TakeItem(WrittenText& text, std::string_view item, std::string_view field) {
  bool hasField = false;
  text.OpenKnown(item);
  while (text.IsAtTag() && !text.IsAtEndTag()) {
    const Soap::WrittenTag tag = text.Open();
    hasField = hasField || tag.name == field;
    text.TakeContent();
    text.Close(tag.name);
  }
  text.TakeValue();  // of an item that is a text
  text.Close(item);
  return hasField;
}

}  // namespace

std::optional<ItemsOfSoap> CountItemsOfSoap(std::string_view text, std::string_view field) {
  constexpr std::string_view item = "item";
  try {
    WrittenText walked(text);
    const TypeDescriptor* const type = FindType(walked.OpenRoot());
    if (type == nullptr || type->kind == TypeKind::DataObject) {
      return std::nullopt;
    }
    ItemsOfSoap counted{.list = type};
    while (walked.IsAtElement(item)) {
      ++counted.all;
      counted.withField += TakeItem(walked, item, field) ? 1 : 0;
    }
    walked.CloseRoot();
    return counted;
  } catch (const Soap::Unfamiliar&) {
    return std::nullopt;
  }
}

}  // namespace Orbis
