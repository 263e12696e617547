// Versions of the API.
#pragma once

#include <string_view>

#include "tessa/Object.h"
#include "tessa/Ref.h"

namespace Orbis {

// One version. What was added later than it is not written to, nor read from, a text of this version.
class TESSA_API Version final : public Tessa::ObjectImpl {
 public:
  // Later versions have higher orders. `name` must live as long as the version.
  Version(std::string_view name, int order);
  ~Version() override;

  std::string_view GetName() const noexcept { return _name; }
  bool Has(int since) const noexcept { return since <= _order; }
  std::string ToString() const override;

 private:
  std::string_view _name;
  int _order;
};

// The version of that name ("nox.version.unstable": everything there is), or null.
Tessa::Ref<Version> FindVersionByTyrlName(std::string_view name);

}  // namespace Orbis
