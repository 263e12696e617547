#include "orbis/Version.h"

#include <limits>

namespace Orbis {

Version::Version(std::string_view name, int order) : _name(name), _order(order) {}
Version::~Version() = default;
std::string Version::ToString() const {
  return std::string(_name);
}

Tessa::Ref<Version> FindVersionByTyrlName(std::string_view name) {
  // Holds a reference that is never released: versions outlive everything.
  static const auto* const unstable =
      new Tessa::Ref<Version>(new Version("nox.version.unstable", std::numeric_limits<int>::max()));
  return (*unstable)->GetName() == name ? *unstable : nullptr;
}

}  // namespace Orbis
