#include "agentd/Trace.h"

#include <fstream>
#include <mutex>
#include <stdexcept>

#include "otxctl/fault/CallRecorder.h"

namespace Agentd {
namespace {

struct TraceFile {
  std::mutex mutex;
  std::ofstream stream;
};

}  // namespace

std::shared_ptr<OtxCtl::Fault::CallRecorder> TraceTo(const std::string& path) {
  const auto file = std::make_shared<TraceFile>();
  file->stream.open(path, std::ios::app);
  if (!file->stream) {
    throw std::runtime_error("cannot write the trace file " + path);
  }
  const auto recorder = std::make_shared<OtxCtl::Fault::CallRecorder>();
  // The recorder forgets what is written, so that a long-lived agent does not collect calls.
  recorder->SetEndObserver([file, recorder = std::weak_ptr(recorder)](const OtxCtl::Fault::RecordedCall&) {
    const auto alive = recorder.lock();
    const std::lock_guard guard(file->mutex);
    for (const OtxCtl::Fault::RecordedCall& call : alive->TakeEnded()) {
      file->stream << OtxCtl::Fault::ToJsonLine(call) << "\n";
    }
    file->stream.flush();
    file->stream.clear();  // a full disk may have room again
  });
  return recorder;
}

}  // namespace Agentd
