#include "orbis/GrowingText.h"

#include <algorithm>

namespace Orbis {

GrowingText::GrowingText(std::string& out, std::size_t expected)
    : _out(out), _end(out.data() + out.size()), _limit(_end) {
  Grow(expected);
}

GrowingText::~GrowingText() {
  _out.resize(static_cast<std::size_t>(_end - _out.data()));
}

void GrowingText::Grow(std::size_t wanted) {
  const auto size = static_cast<std::size_t>(_end - _out.data());
  _out.resize(size + std::max(wanted, size));
  _end = _out.data() + size;
  _limit = _out.data() + _out.size();
}

}  // namespace Orbis
