// What the agent answers over HTTP, as JSON or as a line of text.
#pragma once

#include <string>
#include <vector>

#include "agentd/http/HttpTypes.h"
#include "agentd/routes/Dispatch.h"
#include "agentd/tasks/Task.h"
#include "host/Answer.h"

namespace Agentd {

HttpAnswer PlainText(unsigned status, const std::string& text);

// To a query, {"result": .., "fault": ..}. A fault alone, or beside an empty list, has the status of its
// kind; everything else has 200.
HttpAnswer ToHttp(const Host::Answer& answer);

// The answer of a task that has ended: the same behind {"task": ID, ..}.
HttpAnswer ToHttp(const Task& ended);

// The task itself, with the result of one that has ended.
HttpAnswer DescribeTask(unsigned status, const Task& task);
// {"tasks": [..]}, without results.
HttpAnswer DescribeTasks(const std::vector<Task>& tasks);

// All of this, for requests that are dispatched.
const Encoding& JsonEncoding();

}  // namespace Agentd
