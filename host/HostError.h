// Why a host program cannot start or go on, in words for its operator.
#pragma once

#include <stdexcept>

namespace Host {

class HostError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

}  // namespace Host
