#include "host/Build.h"

namespace Host {

std::string_view Version() {
  return KOVA_VERSION;
}

std::string_view BuildId() {
  return
#include "host/BuildId.inc"
      ;
}

std::string_view ApiVersion() {
  return "nox.version.unstable";
}

std::string VersionLine() {
  return std::string(Version()) + " (build " + std::string(BuildId()) + ", API " + std::string(ApiVersion()) +
         ")";
}

}  // namespace Host
