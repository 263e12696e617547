// The JSON body of a request, read as the arguments of its operation.
//
//   {"disks": ["naa.1", {"canonicalName": "naa.2", "ssd": true}], "label": "rack 3", "wait": false}
//
// A disk is a text, its canonical name, or an object whose missing fields have defaults; a mapping is
// {"ssd": DISK, "nonSsd": [DISK, ..]}. An operation that changes disks also takes `label`, a text of the
// client's own, and `wait`. Bounded and strict: unknown, missing, doubled and mistyped parameters are refused
// by an Orbis::ParseException that names the place and the line.
//
// Threads: any.
#pragma once

#include <string>
#include <string_view>

#include "agentd/routes/Operations.h"

namespace Agentd {

inline constexpr std::size_t longestLabel = 256;  // bytes

struct ReadRequest {
  Arguments arguments;
  std::string label;
  bool wait = true;  // for the answer; otherwise the client is told the task and goes
};

// What a label may be, whichever way it comes; throws ParseException. 0: the line is not known.
void CheckLabel(const std::string& label, int line = 0);

ReadRequest ReadJsonRequest(const Operation& operation, std::string_view body);

}  // namespace Agentd
