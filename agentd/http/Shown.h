// What a client sent, made fit to stand in an answer or a log.
#pragma once

#include <string>
#include <string_view>

namespace Agentd {

// Letters, digits and what cannot end a quotation or begin a tag, a line or an escape; every other byte is
// written as "\xNN". Cut off after some 64 bytes.
std::string Shown(std::string_view text);

}  // namespace Agentd
