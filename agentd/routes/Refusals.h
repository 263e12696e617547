// What a client is told whose request comes to no operation: in JSON below /api/v1, where a program reads it,
// and in a line of text everywhere else.
//
// Threads: any.
#pragma once

#include <string>
#include <string_view>

#include "agentd/http/HttpTypes.h"

namespace Orbis {
class ParseException;
}

namespace Agentd {

// {"result": null, "fault": InvalidArgument}, whose message is the reason; or the reason in a line. `path` is
// the target as it was sent, or only its path. `argument` names what is wrong, where it is one thing.
HttpAnswer RefusalAt(std::string_view path, unsigned status, const std::string& reason,
                     const std::string& argument = {});

// 400 for a body that cannot be read; the argument is the place in it.
HttpAnswer RefusalAt(std::string_view path, const Orbis::ParseException& refused);

// A line of text that the server itself refuses with, as a client of that path is told it.
HttpAnswer EncodeRefusal(std::string_view path, HttpAnswer refusal);

}  // namespace Agentd
