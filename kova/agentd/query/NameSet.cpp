#include "kova/agentd/query/NameSet.h"

#include <algorithm>

namespace Kovasvc {

bool NameSet::Contains(std::string_view name) {
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

const std::string_view* NameSet::FindRepeated() {
  const auto isNotBefore = [](std::string_view left, std::string_view right) { return left >= right; };
  if (std::adjacent_find(_names.begin(), _names.end(), isNotBefore) == _names.end()) {
    return nullptr;  // each is greater than the one before
  }
  const std::string_view* repeated = nullptr;
  std::pmr::unordered_set<std::string_view> seen(&_memory);
  seen.reserve(_names.size());
  for (const std::string_view& name : _names) {
    if (!seen.insert(name).second && (repeated == nullptr || name < *repeated)) {
      repeated = &name;
    }
  }
  return repeated;
}

}  // namespace Kovasvc
