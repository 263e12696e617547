// How a command ended, as scripts see it.
#pragma once

#include <stdexcept>

namespace Kovactl {

enum class ExitStatus : int {
  Done = 0,
  Fault = 1,        // the host answered with a fault
  BadInput = 2,     // usage, a file or a name
  Unreachable = 3,  // no agent answers, or none that can be trusted
  Panic = 70,       // the plug-in ended the process
};

// What somebody gave the command cannot be used; the text says what and why.
class BadInput : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

}  // namespace Kovactl
