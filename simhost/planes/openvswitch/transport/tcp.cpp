// Addresses are numbers, so that nobody is asked before a connection is made.
#include "planes/openvswitch/transport/tcp.h"

#include <arpa/inet.h>
#include <fmt/format.h>
#include <netdb.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <sys/socket.h>

#include <array>
#include <cerrno>
#include <charconv>
#include <memory>

namespace simhost::openvswitch {
namespace {

// Seconds of silence, seconds between two questions whether the other side is there, and how many
// of them remain without a reply.
constexpr int kSilence = 1;
constexpr int kBetween = 1;
constexpr int kQuestions = 3;
constexpr int kUnacknowledged = 4000;  // milliseconds

using Found = std::unique_ptr<addrinfo, decltype(&freeaddrinfo)>;

Found numeric(std::string const &host, std::string const &port) {
  addrinfo wanted{};
  wanted.ai_flags = AI_NUMERICHOST | AI_NUMERICSERV;
  wanted.ai_socktype = SOCK_STREAM;
  addrinfo *found = nullptr;
  if (getaddrinfo(host.c_str(), port.c_str(), &wanted, &found) != 0) {
    found = nullptr;
  }
  return {found, freeaddrinfo};
}

void set_option(events::Descriptor const &socket, int level, int option, int value) {
  setsockopt(socket.number(), level, option, &value, sizeof value);
}

void notice_silence(events::Descriptor const &socket) {
  set_option(socket, IPPROTO_TCP, TCP_NODELAY, 1);
  set_option(socket, SOL_SOCKET, SO_KEEPALIVE, 1);
  set_option(socket, IPPROTO_TCP, TCP_KEEPIDLE, kSilence);
  set_option(socket, IPPROTO_TCP, TCP_KEEPINTVL, kBetween);
  set_option(socket, IPPROTO_TCP, TCP_KEEPCNT, kQuestions);
  set_option(socket, IPPROTO_TCP, TCP_USER_TIMEOUT, kUnacknowledged);
}

[[noreturn]] void fail(std::string const &name, int error) {
  throw Disconnected(name + ": " + error_words(error));
}

void wait_until_connected(std::string const &name, events::Descriptor const &socket,
                          Deadline deadline) {
  pollfd polled{socket.number(), POLLOUT, 0};
  int ready = 0;
  while ((ready = ::poll(&polled, 1, milliseconds_until(deadline))) <= 0) {
    if (ready < 0 && errno != EINTR) {
      fail(name, errno);
    }
    if (ready == 0 && Deadline::clock::now() >= deadline) {
      throw TimedOut(name + ": nobody replies in time");
    }
  }
  int error = 0;
  socklen_t size = sizeof error;
  if (getsockopt(socket.number(), SOL_SOCKET, SO_ERROR, &error, &size) != 0 || error != 0) {
    fail(name, error == 0 ? errno : error);
  }
}

}  // namespace

std::optional<TcpAddress> tcp_address(std::string_view text) {
  auto const colon = text.rfind(':');
  if (colon == std::string_view::npos) {
    return std::nullopt;
  }
  auto host = text.substr(0, colon);
  auto const port = text.substr(colon + 1);
  if (host.starts_with('[') && host.ends_with(']')) {
    host = host.substr(1, host.size() - 2);
  } else if (host.find(':') != std::string_view::npos) {
    return std::nullopt;
  }
  TcpAddress address{.host = std::string(host)};
  auto const [end, error] = std::from_chars(port.data(), port.data() + port.size(), address.port);
  bool const is_number = error == std::errc() && end == port.data() + port.size();
  if (!is_number || address.port == 0 || !numeric(address.host, std::string(port))) {
    return std::nullopt;
  }
  return address;
}

std::string text_of(TcpAddress const &address) {
  return address.host.find(':') == std::string::npos
             ? fmt::format("{}:{}", address.host, address.port)
             : fmt::format("[{}]:{}", address.host, address.port);
}

Stream connected_to(TcpAddress const &address, Deadline deadline, std::string_view protocol) {
  auto const name = fmt::format("{}:{}", protocol, text_of(address));
  auto const found = numeric(address.host, std::to_string(address.port));
  if (!found) {
    fail(name, EADDRNOTAVAIL);
  }
  events::Descriptor socket(
      ::socket(found->ai_family, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, IPPROTO_TCP));
  if (!socket) {
    fail(name, errno);
  }
  notice_silence(socket);
  if (::connect(socket.number(), found->ai_addr, found->ai_addrlen) != 0) {
    if (errno != EINPROGRESS) {
      fail(name, errno);
    }
    wait_until_connected(name, socket, deadline);
  }
  return {name, std::move(socket)};
}

}  // namespace simhost::openvswitch
