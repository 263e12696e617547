#include "tests/support/FakeKernel.h"

#include <algorithm>
#include <iterator>
#include <utility>

namespace TestSupport {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskResult;
using HostCtl::Kova::FormatContext;
using HostCtl::Kova::RemovalOptions;

namespace {

// An empty name is printed as "", so that it is no empty list.
std::string List(const std::vector<std::string>& names) {
  std::string text;
  for (const std::string& name : names) {
    text += (text.empty() ? "" : ", ") + (name.empty() ? "\"\"" : name);
  }
  return "[" + text + "]";
}

std::string Flag(bool flag) {
  return flag ? "true" : "false";
}

std::string Triple(const std::string& text, int first, int second) {
  return "{" + text + ", " + std::to_string(first) + ", " + std::to_string(second) + "}";
}

}  // namespace

class FakeProvider final : public HostCtl::Kova::KovaInfo {
 public:
  explicit FakeProvider(FakeKernel& kernel) : _kernel(kernel) {}
  ~FakeProvider() override { _kernel._timeline.Note("delete provider"); }

  void QueryDisks(const std::vector<std::string>& names, std::vector<DiskResult>& results,
                  bool flag) override {
    Do("QueryDisks", List(names) + ", " + Flag(flag), [&] {
      std::copy_if(_kernel.records.begin(), _kernel.records.end(), std::back_inserter(results),
                   [&names](const DiskResult& record) {
                     return names.empty() ||
                            std::find(names.begin(), names.end(), record.name) != names.end();
                   });
    });
  }
  void GetDiskMappings(std::vector<DiskMapping>& mappings, bool withUnmounted) override {
    Do("GetDiskMappings", Flag(withUnmounted), [&] {
      mappings.insert(mappings.end(), _kernel.groups.begin(), _kernel.groups.end());
      if (withUnmounted) {
        mappings.insert(mappings.end(), _kernel.unmountedGroups.begin(), _kernel.unmountedGroups.end());
      }
    });
  }
  void FormatDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks,
                         const FormatContext& context) override {
    Do("FormatDiskMapping", ssd + ", " + List(capacityDisks) + ", " +
                                Triple(context.requestTag, context.mappingCount, context.mappingIndex));
  }
  void RestampDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks) override {
    Do("RestampDiskMapping", ssd + ", " + List(capacityDisks));
  }
  void MountDiskMapping(const std::string& ssd, bool flag) override {
    Do("MountDiskMapping", ssd + ", " + Flag(flag));
  }
  void RestampDiskMappingByUuid(const std::string& kovaUuid) override {
    Do("RestampDiskMappingByUuid", kovaUuid);
  }
  void RemoveDisk(const std::string& disk, const std::string& passThrough,
                  const RemovalOptions& options) override {
    Do("RemoveDisk", disk + ", " + passThrough + ", " + Triple(options.text, options.first, options.second));
  }
  void RemoveDiskMapping(const std::string& ssd, const std::string& passThrough,
                         const RemovalOptions& options) override {
    Do("RemoveDiskMapping",
       ssd + ", " + passThrough + ", " + Triple(options.text, options.first, options.second));
  }
  void UnmountDiskMapping(const std::string& ssd) override { Do("UnmountDiskMapping", ssd); }
  void RemoveDiskByUuid(const std::string& kovaUuid, const std::string& passThrough) override {
    Do("RemoveDiskByUuid", kovaUuid + ", " + passThrough);
  }
  bool IsAutoModeEnabled() override {
    Do("IsAutoModeEnabled", "");
    return _kernel.autoMode;
  }
  std::vector<HostCtl::Kova::KovaOtxNicConfig*> GetKovaOtxNicConfigs() override {
    Do("GetKovaOtxNicConfigs", "");
    return _kernel.makeNics ? _kernel.makeNics() : std::vector<HostCtl::Kova::KovaOtxNicConfig*>();
  }
  void GetClusterInfoDetailed(HostCtl::Kova::KovaClusterInfoDetailed& info) override {
    Do("GetClusterInfoDetailed", "", [&] { info = _kernel.cluster; });
  }
  std::string GetFaultDomainName() override {
    Do("GetFaultDomainName", "");
    return _kernel.faultDomain;
  }
  void ClaimUnmountedDiskgroups() override { Do("ClaimUnmountedDiskgroups", ""); }
  void RefreshKovaInfo() override { Do("RefreshKovaInfo", ""); }

 private:
  template <class Effect>
  void Do(const std::string& operation, const std::string& arguments, Effect effect) {
    _kernel.Begin(operation, arguments);
    effect();
    _kernel.End(operation);
  }
  void Do(const std::string& operation, const std::string& arguments) {
    Do(operation, arguments, [] {});
  }

  FakeKernel& _kernel;
};

FakeKernel::FakeKernel(Timeline& timeline) : _timeline(timeline) {}
FakeKernel::~FakeKernel() = default;

std::unique_ptr<HostCtl::Kova::KovaInfo> FakeKernel::MakeProvider() {
  return std::make_unique<FakeProvider>(*this);
}

void FakeKernel::Begin(const std::string& operation, const std::string& arguments) {
  const KernelCall call{.operation = operation,
                        .text = operation + "(" + arguments + ")",
                        .locksHeld = heldLocks ? heldLocks() : std::vector<std::string>()};
  {
    const std::lock_guard guard(_mutex);
    _calls.push_back(call);
  }
  _timeline.Note(call.text);
  if (const auto observer = onCall) {  // a copy: an observer may replace itself
    observer(call);
  }
  const auto failure = _failures.find(operation);
  if (failure != _failures.end() && failure->second.when == When::BeforeEffect) {
    failure->second.raise();
  }
}

void FakeKernel::End(const std::string& operation) {
  const auto failure = _failures.find(operation);
  if (failure != _failures.end() && failure->second.when == When::AfterEffect) {
    failure->second.raise();
  }
}

std::vector<KernelCall> FakeKernel::Calls() const {
  const std::lock_guard guard(_mutex);
  return _calls;
}

std::vector<std::string> FakeKernel::CallTexts() const {
  std::vector<std::string> texts;
  for (const KernelCall& call : Calls()) {
    texts.push_back(call.text);
  }
  return texts;
}

void FakeKernel::ForgetCalls() {
  const std::lock_guard guard(_mutex);
  _calls.clear();
}

}  // namespace TestSupport
