#include "host/RequestTexts.h"

#include <string_view>

#include "host/Refusal.h"
#include "nox/Host.h"
#include "nox/Kova.h"
#include "orbis/Limits.h"
#include "orbis/Soap.h"

namespace Host {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;

namespace {

constexpr std::size_t mostItemBytes = Orbis::Limits::OwnOutput().textBytes;

// Names that the gate has let in are UTF-8 without control characters; of that, XML lacks two.
bool IsHeldByXml(std::string_view name) {
  return name.find("\xEF\xBF\xBE") == name.npos && name.find("\xEF\xBF\xBF") == name.npos;
}

bool HasWritableNames(const ScsiDisk& disk) {
  return !disk.HasCanonicalName() || IsHeldByXml(disk.GetCanonicalName());
}

bool HasWritableNames(const DiskMapping& mapping) {
  bool writable = HasWritableNames(*mapping.GetSsd());
  if (const auto& disks = mapping.GetNonSsd()) {
    for (const ScsiDisk* disk : *disks) {
      writable = writable && HasWritableNames(*disk);
    }
  }
  return writable;
}

// Adds the size of the text to `bytes`.
template <class Item>
std::string Write(const std::string& place, const Item& item, std::size_t mostBytes, std::size_t& bytes) {
  if (!HasWritableNames(item)) {
    Refuse(place, "a name cannot be handed to the host as it is");
  }
  std::string text;
  Orbis::SerializeObjectToSoap(item, nullptr, text);
  if (text.size() > mostItemBytes) {
    Refuse(place, "cannot be handed to the host: more than " + std::to_string(mostItemBytes) + " bytes");
  }
  bytes += text.size();
  if (bytes > mostBytes) {
    Refuse(place, "the request comes to more than " + std::to_string(mostBytes) + " bytes");
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
