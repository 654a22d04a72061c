#include "planes/openvswitch/transport/stream.h"

#include <poll.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <system_error>
#include <thread>
#include <utility>

#include "events/unix_address.h"

namespace simhost::openvswitch {
namespace {

constexpr std::size_t kChunk = 65536;

events::Descriptor make_socket() {
  int const number = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
  if (number < 0) {
    throw Disconnected("no socket can be made: " + error_words(errno));
  }
  return events::Descriptor(number);
}

events::UnixAddress address_of(std::filesystem::path const &path) {
  try {
    return events::UnixAddress(path);
  } catch (std::system_error const &error) {
    throw Disconnected(path.native() + ": " + error_words(error.code().value()));
  }
}

}  // namespace

Stream::Stream(std::filesystem::path const &path, Deadline deadline, Lives lives)
    : name_(path.native()), socket_(make_socket()), lives_(std::move(lives)) {
  auto const address = address_of(path);
  while (::connect(fd(), address.get(), address.size()) != 0) {
    // A full backlog tells nobody when there is room again.
    if (errno != EAGAIN && errno != EINTR) {
      fail(errno);
    }
    if (Deadline::clock::now() >= deadline) {
      throw TimedOut(name_ + ": nobody accepts the connection in time");
    }
    poll_for(0, 0);
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
}

void Stream::fail(int error) const {
  throw Disconnected(name_ + ": " + error_words(error));
}

void Stream::encrypt(std::unique_ptr<Cipher> cipher, Deadline deadline) {
  cipher_ = std::move(cipher);
  std::vector<std::uint8_t> plain;
  cipher_->decrypt({}, plain, unsent_);
  while (!cipher_->is_agreed()) {
    wait_to_receive(deadline);
    receive(plain);
  }
  early_ = std::move(plain);
}

void Stream::send(std::span<std::uint8_t const> bytes) {
  if (cipher_) {
    cipher_->encrypt(bytes, unsent_);
  } else {
    unsent_.insert(unsent_.end(), bytes.begin(), bytes.end());
  }
  flush();
}

void Stream::flush() {
  while (has_unsent()) {
    auto const count =
        ::send(fd(), unsent_.data() + sent_, unsent_.size() - sent_, MSG_NOSIGNAL | MSG_DONTWAIT);
    if (count < 0 && errno == EAGAIN) {
      return;
    }
    if (count < 0 && errno != EINTR) {
      auto const error = errno;
      hear_complaint();
      fail(error);
    }
    sent_ += static_cast<std::size_t>(std::max<ssize_t>(count, 0));
  }
  unsent_.clear();
  sent_ = 0;
}

// What the other side said before it closed tells more than that it did.
void Stream::hear_complaint() {
  std::array<std::uint8_t, kChunk> chunk{};
  std::vector<std::uint8_t> unused;
  ssize_t count = 0;
  while (cipher_ && (count = ::recv(fd(), chunk.data(), chunk.size(), MSG_DONTWAIT)) > 0) {
    cipher_->decrypt({chunk.data(), static_cast<std::size_t>(count)}, unused, unused);
  }
}

bool Stream::receive(std::vector<std::uint8_t> &to) {
  if (!early_.empty()) {
    auto const early = std::exchange(early_, {});
    to.insert(to.end(), early.begin(), early.end());
    return true;
  }
  // As it is: to clear it takes longer than what comes most of the time.
  std::array<std::uint8_t, kChunk> chunk;
  auto const count = ::recv(fd(), chunk.data(), chunk.size(), MSG_DONTWAIT);
  if (count < 0 && (errno == EAGAIN || errno == EINTR)) {
    return false;
  }
  if (count < 0) {
    fail(errno);
  }
  if (count == 0) {
    throw Disconnected(name_ + ": the other side closed the connection");
  }
  std::span const came(chunk.data(), static_cast<std::size_t>(count));
  if (!cipher_) {
    to.insert(to.end(), came.begin(), came.end());
    return true;
  }
  auto const before = to.size();
  cipher_->decrypt(came, to, unsent_);
  flush();
  return to.size() > before;
}

short Stream::poll_for(short events, int milliseconds) const {
  std::vector<pollfd> all{{.fd = fd(), .events = events, .revents = 0}};
  for (auto const life : lives_) {
    all.push_back({.fd = life, .events = POLLIN, .revents = 0});
  }
  if (::poll(all.data(), all.size(), milliseconds) < 0 && errno != EINTR) {
    fail(errno);
  }
  auto const has_ended = [](pollfd const &life) { return life.revents != 0; };
  // What was said before is heard.
  if ((all.front().revents & POLLIN) == 0 && std::any_of(all.begin() + 1, all.end(), has_ended)) {
    throw Disconnected(name_ + ": nobody replies any more");
  }
  return all.front().revents;
}

void Stream::wait_to_receive(Deadline deadline) {
  while (true) {
    flush();
    if (!early_.empty()) {
      return;
    }
    auto const told = poll_for(static_cast<short>(POLLIN | (has_unsent() ? POLLOUT : 0)),
                               milliseconds_until(deadline));
    if ((told & ~POLLOUT) != 0) {
      return;
    }
    if (told == 0 && Deadline::clock::now() >= deadline) {
      throw TimedOut(name_ + ": no reply in time");
    }
  }
}

}  // namespace simhost::openvswitch
