#include "tests/support/FakeKernel.h"

#include <algorithm>
#include <iterator>
#include <utility>

#include "otxctl/provider/ForwardingProvider.h"

namespace TestSupport {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskResult;
using HostCtl::Kova::FormatContext;
using HostCtl::Kova::RemovalOptions;
using OtxCtl::Provider::ForwardingProvider;
using OtxCtl::Provider::ProviderCall;

namespace {

// What the test put into the kernel.
class FakeAnswers final : public ForwardingProvider {
 public:
  explicit FakeAnswers(const FakeKernel& kernel) : _kernel(kernel) {}

  void QueryDisks(const std::vector<std::string>& names, std::vector<DiskResult>& results, bool) override {
    std::copy_if(_kernel.records.begin(), _kernel.records.end(), std::back_inserter(results),
                 [&names](const DiskResult& record) {
                   return names.empty() || std::find(names.begin(), names.end(), record.name) != names.end();
                 });
  }
  void GetDiskMappings(std::vector<DiskMapping>& mappings, bool withUnmounted) override {
    mappings.insert(mappings.end(), _kernel.groups.begin(), _kernel.groups.end());
    if (withUnmounted) {
      mappings.insert(mappings.end(), _kernel.unmountedGroups.begin(), _kernel.unmountedGroups.end());
    }
  }
  bool IsAutoModeEnabled() override { return _kernel.autoMode; }
  std::vector<HostCtl::Kova::KovaOtxNicConfig*> GetKovaOtxNicConfigs() override {
    return _kernel.makeNics ? _kernel.makeNics() : std::vector<HostCtl::Kova::KovaOtxNicConfig*>();
  }
  void GetClusterInfoDetailed(HostCtl::Kova::KovaClusterInfoDetailed& info) override {
    info = _kernel.cluster;
  }
  std::string GetFaultDomainName() override { return _kernel.faultDomain; }

 private:
  const FakeKernel& _kernel;
};

std::string Text(bool flag) {
  return flag ? "true" : "false";
}

std::string Text(const std::string& text) {
  return text;
}

// An empty name is printed as "", so that it is no empty list.
std::string Text(const std::vector<std::string>& names) {
  std::string text;
  for (const std::string& name : names) {
    text += (text.empty() ? "" : ", ") + (name.empty() ? "\"\"" : name);
  }
  return "[" + text + "]";
}

std::string Triple(const std::string& text, int first, int second) {
  return "{" + text + ", " + std::to_string(first) + ", " + std::to_string(second) + "}";
}

std::string Text(const FormatContext& context) {
  return Triple(context.requestTag, context.mappingCount, context.mappingIndex);
}

std::string Text(const RemovalOptions& options) {
  return Triple(options.text, options.first, options.second);
}

std::string ArgumentsOf(const ProviderCall& call) {
  std::string text;
  const char* separator = "";
  for (const OtxCtl::Provider::Input& input : call.inputs) {
    text += separator + std::visit([](const auto& given) { return Text(given); }, input);
    separator = ", ";
  }
  return text;
}

}  // namespace

class FakeProvider final : public ForwardingProvider {
 public:
  explicit FakeProvider(FakeKernel& kernel)
      : ForwardingProvider(std::make_shared<FakeAnswers>(kernel)), _kernel(kernel) {}
  ~FakeProvider() override { _kernel._timeline.Note("delete provider"); }

 protected:
  void AroundCall(const ProviderCall& call, const Forward& forward) override {
    const std::string operation(call.operation);
    _kernel.Begin(operation, ArgumentsOf(call));
    forward();
    _kernel.End(operation);
  }

 private:
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
