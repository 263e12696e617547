// A kernel made of what a test puts into it: records, groups, answers, and failures where they are wanted.
//
// It decides nothing: changing operations are recorded and succeed. The kernel outlives the providers it
// makes. What it holds is set up before other threads call it; the calls themselves are safe from any
// thread.
#pragma once

#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "kova/agentd/include/KovaInfo.h"
#include "tests/support/Timeline.h"

namespace TestSupport {

// One call of a provider: its operation and its inputs, printed as in "QueryDisks([naa.1], true)".
struct KernelCall {
  std::string operation;
  std::string text;
  std::vector<std::string> locksHeld;  // by the calling thread
};

class FakeKernel {
 public:
  // Notes each call in the timeline, and "delete provider" for each provider that goes.
  explicit FakeKernel(Timeline& timeline);
  ~FakeKernel();

  std::vector<HostCtl::Kova::DiskResult> records;
  std::vector<HostCtl::Kova::DiskMapping> groups;
  std::vector<HostCtl::Kova::DiskMapping> unmountedGroups;
  bool autoMode = false;
  HostCtl::Kova::KovaClusterInfoDetailed cluster;
  std::string faultDomain;
  // Makes the interfaces anew for each call; the caller frees them.
  std::function<std::vector<HostCtl::Kova::KovaOtxNicConfig*>()> makeNics;

  // Called at the start of each call, on the calling thread. May throw.
  std::function<void(const KernelCall&)> onCall;
  // Says which locks the calling thread holds; set by the fixture.
  std::function<std::vector<std::string>()> heldLocks;

  // Every call of the operation throws a copy of the exception: before its effect, or after it, when
  // outputs are already filled.
  enum class When { BeforeEffect, AfterEffect };
  template <class Exception>
  void Fail(const std::string& operation, const Exception& exception, When when = When::BeforeEffect) {
    _failures[operation] = {[exception] { throw exception; }, when};
  }
  // The operation works again.
  void Heal(const std::string& operation) { _failures.erase(operation); }

  std::unique_ptr<HostCtl::Kova::KovaInfo> MakeProvider();

  // The calls so far, in the order in which they began.
  std::vector<KernelCall> Calls() const;
  std::vector<std::string> CallTexts() const;
  void ForgetCalls();

 private:
  friend class FakeProvider;

  struct Failure {
    std::function<void()> raise;
    When when = When::BeforeEffect;
  };

  void Begin(const std::string& operation, const std::string& arguments);
  void End(const std::string& operation);

  Timeline& _timeline;
  std::map<std::string, Failure> _failures;
  mutable std::mutex _mutex;  // guards _calls
  std::vector<KernelCall> _calls;
};

}  // namespace TestSupport
