#include "host/RequestTexts.h"

#include <vector>

#include "host/Refusal.h"
#include "nox/Host.h"
#include "nox/Kova.h"
#include "orbis/ParseException.h"
#include "orbis/Soap.h"

namespace Host {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Tessa::Ref;

namespace {

using Names = std::vector<std::string>;

Names NamesOf(const ScsiDisk& disk) {
  return {disk.HasCanonicalName() ? disk.GetCanonicalName() : std::string()};
}

Names NamesOf(const DiskMapping& mapping) {
  Names names = NamesOf(*mapping.GetSsd());
  if (const auto& disks = mapping.GetNonSsd()) {
    for (const ScsiDisk* disk : *disks) {
      names.push_back(NamesOf(*disk).front());
    }
  }
  return names;
}

template <class Item>
Names NamesIn(const std::string& text) {
  Ref<Orbis::Any> value;
  Orbis::DeserializeSoapToObject(text, value, nullptr, &Item::StaticType());
  return NamesOf(static_cast<const Item&>(*value));
}

// Adds the size of the text to `bytes`.
template <class Item>
std::string Write(const std::string& place, const Item& item, std::size_t mostBytes, std::size_t& bytes) {
  std::string text;
  Orbis::SerializeObjectToSoap(item, nullptr, text);
  bytes += text.size();
  if (bytes > mostBytes) {
    Refuse(place, "the request comes to more than " + std::to_string(mostBytes) + " bytes");
  }
  try {
    if (NamesIn<Item>(text) != NamesOf(item)) {
      Refuse(place, "a name cannot be handed to the host as it is");
    }
  } catch (const Orbis::ParseException& refused) {
    Refuse(place, std::string("cannot be handed to the host: ") + refused.what());
  }
  return text;
}

template <class List>
Kovasvc::Texts WriteAll(const std::string& list, const List& items, std::size_t mostBytes) {
  Kovasvc::Texts texts;
  texts.reserve(items.Size());
  std::size_t bytes = 0;
  for (std::size_t i = 0; i < items.Size(); ++i) {
    texts.push_back(Write(Indexed(list, i), *items[i], mostBytes, bytes));
  }
  return texts;
}

}  // namespace

Kovasvc::Texts ToTexts(const DiskList& disks, std::size_t mostBytes) {
  return WriteAll("disks", disks, mostBytes);
}

Kovasvc::Texts ToTexts(const MappingList& mappings, std::size_t mostBytes) {
  return WriteAll("mappings", mappings, mostBytes);
}

std::string ToText(const DiskMapping& mapping, std::size_t mostBytes) {
  std::size_t bytes = 0;
  return Write("mapping", mapping, mostBytes, bytes);
}

}  // namespace Host
