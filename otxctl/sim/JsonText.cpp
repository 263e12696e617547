#include "otxctl/sim/JsonText.h"

#include <algorithm>
#include <limits>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>
#include <vector>

#include "orbis/json/JsonEvents.h"
#include "otxctl/sim/HostDescriptionError.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Sim {
namespace {

using nlohmann::json;
using Orbis::Json::Bound;
using Orbis::Json::Level;
using Orbis::Json::Refusal;

// Where the next value goes. An open array within the path holds the element that the path goes through.
// A key that stands twice is the end of the path.
std::string PathOf(const Refusal& refusal) {
  std::string path;
  for (const Level& level : refusal.levels) {
    const bool isLast = &level == &refusal.levels.back();
    if (level.isArray) {
      path += "[" + std::to_string(level.count - (isLast ? 0 : 1)) + "]";
      continue;
    }
    const bool isTwice = isLast && refusal.bound == Bound::UniqueKeys;
    path +=
        (path.empty() ? "" : ".") + Tessa::Abbreviate(Tessa::Sanitize(isTwice ? refusal.newKey : *level.key));
  }
  return path.empty() ? "document" : path;
}

// "line 3, column 7" of the byte that is refused.
std::string PlaceOf(std::string_view text, std::size_t position) {
  const std::string_view before = text.substr(0, position == 0 ? 0 : position - 1);
  const auto line = 1 + std::count(before.begin(), before.end(), '\n');
  const std::size_t lineStart = before.rfind('\n') == std::string_view::npos ? 0 : before.rfind('\n') + 1;
  const std::size_t column = 1 + before.size() - lineStart;
  return "line " + std::to_string(line) + ", column " + std::to_string(column);
}

// Builds the document from the events.
class DocumentBuilder final : public Orbis::Json::EventHandler {
 public:
  explicit DocumentBuilder(std::string_view text) : _text(text) {}

  json Take() { return std::move(_root); }

  void OnScalar(Orbis::Json::Scalar&& value, int) override { Place(std::visit(ToJson(), std::move(value))); }
  void OnOpen(bool isArray, int) override {
    _open.push_back({Place(isArray ? json::array() : json::object()), {}});
  }
  void OnClose() override { _open.pop_back(); }
  void OnKey(std::string key) override { _open.back().key = std::move(key); }
  void OnRefusal(const Refusal& refusal) override;

 private:
  struct Container {
    json* value;
    std::string key;  // of the member that comes next
  };
  struct ToJson {
    json operator()(Orbis::Json::Float&& number) const { return number.value; }
    template <typename Value>
    json operator()(Value&& value) const {
      return std::forward<Value>(value);
    }
  };

  json* Place(json value);

  std::string_view _text;
  json _root;
  std::vector<Container> _open;
};

// Pointers to open containers stay valid: a container is not added to while one inside it is open.
json* DocumentBuilder::Place(json value) {
  if (_open.empty()) {
    _root = std::move(value);
    return &_root;
  }
  Container& container = _open.back();
  if (container.value->is_array()) {
    container.value->push_back(std::move(value));
    return &container.value->back();
  }
  json& member = (*container.value)[container.key];
  member = std::move(value);
  return &member;
}

void DocumentBuilder::OnRefusal(const Refusal& refusal) {
  const std::string& reason = refusal.reason;
  switch (refusal.bound) {
    case Bound::Syntax:
      throw HostDescriptionError(PlaceOf(_text, refusal.position) + ": " +
                                 Tessa::Abbreviate(Tessa::Sanitize(reason)));
    case Bound::UniqueKeys:
      throw HostDescriptionError(PathOf(refusal) + ": stands twice in its object");
    case Bound::Depth:
      throw HostDescriptionError(PathOf(refusal) + ": " + reason + " levels");
    case Bound::Values:
      throw HostDescriptionError(PathOf(refusal) + ": " + reason + " in one document");
    case Bound::Bytes:
    case Bound::Length:
      break;
  }
  throw HostDescriptionError(PathOf(refusal) + ": " + reason);
}

}  // namespace

json ParseJsonText(std::string_view text, const JsonLimits& limits) {
  constexpr std::size_t any = std::numeric_limits<std::size_t>::max();
  const Orbis::Limits bounds{.documentBytes = limits.bytes,
                             .depth = limits.depth,
                             .elements = limits.values,
                             .attributes = any,
                             .nameBytes = any,
                             .textBytes = any};
  DocumentBuilder builder(text);
  Orbis::Json::ReadEvents(text, bounds, builder);
  return builder.Take();
}

}  // namespace OtxCtl::Sim
