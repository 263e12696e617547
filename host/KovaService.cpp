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

}  // namespace

Answer KovaService::QueryDisksForKova(const std::vector<std::string>& names) const {
  if (const auto refused = Gate::CheckNames("names", names)) {
    return {.result = nullptr, .fault = refused};
  }
  Answer answer = Ask([&](std::string& faultText, std::string& resultText) {
    std::vector<std::string> wanted = names;
    _hooks.queryDisksForKova(wanted, faultText, resultText);
  });
  if (!answer.result && !answer.fault) {
    return FailedWith("The disks of the host could not be read; the agent's log says why.");
  }
  return answer;
}

}  // namespace Host
