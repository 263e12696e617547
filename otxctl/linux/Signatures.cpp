#include "otxctl/linux/Signatures.h"

#include <blkid/blkid.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdint>
#include <memory>
#include <string_view>
#include <type_traits>
#include <utility>

#include "otxctl/disks/SignatureWords.h"
#include "otxctl/linux/BoundedFile.h"
#include "otxctl/linux/FileDescriptor.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Linux {
namespace {

using Disks::Fact;
using Texts = std::vector<std::string>;

struct FreeProbe {
  void operator()(blkid_probe probe) const { blkid_free_probe(probe); }
};
using Prober = std::unique_ptr<std::remove_pointer_t<blkid_probe>, FreeProbe>;

// What the library answers.
constexpr int foundOne = 0;
constexpr int foundNothing = 1;
constexpr int foundAmbivalent = -2;

Signatures Unknown(const std::string& why) {
  return {Fact<Texts>::Unknown(why), Fact<std::string>::Unknown(why)};
}

std::string Value(blkid_probe probe, const char* name) {
  const char* text = nullptr;
  std::size_t size = 0;
  if (blkid_probe_lookup_value(probe, name, &text, &size) != 0 || text == nullptr) {
    return {};
  }
  const std::string_view value(text, size);  // the byte that ends the text is counted
  return std::string(value.substr(0, value.find('\0')));
}

void AddOnce(Texts& texts, std::string text) {
  if (std::find(texts.begin(), texts.end(), text) == texts.end()) {
    texts.push_back(std::move(text));
  }
}

// Both ends: the library takes the ends of a disk that are not there for empty ones. Returns 0 or errno.
int ReadEnds(int descriptor, std::int64_t size) {
  std::array<char, 512> bytes = {};
  const auto count = static_cast<std::int64_t>(bytes.size());
  for (const std::int64_t at : {std::int64_t{0}, std::max<std::int64_t>(0, size - count)}) {
    const ssize_t read = Uninterrupted([&] { return pread(descriptor, bytes.data(), bytes.size(), at); });
    if (read != std::min(count, size)) {
      return read < 0 ? errno : EIO;
    }
  }
  return 0;
}

// What the library has found of one kind, put with the rest.
void Take(blkid_probe probe, Texts& signatures, Texts& tables) {
  const std::string type = Value(probe, "TYPE");
  const std::string table = Value(probe, "PTTYPE");
  if (!type.empty()) {
    AddOnce(signatures,
            Disks::SignatureInWords(Tessa::Sanitize(type), Tessa::Sanitize(Value(probe, "LABEL"))));
  }
  if (!table.empty()) {
    AddOnce(tables, Tessa::Sanitize(table));
  }
  if (type.empty() && table.empty()) {
    AddOnce(signatures, "a signature without a name");
  }
}

Prober NewProber(int descriptor) {
  Prober prober(blkid_new_probe());
  if (prober == nullptr || blkid_probe_set_device(prober.get(), descriptor, 0, 0) != 0) {
    return nullptr;
  }
  blkid_probe_enable_superblocks(prober.get(), 1);
  blkid_probe_set_superblocks_flags(prober.get(), BLKID_SUBLKS_LABEL | BLKID_SUBLKS_TYPE |
                                                      BLKID_SUBLKS_USAGE | BLKID_SUBLKS_MAGIC |
                                                      BLKID_SUBLKS_BADCSUM);
  blkid_probe_enable_partitions(prober.get(), 1);
  blkid_probe_set_partitions_flags(prober.get(), BLKID_PARTS_MAGIC | BLKID_PARTS_FORCE_GPT);
  return prober;
}

// A table that is there for the sake of those who do not know the other one is no table of its own.
std::string TablesInWords(const Texts& tables) {
  std::string words;
  for (const std::string& table : tables) {
    if (tables.size() == 1 || table != "PMBR") {
      words += (words.empty() ? "" : " and ") + (table == "PMBR" ? std::string("protective") : table);
    }
  }
  return words;
}

}  // namespace

Signatures ReadSignatures(int descriptor, const std::string& name) {
  const Prober prober = NewProber(descriptor);
  if (prober == nullptr) {
    return Unknown("what stands on " + name + ": it cannot be looked at");
  }
  if (const int error = ReadEnds(descriptor, blkid_probe_get_size(prober.get())); error != 0) {
    return Unknown(CannotRead(name, error));
  }
  Texts signatures;
  Texts tables;
  int result = foundOne;
  // Each call finds the next thing, of whatever kind.
  while ((result = blkid_do_probe(prober.get())) == foundOne) {
    Take(prober.get(), signatures, tables);
  }
  if (result == foundNothing) {
    // The other way round: as a whole. Finds the same, or that it contradicts itself.
    blkid_reset_probe(prober.get());
    const int whole = blkid_do_safeprobe(prober.get());
    if (whole == foundOne) {
      Take(prober.get(), signatures, tables);
    } else if (whole == foundAmbivalent && signatures.empty()) {
      signatures.emplace_back("several signatures that contradict each other");
    }
    result = whole == foundOne || whole == foundAmbivalent ? foundNothing : whole;
  }
  if (result != foundNothing) {
    return Unknown("what stands on " + name + ": reading it failed");
  }
  return {std::move(signatures), TablesInWords(tables)};
}

}  // namespace OtxCtl::Linux
