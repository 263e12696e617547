// The plug-in's fixture with a manager and what an operation answers in it: for the tests of the operations
// that change disks.
//
// The texts of an answer are filled before the operation starts, so that each test also sees whether they
// were appended to.
#pragma once

#include <gmock/gmock.h>

#include <algorithm>
#include <string>
#include <vector>

#include "nox/Kova.h"
#include "orbis/Soap.h"
#include "orbis/TypeDescriptor.h"
#include "tests/support/Groups.h"
#include "tests/support/Matchers.h"
#include "tests/support/PluginFixture.h"

namespace TestSupport {

inline constexpr const char* takeOperation = "take KovaManager.operation";
inline constexpr const char* releaseOperation = "release KovaManager.operation";
inline constexpr const char* takeCache = "take KovaManager.diskCache";
inline constexpr const char* releaseCache = "release KovaManager.diskCache";

inline constexpr const char* noResultLine = "No result. Operation failed.";
inline constexpr const char* noFaultLine = "No fault. Operation completed successfully";
inline constexpr const char* gotFaultLine = "Got fault %1";
inline constexpr const char* groupLine = "%1: Mapping[%2]: { SSD: %3, MDs: %4 }";

// An object as it stands in a request.
inline std::string SoapText(const Orbis::Any& object) {
  std::string text;
  Orbis::SerializeObjectToSoap(object, nullptr, text);
  return text;
}
template <class T>
std::vector<std::string> SoapTexts(const std::vector<Tessa::Ref<T>>& objects) {
  std::vector<std::string> texts;
  for (const Tessa::Ref<T>& object : objects) {
    texts.push_back(SoapText(*object));
  }
  return texts;
}

// Notes each line of the plug-in in the timeline, filled in, as "log verbose: TEXT".
class TimelineLogger final : public Tessa::Service::Logger {
 public:
  explicit TimelineLogger(Timeline& timeline) : _timeline(timeline) {}
  ~TimelineLogger() override = default;

  Tessa::Service::LogLevel GetLevel() const noexcept override { return Tessa::Service::LogLevel::Verbose; }
  void CreateChild(const std::string&, Tessa::Ref<Tessa::Service::Logger>& child) override { child = this; }
  void Write(Tessa::Service::LogLevel level, std::string_view format,
             std::span<const Tessa::Service::LogArgument> arguments) override {
    _timeline.Note("log " + std::string(Tessa::Service::LevelName(level)) + ": " +
                   Tessa::Service::FormatMessage(format, arguments));
  }

 private:
  Timeline& _timeline;
};

class OperationFixture : public PluginFixture {
 protected:
  using MapResult = Nox::Kova::Host::DiskMapResult;
  using MapResults = Orbis::DataArray<MapResult>;

  OperationFixture() : _manager(MakeManager()) {}

  // A manager of another class, in the place of the plain one. Its hooks reach it too.
  template <class Manager>
  Tessa::Ref<Manager> UseManager() {
    Tessa::Ref<Tessa::Service::Logger> logger = _logger;
    auto manager = Tessa::MakeRef<Manager>(logger);
    _manager = manager;
    Forget();
    return manager;
  }
  // From now on the plug-in's lines stand in the timeline, among locks and calls.
  void LogIntoTimeline() {
    Tessa::Ref<Tessa::Service::Logger> logger = Tessa::MakeRef<TimelineLogger>(_timeline);
    _manager = Tessa::MakeRef<Kovasvc::KovaManagerImpl>(logger);
    Forget();
  }
  // The manager is the one that the hooks call.
  void Publish() { Kovasvc::_kovaManagerImpl = _manager; }

  // What happened so far is not looked at.
  void Forget() {
    _timeline.Take();
    _logger->Clear();
    _kernel.ForgetCalls();
  }
  // The calls of one operation of the kernel.
  std::vector<std::string> Calls(const std::string& operation) const {
    std::vector<std::string> texts;
    for (const KernelCall& call : _kernel.Calls()) {
      if (call.operation == operation) {
        texts.push_back(call.text);
      }
    }
    return texts;
  }
  // The events of the timeline from the first one that is this, or the last so many.
  std::vector<std::string> EventsFrom(const std::string& first) const {
    const std::vector<std::string> events = _timeline.Events();
    return {std::find(events.begin(), events.end(), first), events.end()};
  }
  std::vector<std::string> LastEvents(std::size_t count) const {
    const std::vector<std::string> events = _timeline.Events();
    return {events.end() - static_cast<std::ptrdiff_t>(std::min(count, events.size())), events.end()};
  }
  // Whether the next refresh leaves the kernel alone.
  bool IsCacheValid() {
    const std::size_t before = _kernel.Calls().size();
    _manager->RefreshKovaDiskCache();
    return _kernel.Calls().size() == before;
  }

  bool HasFault() const { return _faultText.size() > _faultBefore.size(); }
  bool HasResult() const { return _resultText.size() > _resultBefore.size(); }
  // The answer's fault, or null.
  Tessa::Ref<Orbis::MethodFault> Fault() const {
    EXPECT_THAT(_faultText, testing::StartsWith(_faultBefore));
    return HasFault() ? ReadAnswer<Orbis::MethodFault>(_faultText.substr(_faultBefore.size())) : nullptr;
  }
  // The answer's results. Fails the test without any.
  Tessa::Ref<MapResults> Results() const {
    EXPECT_THAT(_resultText, testing::StartsWith(_resultBefore));
    EXPECT_TRUE(HasResult());
    return HasResult() ? ReadAnswer<MapResults>(_resultText.substr(_resultBefore.size()))
                       : Tessa::MakeRef<MapResults>();
  }
  // The groups of the results, each with the type of its fault behind a "!", as in "s1: a b !SystemError".
  std::vector<std::string> ResultTexts() const {
    std::vector<std::string> texts;
    const auto results = Results();
    for (const MapResult* result : *results) {
      const auto error = result->GetError();
      texts.push_back(GroupText(*result->GetMapping()) +
                      (error ? std::string(" !") + error->GetType().name : ""));
    }
    return texts;
  }
  // The disks of one result with their states, as in "a inUse".
  static std::vector<std::string> DiskStates(const MapResult& result) {
    std::vector<std::string> texts;
    if (result.GetDiskResult()) {
      for (const Nox::Kova::Host::DiskResult* disk : *result.GetDiskResult()) {
        texts.push_back(disk->GetDisk()->GetCanonicalName() + " " + disk->GetState());
      }
    }
    return texts;
  }
  // Neither text was written to.
  void ExpectTextsUntouched() const {
    EXPECT_EQ(_faultText, _faultBefore);
    EXPECT_EQ(_resultText, _resultBefore);
  }

  Tessa::Ref<Kovasvc::KovaManagerImpl> _manager;
  const std::string _faultBefore = "fault before;";
  const std::string _resultBefore = "result before;";
  std::string _faultText = _faultBefore;
  std::string _resultText = _resultBefore;
};

}  // namespace TestSupport
