#include "agentd/routes/JsonAnswers.h"

#include "nox/Faults.h"
#include "orbis/json/JsonText.h"

namespace Agentd {
namespace {

using Host::Answer;

template <class Fault>
bool IsA(const Orbis::MethodFault* fault) {
  return dynamic_cast<const Fault*>(fault) != nullptr;
}

struct FaultStatus {
  bool (*is)(const Orbis::MethodFault* fault);
  unsigned status;
};

// The first that fits counts; any other fault is the host's.
constexpr FaultStatus faultStatuses[] = {
    {&IsA<Orbis::Fault::InvalidArgument>, 400},
    {&IsA<Nox::Fault::NotPermitted>, 403},
    {&IsA<Nox::Fault::Busy>, 503},
    {&IsA<Nox::Fault::DuplicateDisks>, 400},  // whatever the host is like
    {&IsA<Nox::Fault::HostChanged>, 409},
    {&IsA<Nox::Fault::KovaFault>, 409},  // the disks, as they are now, do not allow it
};
constexpr unsigned faultOfTheHost = 500;

unsigned StatusOf(const Answer& answer) {
  if (!Host::IsFaultAlone(answer)) {
    return 200;
  }
  for (const FaultStatus& row : faultStatuses) {
    if (row.is(answer.fault.Get())) {
      return row.status;
    }
  }
  return faultOfTheHost;
}

HttpAnswer WithStatusOf(const Answer& answer) {
  HttpAnswer http;
  http.status = StatusOf(answer);
  if (const auto* const busy = dynamic_cast<const Nox::Fault::Busy*>(answer.fault.Get())) {
    http.retryAfterSeconds = busy->GetRetryAfterSeconds();
  }
  return http;
}

}  // namespace

HttpAnswer PlainText(unsigned status, const std::string& text) {
  return {status, "text/plain; charset=utf-8", text + "\n"};
}

HttpAnswer ToHttp(const Answer& answer) {
  HttpAnswer http = WithStatusOf(answer);
  WriteJsonAnswer(answer, http.body);
  http.body += "\n";
  return http;
}

HttpAnswer ToHttp(const Task& ended) {
  HttpAnswer http = WithStatusOf(ended.answer);
  std::string answer;
  WriteJsonAnswer(ended.answer, answer);
  http.body = "{\"task\":";
  Orbis::Json::AppendString(ended.id, http.body);
  http.body.append(",").append(answer, 1).append("\n");  // without the answer's own brace
  return http;
}

HttpAnswer DescribeTask(unsigned status, const Task& task) {
  HttpAnswer http;
  http.status = status;
  WriteJson(task, true, http.body);
  http.body += "\n";
  return http;
}

HttpAnswer DescribeTasks(const std::vector<Task>& tasks) {
  HttpAnswer http;
  http.body = "{\"tasks\":[";
  for (const Task& task : tasks) {
    http.body += &task == &tasks.front() ? "" : ",";
    WriteJson(task, false, http.body);
  }
  http.body += "]}\n";
  return http;
}

const Encoding& JsonEncoding() {
  static constexpr Encoding encoding = {
      .answer = [](const Nox::OperationDescriptor&, const Answer& answer) { return ToHttp(answer); },
      .ended = [](const Task& task) { return ToHttp(task); },
      .takenOn = [](const Task& task) { return DescribeTask(202, task); },
      .fault = [](const Answer& fault) { return ToHttp(fault); },
  };
  return encoding;
}

}  // namespace Agentd
