#include "agentd/http/UnixSocket.h"

#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <stdexcept>

namespace Agentd {
namespace {

namespace fs = std::filesystem;

sockaddr_un AddressOf(const std::string& path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  if (path.empty() || path.size() >= sizeof address.sun_path) {
    throw std::runtime_error("socket path '" + path + "' must have 1 to " +
                             std::to_string(sizeof address.sun_path - 1) + " bytes");
  }
  std::memcpy(address.sun_path, path.data(), path.size());
  return address;
}

bool SomebodyAnswers(const sockaddr_un& address) {
  const int probe = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  if (probe < 0) {
    throw std::runtime_error(std::string("cannot make a socket: ") + std::strerror(errno));
  }
  const auto* const target = reinterpret_cast<const sockaddr*>(&address);
  const bool answered = connect(probe, target, sizeof address) == 0 || errno == EAGAIN;
  close(probe);
  return answered;
}

}  // namespace

void PrepareSocketPath(const std::string& path) {
  const sockaddr_un address = AddressOf(path);
  std::error_code error;
  const fs::path folder = fs::path(path).parent_path();
  if (!folder.empty() && fs::create_directories(folder, error)) {
    fs::permissions(folder, fs::perms(0750), error);
  }
  if (error) {
    throw std::runtime_error("cannot make the folder " + folder.string() + ": " + error.message());
  }
  const fs::file_status status = fs::symlink_status(path, error);
  if (!fs::exists(status)) {
    return;
  }
  if (!fs::is_socket(status)) {
    throw std::runtime_error(path + " exists and is not a socket");
  }
  if (SomebodyAnswers(address)) {
    throw std::runtime_error("another agent answers on " + path);
  }
  if (!fs::remove(path, error)) {
    throw std::runtime_error("cannot remove the stale socket " + path + ": " + error.message());
  }
}

}  // namespace Agentd
