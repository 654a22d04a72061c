// The other end of a connection, which says what it was told to, whatever it is asked.
#pragma once

#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <filesystem>
#include <string>
#include <thread>
#include <utility>

#include "events/descriptor.h"
#include "events/unix_address.h"
#include "temporary_folder.h"

namespace simhost::openvswitch {

class Peer {
 public:
  /// Says this to whoever connects first, and listens until that closes the connection.
  explicit Peer(std::string said)
      : listener_(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)), said_(std::move(said)) {
    events::UnixAddress const address(socket());
    if (::bind(listener_.number(), address.get(), address.size()) != 0 ||
        ::listen(listener_.number(), 1) != 0) {
      events::fail_with_errno(socket().native());
    }
    thread_ = std::thread([this] { serve(); });
  }
  ~Peer() {
    if (thread_.joinable()) {
      thread_.join();
    }
  }
  Peer(Peer const &) = delete;
  Peer &operator=(Peer const &) = delete;

  [[nodiscard]] std::filesystem::path socket() const { return folder_.file("socket"); }
  /// All that it heard, once the connection is closed.
  std::string const &heard() {
    thread_.join();
    return heard_;
  }

 private:
  void serve() {
    events::Descriptor const client(::accept(listener_.number(), nullptr, nullptr));
    ::send(client.number(), said_.data(), said_.size(), MSG_NOSIGNAL);
    std::array<char, 4096> part{};
    for (ssize_t count = 1; count > 0;) {
      count = ::recv(client.number(), part.data(), part.size(), 0);
      heard_.append(part.data(), static_cast<std::size_t>(std::max<ssize_t>(count, 0)));
    }
  }

  TemporaryFolder folder_;
  events::Descriptor listener_;
  std::string said_;
  std::string heard_;
  std::thread thread_;
};

}  // namespace simhost::openvswitch
