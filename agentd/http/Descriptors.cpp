#include "agentd/http/Descriptors.h"

#include <sys/resource.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>
#include <string>

namespace Agentd {

void RequireDescriptors(std::size_t number) {
  rlimit limit{};
  if (getrlimit(RLIMIT_NOFILE, &limit) != 0) {
    throw std::runtime_error(std::string("cannot tell how many files may be open: ") + std::strerror(errno));
  }
  if (limit.rlim_cur >= number) {
    return;
  }
  const rlimit raised{number, limit.rlim_max};
  if (limit.rlim_max < number || setrlimit(RLIMIT_NOFILE, &raised) != 0) {
    throw std::runtime_error("the connections of these addresses take " + std::to_string(number) +
                             " open files, and this process may have " + std::to_string(limit.rlim_max) +
                             "; raise its limit (ulimit -n), or listen on fewer addresses");
  }
}

}  // namespace Agentd
