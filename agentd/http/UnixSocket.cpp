#include "agentd/http/UnixSocket.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <stdexcept>
#include <utility>

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

fs::path FolderOf(const std::string& path) {
  const fs::path folder = fs::path(path).parent_path();
  return folder.empty() ? "." : folder;
}

void MakeFolder(const fs::path& folder) {
  std::error_code error;
  if (fs::create_directories(folder, error)) {
    fs::permissions(folder, fs::perms(0750), error);
  }
  if (error) {
    throw std::runtime_error("cannot make the folder " + folder.string() + ": " + error.message());
  }
}

// Open and locked; -1 where that cannot be done, which only costs the protection against a race.
int LockFolder(const fs::path& folder) {
  const int number = open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  if (number >= 0) {
    while (flock(number, LOCK_EX) != 0 && errno == EINTR) {
    }
  }
  return number;
}

// Whether the socket was left behind by a program that is gone. Throws when that cannot be told.
bool IsStale(const std::string& path, const sockaddr_un& address) {
  const int probe = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
  if (probe < 0) {
    throw std::runtime_error(std::string("cannot make a socket: ") + std::strerror(errno));
  }
  const auto* const target = reinterpret_cast<const sockaddr*>(&address);
  const int error = connect(probe, target, sizeof address) == 0 ? 0 : errno;
  close(probe);
  if (error == 0 || error == EAGAIN) {  // EAGAIN: too busy to answer at once
    throw std::runtime_error("another agent answers on " + path);
  }
  if (error != ECONNREFUSED && error != ENOENT) {
    throw std::runtime_error("cannot tell who uses " + path + ": " + std::strerror(error));
  }
  return error == ECONNREFUSED;
}

void MakeWay(const std::string& path, const sockaddr_un& address) {
  std::error_code error;
  const fs::file_status status = fs::symlink_status(path, error);
  if (!fs::exists(status)) {
    return;
  }
  if (!fs::is_socket(status)) {
    throw std::runtime_error(path + " exists and is not a socket");
  }
  if (IsStale(path, address) && !fs::remove(path, error)) {
    throw std::runtime_error("cannot remove the stale socket " + path + ": " + error.message());
  }
}

}  // namespace

SocketPlace::SocketPlace(const std::string& path) {
  const sockaddr_un address = AddressOf(path);
  MakeFolder(FolderOf(path));
  _folder = LockFolder(FolderOf(path));
  try {
    MakeWay(path, address);
  } catch (...) {
    close(_folder);
    throw;
  }
}

SocketPlace::~SocketPlace() {
  if (_folder >= 0) {
    close(_folder);
  }
}

ProcessCredentials CredentialsOf(int connected) {
  ucred process{};
  socklen_t size = sizeof process;
  if (getsockopt(connected, SOL_SOCKET, SO_PEERCRED, &process, &size) != 0) {
    throw std::runtime_error(std::string("cannot tell who connects: ") + std::strerror(errno));
  }
  std::vector<gid_t> groups(16);
  for (;;) {
    size = static_cast<socklen_t>(groups.size() * sizeof(gid_t));
    const int failed = getsockopt(connected, SOL_SOCKET, SO_PEERGROUPS, groups.data(), &size);
    if (failed != 0 && errno != ERANGE) {
      throw std::runtime_error(std::string("cannot tell the groups of who connects: ") +
                               std::strerror(errno));
    }
    groups.resize(size / sizeof(gid_t));  // too few: as many as there are
    if (failed == 0) {
      break;
    }
  }
  groups.push_back(process.gid);
  return {process.uid, std::move(groups)};
}

}  // namespace Agentd
