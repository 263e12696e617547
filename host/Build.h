// Which build of the programs this is.
//
// Threads: any. The texts live as long as the process.
#pragma once

#include <string>
#include <string_view>

namespace Host {

// "0.1.0".
std::string_view Version();

// The commit that it was built of, "2b9fadd3c1aa"; with "-dirty" behind it when the sources differed from
// that commit; "unknown" when they were in no repository of their own.
std::string_view BuildId();

// The version of the management API that is spoken.
std::string_view ApiVersion();

// In a line: "0.1.0 (build 2b9fadd3c1aa, API nox.version.unstable)".
std::string VersionLine();

}  // namespace Host
