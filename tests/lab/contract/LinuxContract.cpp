// The contract, kept by the provider of Linux on real disks. Run in the lab's machine, as root: it writes to
// the disks that KOVA_LAB_DISKS names.
#include <cstdlib>
#include <exception>
#include <iostream>
#include <string>

#include "otxctl/contract/ProviderContract.h"
#include "tests/lab/contract/RealHost.h"

namespace OtxCtl::Contract {
namespace {

Lab::LabMachine MachineOfTheEnvironment() {
  const char* const disks = std::getenv("KOVA_LAB_DISKS");
  return Lab::LabMachine(disks == nullptr ? "" : disks);
}

ContractSubject RealDisks() {
  return {"Real",
          [](const Sim::HostDescription& host) { return Lab::MakeRealHost(MachineOfTheEnvironment(), host); },
          {}};
}

INSTANTIATE_TEST_SUITE_P(Linux, ProviderContract, testing::Values(RealDisks()), SubjectName);

}  // namespace
}  // namespace OtxCtl::Contract

// "restore" in the place of options: no test is run, and the machine is as before all of them.
int main(int count, char** arguments) {
  try {
    if (count == 2 && std::string(arguments[1]) == "restore") {
      OtxCtl::Contract::MachineOfTheEnvironment().Restore();
      return 0;
    }
  } catch (const std::exception& error) {
    std::cerr << error.what() << "\n";
    return 1;
  }
  testing::InitGoogleTest(&count, arguments);
  return RUN_ALL_TESTS();
}
