// How much memory the bodies of requests may take in all. Part of the server; nobody else includes this.
//
// Threads: any.
#pragma once

#include <atomic>
#include <cstddef>
#include <utility>

namespace Agentd {

class BodyBudget {
 public:
  // What one body holds of it, given back when it goes. The budget outlives it.
  class Share {
   public:
    // `most` is what all bodies together may hold as far as this one is concerned.
    Share(BodyBudget& budget, std::size_t most) : _budget(&budget), _most(most) {}
    Share(Share&& other) noexcept
        : _budget(other._budget), _most(other._most), _held(std::exchange(other._held, 0)) {}
    Share& operator=(Share&&) = delete;
    ~Share() { _budget->_held -= _held; }

    // Makes it hold that many bytes, if it does not hold as many yet. False, and nothing done, when that is
    // too much.
    bool Hold(std::size_t bytes);

   private:
    BodyBudget* _budget;
    std::size_t _most;
    std::size_t _held = 0;
  };

  BodyBudget() = default;
  BodyBudget(const BodyBudget&) = delete;
  BodyBudget& operator=(const BodyBudget&) = delete;

  std::size_t Held() const { return _held; }

 private:
  std::atomic<std::size_t> _held{0};
};

}  // namespace Agentd
