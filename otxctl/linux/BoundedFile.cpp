#include "otxctl/linux/BoundedFile.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <system_error>

#include "otxctl/linux/FileDescriptor.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Linux {
namespace {

using Content = Disks::Fact<std::optional<std::string>>;

bool IsNoSuchThing(int error) {
  return error == EINVAL || error == ENXIO || error == ENODATA || error == EOPNOTSUPP;
}

// Room for what most files are, and then for twice as much each time: a file may be far shorter than it is
// allowed to be, and room that is made is paid for. One byte more than allowed tells that a file is too long.
std::size_t NextRoom(std::size_t room, std::size_t most) {
  constexpr std::size_t first = 4097;
  return std::min(most + 1, std::max(first, 2 * room));
}

}  // namespace

std::string CannotRead(const std::string& path, int error) {
  return Tessa::Escape(path) + ": " + std::system_category().message(error);
}

Content ReadWhole(const std::string& path, std::size_t most, Refusal refusal) {
  // Without waiting: what should be a file may be a pipe.
  const FileDescriptor file(
      Uninterrupted([&] { return open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK); }));
  if (!file.IsOpen()) {
    const int error = errno;
    return error == ENOENT ? Content(std::nullopt) : Content::Unknown(CannotRead(path, error));
  }
  std::string bytes;
  for (std::size_t size = 0; size <= most;) {
    if (size == bytes.size()) {
      bytes.resize(NextRoom(size, most));
    }
    const ssize_t count =
        Uninterrupted([&] { return read(file.Get(), bytes.data() + size, bytes.size() - size); });
    if (count < 0) {
      const int error = errno;
      return refusal == Refusal::MeansNone && IsNoSuchThing(error)
                 ? Content(std::nullopt)
                 : Content::Unknown(CannotRead(path, error));
    }
    if (count == 0) {
      bytes.resize(size);
      return Content(std::move(bytes));
    }
    size += static_cast<std::size_t>(count);
  }
  return Content::Unknown(Tessa::Escape(path) + ": longer than " + std::to_string(most) + " bytes");
}

}  // namespace OtxCtl::Linux
