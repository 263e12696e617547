// A provider that writes down every call to another one, and fails or waits on demand.
//
// It shares the recorder (CallRecorder.h). Safe from any thread if the other provider is.
#pragma once

#include <memory>

#include "otxctl/fault/CallRecorder.h"
#include "otxctl/provider/ForwardingProvider.h"

namespace OtxCtl::Fault {

class RecordingProvider final : public Provider::ForwardingProvider {
 public:
  RecordingProvider(std::shared_ptr<HostCtl::Kova::KovaInfo> target, std::shared_ptr<CallRecorder> recorder);

 private:
  // Records the call, carries it out and records how it ended.
  void AroundCall(const Provider::ProviderCall& call, const Forward& forward) override;

  const std::shared_ptr<CallRecorder> _recorder;
};

}  // namespace OtxCtl::Fault
