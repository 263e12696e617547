#include "host/KovaService.h"

#include <exception>

#include "host/Gate.h"

namespace Host {
namespace {

// Calls a hook with empty texts and reads what it appended.
template <class Call>
Answer Ask(Call call) {
  std::string faultText;
  std::string resultText;
  try {
    call(faultText, resultText);
    return ReadAnswer(faultText, resultText);
  } catch (const std::exception& exception) {
    return FailedWith(exception.what());
  }
}

// A query that was answered with nothing at all has failed.
Answer OrFailed(Answer answer, const char* reason) {
  return answer.result || answer.fault ? answer : FailedWith(reason);
}

}  // namespace

Answer KovaService::QueryDisksForKova(const std::vector<std::string>& names) const {
  if (const auto refused = Gate::CheckNames("names", names)) {
    return {.result = nullptr, .fault = refused};
  }
  return OrFailed(Ask([&](std::string& faultText, std::string& resultText) {
                    std::vector<std::string> wanted = names;
                    _hooks.queryDisksForKova(wanted, faultText, resultText);
                  }),
                  "The disks of the host could not be read; the agent's log says why.");
}

Answer KovaService::GetStorageInfo() const {
  return OrFailed(Ask([&](std::string&, std::string& resultText) { _hooks.getStorageInfo(resultText); }),
                  "The disk groups of the host could not be read; the agent's log says why.");
}

Answer KovaService::GetConfigInfo() const {
  return OrFailed(Ask([&](std::string&, std::string& resultText) { _hooks.getConfigInfo(resultText); }),
                  "The configuration of the host could not be read; the agent's log says why.");
}

}  // namespace Host
