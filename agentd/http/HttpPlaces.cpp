#include "agentd/http/HttpPlaces.h"

namespace Agentd {

std::optional<HttpRefusal> HttpPlaces::WhyFull(const std::string& peer) const {
  const auto found = _ofPeers.find(peer);
  if (found != _ofPeers.end() && found->second >= _ofOnePeer) {
    return HttpRefusal::ConnectionsOfPeer;
  }
  return _taken >= _all ? std::optional(HttpRefusal::Connections) : std::nullopt;
}

HttpPlaces::Place HttpPlaces::Take(const std::string& peer) {
  ++_taken;
  if (!peer.empty()) {
    ++_ofPeers[peer];
  }
  return {*this, peer};
}

void HttpPlaces::Leave(const std::string& peer) {
  --_taken;
  const auto found = _ofPeers.find(peer);
  if (found != _ofPeers.end() && --found->second == 0) {
    _ofPeers.erase(found);
  }
}

}  // namespace Agentd
