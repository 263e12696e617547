// Faults on demand: which call of which provider operation waits or fails, and how.
//
// The rules are plain values. A CallCounter is not guarded: its owner counts under its own lock, and waits
// and throws (Suffer) outside of it.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace OtxCtl::Fault {

struct FaultRule {
  std::string operation;     // a name of provider/OperationNames.h
  std::int32_t call = 0;     // which call of that operation, from 1; 0: every call
  std::string exception;     // a name of provider/NamedException.h; empty: the call goes on after the wait
  std::string message;       // what the exception says
  std::string disk;          // the disk it carries, where its class has one
  std::int32_t delayMs = 0;  // how long the call waits first

  friend bool operator==(const FaultRule&, const FaultRule&) = default;
};

class CallCounter {
 public:
  // The number of this call of the operation, from 1.
  std::int64_t Next(std::string_view operation);

 private:
  std::map<std::string, std::int64_t, std::less<>> _counts;
};

// What one call has to go through before it takes effect.
struct FaultEffect {
  std::chrono::milliseconds delay{0};
  std::optional<FaultRule> thrown;
};

// Goes through the fitting rules in order, adding up their delays, up to the first that throws.
FaultEffect EffectOf(const std::vector<FaultRule>& rules, std::string_view operation, std::int64_t call);

// How to let time pass. Tests put something quicker in the place of sleeping.
using Waiter = std::function<void(std::chrono::milliseconds)>;
void SleepFor(std::chrono::milliseconds delay);

// Waits if there is a delay, then throws if the effect says so. Call it without holding a lock.
void ApplyEffect(const FaultEffect& effect, const Waiter& wait = &SleepFor);

}  // namespace OtxCtl::Fault
