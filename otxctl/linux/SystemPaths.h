// Where the kernel shows what it knows. Tests put recorded folders in their place.
#pragma once

#include <string>

namespace OtxCtl::Linux {

struct SystemPaths {
  std::string sys = "/sys";
  std::string proc = "/proc";
  std::string dev = "/dev";
};

}  // namespace OtxCtl::Linux
