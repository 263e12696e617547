// What can be done to a simulated machine beside serving it: look at its description, and change it as no
// request to the plug-in could.
//
// Threads: any. The texts are the machine's own; programs hand them through.
#pragma once

#include <stdexcept>
#include <string>
#include <string_view>

namespace Host {

// A change that is none, or that the machine would not accept. The text begins with the path of what is
// wrong.
class ChangeRefused : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

class Simulation {
 public:
  virtual ~Simulation() = default;

  // The machine as it is now, as its file would hold it.
  virtual std::string Describe() const = 0;

  // Throws ChangeRefused for a text that is no change, whatever the machine is like now.
  virtual void CheckChange(std::string_view change) const = 0;

  // {"set": {key: value, ..}, "disk": {"name": .., key: value, ..}}, either may be missing: changes the
  // machine in one step, and its listener is told. Throws ChangeRefused, or whatever keeps the change from
  // being saved; the machine is then as it was.
  virtual void Change(std::string_view change) = 0;
};

}  // namespace Host
