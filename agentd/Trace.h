// A file that shows what the kernel provider was asked to do.
#pragma once

#include <memory>
#include <string>

namespace OtxCtl::Fault {
class CallRecorder;
}

namespace Agentd {

// A recorder that appends one JSON line per call to the file, as soon as the call has ended. Throws
// std::runtime_error that names the file when it cannot be written.
std::shared_ptr<OtxCtl::Fault::CallRecorder> TraceTo(const std::string& path);

}  // namespace Agentd
