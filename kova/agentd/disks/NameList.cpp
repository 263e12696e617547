#include "kova/agentd/disks/NameList.h"

#include <algorithm>

namespace Kovasvc {

bool NameList::Contains(std::string_view name) {
  if (_next < _names.size() && _names[_next] == name) {
    ++_next;
    return true;
  }
  if (_index.empty()) {
    _index.reserve(_names.size());
    _index.insert(_names.begin(), _names.end());
  }
  return _index.contains(name);
}

const std::string_view* FindRepeated(const std::vector<std::string_view>& names) {
  const auto isNotBefore = [](std::string_view left, std::string_view right) { return left >= right; };
  if (std::adjacent_find(names.begin(), names.end(), isNotBefore) == names.end()) {
    return nullptr;  // each is greater than the one before
  }
  const std::string_view* repeated = nullptr;
  std::pmr::monotonic_buffer_resource memory;
  std::pmr::unordered_set<std::string_view> seen(&memory);
  seen.reserve(names.size());
  for (const std::string_view& name : names) {
    if (!seen.insert(name).second && (repeated == nullptr || name < *repeated)) {
      repeated = &name;
    }
  }
  return repeated;
}

}  // namespace Kovasvc
