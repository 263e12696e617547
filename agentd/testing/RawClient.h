// A client for tests of the server: it sends exactly the bytes it is given.
#pragma once

#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <chrono>
#include <cstring>
#include <stdexcept>
#include <string>
#include <string_view>

#include "agentd/http/HttpAddress.h"

namespace Agentd::Testing {

struct RawAnswer {
  unsigned status = 0;  // 0: the connection ended without an answer
  std::string header;   // with the status line, in lower case
  std::string body;
};

// Blocks; for one thread.
class RawClient {
 public:
  // Throws std::runtime_error when nobody answers.
  explicit RawClient(const std::string& path) : _socket(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::memcpy(address.sun_path, path.data(), path.size());
    Connect(reinterpret_cast<const sockaddr*>(&address), sizeof address, path);
  }
  // Of TCP, version 4.
  explicit RawClient(const HttpAddress& tcp) : _socket(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(tcp.port);
    inet_pton(AF_INET, tcp.place.c_str(), &address.sin_addr);
    Connect(reinterpret_cast<const sockaddr*>(&address), sizeof address, tcp.Name());
  }
  ~RawClient() { close(_socket); }
  RawClient(const RawClient&) = delete;
  RawClient& operator=(const RawClient&) = delete;

  // False when the other side had gone before all was sent.
  bool Send(std::string_view text) const {
    while (!text.empty()) {
      const ssize_t sent = send(_socket, text.data(), text.size(), MSG_NOSIGNAL);
      if (sent <= 0) {
        return false;
      }
      text.remove_prefix(static_cast<std::size_t>(sent));
    }
    return true;
  }

  // Whether there is something to read, or nothing more will come; waits so long for it.
  bool HasAnswer(std::chrono::milliseconds patience) const {
    pollfd waiting{_socket, POLLIN, 0};
    return poll(&waiting, 1, static_cast<int>(patience.count())) > 0;
  }

  void EndSending() const { shutdown(_socket, SHUT_WR); }

  // The next answer; its body as long as the header says.
  RawAnswer Receive() {
    std::size_t end = 0;
    while ((end = _buffer.find("\r\n\r\n")) == std::string::npos) {
      if (!ReadMore()) {
        return {};
      }
    }
    RawAnswer answer;
    answer.header = Lower(_buffer.substr(0, end));
    answer.status = static_cast<unsigned>(std::stoul(answer.header.substr(answer.header.find(' '))));
    _buffer.erase(0, end + 4);
    const std::string field = "content-length: ";
    const std::size_t at = answer.header.find(field);
    const std::size_t length =
        at == std::string::npos ? 0 : std::stoul(answer.header.substr(at + field.size()));
    while (_buffer.size() < length && ReadMore()) {
    }
    answer.body = _buffer.substr(0, length);
    _buffer.erase(0, length);
    return answer;
  }

  // The header alone, of an answer that has no body whatever its length says.
  std::string ReceiveHeader() {
    std::size_t end = 0;
    while ((end = _buffer.find("\r\n\r\n")) == std::string::npos && ReadMore()) {
    }
    const std::string header = Lower(_buffer.substr(0, end));
    _buffer.erase(0, end == std::string::npos ? end : end + 4);
    return header;
  }

  // Whether the other side ends the connection without another byte.
  bool IsClosed() { return _buffer.empty() && !ReadMore(); }

 private:
  void Connect(const sockaddr* address, socklen_t size, const std::string& name) const {
    if (connect(_socket, address, size) != 0) {
      close(_socket);
      throw std::runtime_error("nobody answers on " + name);
    }
  }

  bool ReadMore() {
    char chunk[4096];
    const ssize_t count = recv(_socket, chunk, sizeof chunk, 0);
    if (count > 0) {
      _buffer.append(chunk, static_cast<std::size_t>(count));
    }
    return count > 0;
  }

  static std::string Lower(std::string text) {
    for (char& byte : text) {
      byte = byte >= 'A' && byte <= 'Z' ? static_cast<char>(byte - 'A' + 'a') : byte;
    }
    return text;
  }

  int _socket;
  std::string _buffer;
};

}  // namespace Agentd::Testing
