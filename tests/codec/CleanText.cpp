#include "tests/codec/CleanText.h"

#include <algorithm>
#include <cstdint>

#include "orbis/Engine.h"
#include "orbis/Scalar.h"
#include "orbis/TypeDescriptor.h"

namespace Codec {
namespace {

using Orbis::Any;
using Orbis::DataObject;
using Orbis::FieldDescriptor;
using Orbis::FieldKind;
using Orbis::TypeKind;

constexpr std::string_view replacement = "\xef\xbf\xbd";

// How many bytes a character takes that begins with this one; 0: none does.
std::size_t LengthFromLead(unsigned char lead) {
  return lead < 0x80 ? 1 : lead < 0xc0 ? 0 : lead < 0xe0 ? 2 : lead < 0xf0 ? 3 : lead < 0xf8 ? 4 : 0;
}

// The code points from `first` to `last` that are characters of that many bytes: is there one?
bool HoldsCharacter(std::uint32_t first, std::uint32_t last, std::size_t length) {
  constexpr std::uint32_t smallest[] = {0, 0, 0x80, 0x800, 0x10000};
  constexpr std::uint32_t largest[] = {0, 0x7f, 0x7ff, 0xffff, 0x10ffff};
  const std::uint32_t from = std::max(first, smallest[length]);
  const std::uint32_t to = std::min(last, largest[length]);
  return from <= to && !(from >= 0xd800 && to <= 0xdfff);
}

// Whether the bytes begin a character. All that it could be lies between the bytes continued by zeros
// and continued by ones.
bool BeginsCharacter(std::string_view bytes) {
  const auto lead = static_cast<unsigned char>(bytes[0]);
  const std::size_t length = LengthFromLead(lead);
  if (length < bytes.size()) {
    return false;
  }
  std::uint32_t first = length == 1 ? lead : lead & (0x7fu >> length);
  std::uint32_t last = first;
  for (std::size_t i = 1; i < length; ++i) {
    const bool there = i < bytes.size();
    const auto byte = static_cast<unsigned char>(there ? bytes[i] : 0);
    if (there && (byte & 0xc0) != 0x80) {
      return false;
    }
    first = first << 6 | (there ? byte & 0x3fu : 0);
    last = last << 6 | (there ? byte & 0x3fu : 0x3fu);
  }
  return HoldsCharacter(first, last, length);
}

bool FitsXml(std::string_view character) {
  const auto lead = static_cast<unsigned char>(character[0]);
  const bool control = lead < 0x20 && lead != '\t' && lead != '\n' && lead != '\r';
  return !control && character != "\xef\xbf\xbe" && character != "\xef\xbf\xbf";
}

void CleanTexts(Any& value, Form form);

void CleanField(const FieldDescriptor& field, DataObject& object, Form form) {
  if (field.kind == FieldKind::String) {
    if (const void* text = field.read(object)) {
      const std::string clean = CleanText(*static_cast<const std::string*>(text), form);
      *static_cast<std::string*>(field.write(object)) = clean;
    }
  } else if (!Orbis::IsScalar(field.kind)) {
    if (const Any* held = field.get(object)) {
      CleanTexts(const_cast<Any&>(*held), form);  // part of the copy, which is ours
    }
  }
}

void CleanTexts(Any& value, Form form) {
  switch (value.GetType().kind) {
    case TypeKind::DataObject:
      for (const FieldDescriptor* field : value.GetType().fields) {
        CleanField(*field, static_cast<DataObject&>(value), form);
      }
      return;
    case TypeKind::ObjectArray:
      for (const Orbis::Ref<Any>& element : static_cast<Orbis::DataArrayBase&>(value).Items()) {
        CleanTexts(*element, form);
      }
      return;
    case TypeKind::StringArray:
      for (std::string& text : static_cast<Orbis::TextList&>(value).Items()) {
        text = CleanText(text, form);
      }
      return;
    case TypeKind::Simple:
      if (value.GetType().simple == FieldKind::String) {
        auto& text = static_cast<Orbis::Boxed<std::string>&>(value).Value();
        text = CleanText(text, form);
      }
      return;
  }
}

}  // namespace

std::string CleanText(std::string_view text, Form form) {
  std::string clean;
  while (!text.empty()) {
    std::size_t size = 0;
    while (size < text.size() && size < 4 && BeginsCharacter(text.substr(0, size + 1))) {
      ++size;
    }
    const bool whole = size > 0 && LengthFromLead(static_cast<unsigned char>(text[0])) == size;
    const std::string_view bytes = text.substr(0, std::max<std::size_t>(size, 1));
    clean += whole && (form == Form::Json || FitsXml(bytes)) ? bytes : replacement;
    text.remove_prefix(bytes.size());
  }
  return clean;
}

Orbis::Ref<Any> CleanCopy(const Any& value, Form form) {
  const Orbis::Ref<Any> copy = Orbis::CloneAny(&value);
  CleanTexts(*copy, form);
  return copy;
}

}  // namespace Codec
