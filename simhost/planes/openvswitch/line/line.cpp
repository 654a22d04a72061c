// Asking over a connection for each question, so that a fork shares none.
#include "planes/openvswitch/line/line.h"

#include <fmt/format.h>
#include <poll.h>
#include <sys/socket.h>

#include <array>
#include <cerrno>
#include <system_error>

#include "events/descriptor.h"
#include "events/unix_address.h"

namespace simhost::openvswitch {
namespace {

using events::Descriptor;
using Clock = std::chrono::steady_clock;

[[noreturn]] void fail(std::string_view what, int error) {
  throw NoDaemon(fmt::format("{}: {}", what, std::generic_category().message(error)));
}

Descriptor connected(std::filesystem::path const &path) {
  try {
    events::UnixAddress const address(path);
    auto socket_ =
        events::owned(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0), "socket");
    if (connect(socket_.number(), address.get(), address.size()) != 0) {
      events::fail_with_errno("connect");
    }
    return socket_;
  } catch (std::system_error const &error) {
    throw NobodyListens(fmt::format("no simhostd: {}", error.code().message()));
  }
}

// Waits until the socket is ready for `event`.
void wait_for(Descriptor const &socket, short event, Clock::time_point deadline) {
  while (true) {
    auto const left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now());
    if (left.count() <= 0) {
      throw NoDaemon("simhostd says nothing in time");
    }
    pollfd polled{.fd = socket.number(), .events = event, .revents = 0};
    auto const ready = poll(&polled, 1, static_cast<int>(left.count()));
    if (ready < 0 && errno != EINTR) {
      fail("no simhostd", errno);
    }
    if (ready > 0) {
      return;
    }
  }
}

void send_all(Descriptor const &socket, std::string_view text, Clock::time_point deadline) {
  while (!text.empty()) {
    auto const sent = send(socket.number(), text.data(), text.size(), MSG_NOSIGNAL);
    if (sent > 0) {
      text.remove_prefix(static_cast<std::size_t>(sent));
    } else if (errno == EAGAIN) {
      wait_for(socket, POLLOUT, deadline);
    } else if (errno != EINTR) {
      fail("simhostd is gone", errno);
    }
  }
}

std::string next_line(Descriptor const &socket, Clock::time_point deadline) {
  Lines lines;
  std::array<char, 16384> part{};
  while (true) {
    auto const size = recv(socket.number(), part.data(), part.size(), 0);
    if (size == 0) {
      throw NoDaemon("simhostd ended");
    }
    if (size > 0) {
      lines.add({part.data(), static_cast<std::size_t>(size)});
      if (auto line = lines.next()) {
        return *std::move(line);
      }
    } else if (errno == EAGAIN) {
      wait_for(socket, POLLIN, deadline);
    } else if (errno != EINTR) {
      fail("simhostd is gone", errno);
    }
  }
}

}  // namespace

std::filesystem::path socket_of(std::filesystem::path const &state) {
  auto socket = state;
  socket += "-simhostd";
  return socket;
}

std::optional<std::string> Lines::next() {
  auto const end = left_.find('\n', searched_);
  if (end == std::string::npos) {
    searched_ = left_.size();
    if (searched_ > kLongestLine) {
      throw NoDaemon("a line is too long");
    }
    return std::nullopt;
  }
  auto line = left_.substr(0, end);
  left_.erase(0, end + 1);
  searched_ = 0;
  return line;
}

Json ask_at(std::filesystem::path const &path, Json const &question,
            std::chrono::milliseconds patience) {
  auto const deadline = Clock::now() + patience;
  auto const socket = connected(path);
  send_all(socket, question.dump() + "\n", deadline);
  auto reply = Json::parse(next_line(socket, deadline), nullptr, false);
  if (!reply.is_object()) {
    throw NoDaemon("simhostd says what nobody understands");
  }
  return reply;
}

Json ask(std::filesystem::path const &state, Json const &question,
         std::chrono::milliseconds patience) {
  return ask_at(socket_of(state), question, patience);
}

}  // namespace simhost::openvswitch
