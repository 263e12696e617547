// Looking up many names in a list of names.
#pragma once

#include <cstddef>
#include <memory_resource>
#include <string>
#include <string_view>
#include <unordered_set>
#include <utility>
#include <vector>

namespace Kovasvc {

// The names of a list, repeats included, by reference: what they refer to must outlive it.
//
// Made for names that are asked for in the order of the list, as they mostly are, since requests, records and
// inventory come from one host: such a name is found without a search. The first other one makes an index.
// For one thread.
class NameList {
 public:
  explicit NameList(const std::vector<std::string>& names) : _names(names.begin(), names.end()) {}
  explicit NameList(std::vector<std::string>&& names) = delete;  // would be gone at once
  explicit NameList(std::vector<std::string_view> names) : _names(std::move(names)) {}

  bool IsEmpty() const noexcept { return _names.empty(); }
  // A name that stands in the list twice counts twice.
  std::size_t Size() const noexcept { return _names.size(); }
  // Not const: it remembers how far the questions have come. The answers do not depend on that.
  bool Contains(std::string_view name);

 private:
  std::vector<std::string_view> _names;
  std::size_t _next = 0;  // the name that is expected to be asked for
  // Entries side by side in memory, and all freed at once.
  std::pmr::monotonic_buffer_resource _memory;
  std::pmr::unordered_set<std::string_view> _index{&_memory};
};

// Of the names that stand twice in the list, in whatever places, the first by bytes; null when there is none.
const std::string_view* FindRepeated(const std::vector<std::string_view>& names);

}  // namespace Kovasvc
