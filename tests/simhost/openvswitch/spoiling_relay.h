// Between a client and a switch: it spoils some of what the client says, so that the switch refuses
// what it would take.
#pragma once

#include <poll.h>
#include <sys/socket.h>

#include <array>
#include <atomic>
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <thread>
#include <utility>
#include <vector>

#include "events/descriptor.h"
#include "events/unix_address.h"
#include "planes/openvswitch/openflow/codec/messages.h"
#include "planes/openvswitch/openflow/codec/wire.h"
#include "planes/openvswitch/transport/stream.h"
#include "soon.h"
#include "temporary_folder.h"

namespace simhost::openvswitch {

class SpoilingRelay {
 public:
  /// Its socket has the name of the switch's, in a folder of its own. What one client says of flows
  /// with this cookie in bundles, it gives a command that there is not.
  SpoilingRelay(std::filesystem::path const &to, std::uint64_t cookie)
      : cookie_(cookie),
        switch_(to, soon()),
        socket_(folder_.file(to.filename().c_str())),
        listener_(events::owned(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0), "socket")) {
    events::UnixAddress const address(socket_);
    if (::bind(listener_.number(), address.get(), address.size()) != 0 ||
        ::listen(listener_.number(), 1) != 0) {
      events::fail_with_errno(socket_.native());
    }
    thread_ = std::thread([this] { serve(); });
  }
  /// Once the client has closed the connection, if there was one.
  ~SpoilingRelay() {
    ::shutdown(listener_.number(), SHUT_RDWR);
    thread_.join();
  }
  SpoilingRelay(SpoilingRelay const &) = delete;
  SpoilingRelay &operator=(SpoilingRelay const &) = delete;

  /// What is asked from now on about the flows of a table, too.
  void have_refused(std::uint8_t table) { refused_ = table; }

  [[nodiscard]] std::filesystem::path folder() const { return socket_.parent_path(); }

 private:
  void serve() {
    events::Descriptor accepted(
        ::accept4(listener_.number(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
    if (!accepted) {
      return;
    }
    Stream client(socket_.native(), std::move(accepted));
    try {
      while (true) {
        relay(client);
      }
    } catch (Disconnected const &) {
      return;
    }
  }

  void relay(Stream &client) {
    auto const polled = [](Stream const &stream) {
      auto const events = static_cast<short>(POLLIN | (stream.has_unsent() ? POLLOUT : 0));
      return pollfd{.fd = stream.fd(), .events = events, .revents = 0};
    };
    std::array<pollfd, 2> both{polled(client), polled(switch_)};
    ::poll(both.data(), both.size(), -1);
    client.receive(said_);
    switch_.send(take_whole_messages());
    std::vector<std::uint8_t> replies;
    switch_.receive(replies);
    client.send(replies);
  }

  // Those that are there, as the switch is to hear them.
  std::vector<std::uint8_t> take_whole_messages() {
    std::vector<std::uint8_t> whole;
    while (said_.size() >= openflow::kHeaderSize) {
      openflow::Reader in(said_);
      auto const header = openflow::take_header(in);
      if (said_.size() < header.length) {
        break;
      }
      auto const end = said_.begin() + header.length;
      std::vector<std::uint8_t> message(said_.begin(), end);
      said_.erase(said_.begin(), end);
      if (header.type == openflow::MessageType::bundle_add) {
        spoil(message);
      } else if (header.type == openflow::MessageType::multipart_request) {
        spoil_question(message);
      }
      whole.insert(whole.end(), message.begin(), message.end());
    }
    return whole;
  }

  void spoil(std::vector<std::uint8_t> &message) const {
    // What the bundle is told begins with the header of the change.
    constexpr std::size_t kInner = openflow::kHeaderSize + 8;
    constexpr std::size_t kCookie = kInner + openflow::kHeaderSize;
    constexpr std::size_t kCommand = kCookie + 8 + 8 + 1;
    openflow::Reader inner(openflow::BytesView(message).subspan(kInner));
    if (openflow::take_header(inner).type == openflow::MessageType::flow_mod &&
        inner.u64() == cookie_) {
      message.at(kCommand) = 0x7f;
    }
  }

  void spoil_question(std::vector<std::uint8_t> &message) const {
    constexpr std::size_t kTable = openflow::kHeaderSize + 8;
    openflow::Reader in(openflow::BytesView(message).subspan(openflow::kHeaderSize));
    if (in.u16() == static_cast<std::uint16_t>(openflow::MultipartType::flows) &&
        message.at(kTable) == refused_) {
      message.at(openflow::kHeaderSize) = 0x7f;
    }
  }

  std::uint64_t cookie_;
  std::atomic<int> refused_ = -1;  // a table
  Stream switch_;
  TemporaryFolder folder_;
  std::filesystem::path socket_;
  events::Descriptor listener_;
  std::vector<std::uint8_t> said_;
  std::thread thread_;
};

}  // namespace simhost::openvswitch
