// How requests are refused: an InvalidArgument whose property is the place in the request ("disks[3]") and
// whose message begins with it.
//
// Threads: any.
#pragma once

#include <string>

namespace Orbis {
class MethodFault;
}

namespace Host {

// Adds a message to the fault: a key for programs, a text for people.
void Explain(Orbis::MethodFault& fault, const char* key, const std::string& text);

// For a request that names what it must not.
inline constexpr const char* invalidArgumentKey = "nox.agentd.gate.invalidArgument";

[[noreturn]] void Refuse(const std::string& property, const std::string& reason);

// The same for a text that begins with the property already.
[[noreturn]] void RefuseWith(const std::string& property, const std::string& text);

// "list[3]".
std::string Indexed(const std::string& list, std::size_t index);

}  // namespace Host
