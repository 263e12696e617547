// What the agent answers over HTTP, as JSON or as a line of text.
#pragma once

#include <string>
#include <vector>

#include "agentd/http/HttpTypes.h"
#include "agentd/tasks/Task.h"
#include "host/Answer.h"

namespace Agentd {

HttpAnswer PlainText(unsigned status, const std::string& text);

// {"result": .., "fault": ..}; with the status that the fault alone would have. 200 with a result, or without
// both.
HttpAnswer ToHttp(const Host::Answer& answer);

// The same of a result that is still a text.
HttpAnswer ToHttp(const Host::WrittenAnswer& answer);

// The answer of a task that has ended: the same behind {"task": ID, ..}.
HttpAnswer ToHttp(const Task& ended);

// The task itself, with the result of one that has ended.
HttpAnswer DescribeTask(unsigned status, const Task& task);
// {"tasks": [..]}, without results.
HttpAnswer DescribeTasks(const std::vector<Task>& tasks);

}  // namespace Agentd
