// The machine that the lab's contract tests run on, and the disks of it that they may write to: those that
// the environment's KOVA_LAB_DISKS names, and no other.
//
// Errors: what cannot be done is a std::runtime_error that says what it was.
#pragma once

#include <map>
#include <string>
#include <vector>

namespace Lab {

// Runs a script in bash. Throws unless it ends with status 0; returns what it printed.
std::string Shell(const std::string& script);

class LabMachine {
 public:
  // Where changes leave word of what they do.
  static constexpr const char* stateFolder = "/run/contract";

  // "KIND:SERIAL KIND:SERIAL ...": disks by kind ("flash", "hdd", "usb", "tiny", "remote") and serial number.
  explicit LabMachine(const std::string& disks);

  // Serial numbers.
  const std::vector<std::string>& DisksOf(const std::string& kind) const;

  // Whatever state the machine is in: nothing is mapped to its disks, all are there, and they are blank.
  void Restore() const;

 private:
  std::map<std::string, std::vector<std::string>> _serials;
};

}  // namespace Lab
