#include "otxctl/fault/FaultRules.h"

#include <thread>

#include "otxctl/provider/NamedException.h"

namespace OtxCtl::Fault {

std::int64_t CallCounter::Next(std::string_view operation) {
  auto found = _counts.find(operation);
  if (found == _counts.end()) {
    found = _counts.emplace(std::string(operation), 0).first;
  }
  return ++found->second;
}

FaultEffect EffectOf(const std::vector<FaultRule>& rules, std::string_view operation, std::int64_t call) {
  FaultEffect effect;
  for (const FaultRule& rule : rules) {
    const bool fits = rule.operation == operation && (rule.call == 0 || rule.call == call);
    if (!fits) {
      continue;
    }
    effect.delay += std::chrono::milliseconds(rule.delayMs);
    if (!rule.exception.empty()) {
      effect.thrown = rule;
      break;
    }
  }
  return effect;
}

void SleepFor(std::chrono::milliseconds delay) {
  std::this_thread::sleep_for(delay);
}

void ApplyEffect(const FaultEffect& effect, const Waiter& wait) {
  if (effect.delay.count() > 0) {
    wait(effect.delay);
  }
  if (effect.thrown) {
    Provider::ThrowNamed(effect.thrown->exception, effect.thrown->message, effect.thrown->disk);
  }
}

}  // namespace OtxCtl::Fault
