// The places that there are for connections, and who has them. Part of the server; nobody else includes this.
//
// Threads: the network's only; Taken from any.
#pragma once

#include <atomic>
#include <cstddef>
#include <map>
#include <optional>
#include <string>

#include "agentd/http/HttpLoad.h"

namespace Agentd {

class HttpPlaces {
 public:
  // Held until it goes. The places outlive it.
  class Place {
   public:
    Place(HttpPlaces& places, std::string peer) : _places(&places), _peer(std::move(peer)) {}
    Place(Place&& other) noexcept : _places(other._places), _peer(std::move(other._peer)) {
      other._places = nullptr;
    }
    Place& operator=(Place&&) = delete;
    ~Place() {
      if (_places != nullptr) {
        _places->Leave(_peer);
      }
    }

   private:
    HttpPlaces* _places;
    std::string _peer;
  };

  HttpPlaces(std::size_t all, std::size_t ofOnePeer) : _all(all), _ofOnePeer(ofOnePeer) {}
  HttpPlaces(const HttpPlaces&) = delete;
  HttpPlaces& operator=(const HttpPlaces&) = delete;

  // Why there is no place for one more of that client; nothing when there is. A client without a name may
  // have all.
  std::optional<HttpRefusal> WhyFull(const std::string& peer) const;
  Place Take(const std::string& peer);
  std::size_t Taken() const { return _taken; }

 private:
  void Leave(const std::string& peer);

  const std::size_t _all;
  const std::size_t _ofOnePeer;
  std::atomic<std::size_t> _taken{0};
  std::map<std::string, std::size_t> _ofPeers;  // only those who have any
};

}  // namespace Agentd
