// A stream to another process over a socket, which never makes its owner wait unless asked to.
#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <span>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "events/descriptor.h"
#include "planes/openvswitch/transport/system.h"

namespace simhost::openvswitch {

/// The other side cannot be reached, or is gone. what() names it and says why.
class Disconnected : public std::runtime_error {
 public:
  using runtime_error::runtime_error;
};

/// The deadline passed.
class TimedOut : public std::runtime_error {
 public:
  using runtime_error::runtime_error;
};

/// What becomes of bytes before they go over a socket, and when they came. Its functions append,
/// and throw Disconnected.
class Cipher {
 public:
  virtual ~Cipher() = default;
  Cipher() = default;
  Cipher(Cipher const &) = delete;
  Cipher &operator=(Cipher const &) = delete;

  /// Whether the two sides agree on one another, as they must before anything is encrypted.
  [[nodiscard]] virtual bool is_agreed() const = 0;
  virtual void encrypt(std::span<std::uint8_t const> plain, std::vector<std::uint8_t> &to) = 0;
  /// `replies` is what the other side's cipher is to be told. It begins with nothing that came.
  virtual void decrypt(std::span<std::uint8_t const> came, std::vector<std::uint8_t> &to,
                       std::vector<std::uint8_t> &replies) = 0;
};

/// Descriptors that are at their end as soon as those who reply have ended. Sockets tell that
/// later: the kernel takes its time to close what a process had open.
using Lives = std::vector<int>;

class Stream {
 public:
  /// To the unix socket at `path`. Throws Disconnected, and TimedOut where nobody accepts. Nobody
  /// waits any longer once one of `lives` is at its end, which is Disconnected.
  Stream(std::filesystem::path const &path, Deadline deadline, Lives lives = {});
  /// Over a socket that is connected already, and does not block; `name` is the other side's.
  Stream(std::string name, events::Descriptor connected)
      : name_(std::move(name)), socket_(std::move(connected)) {}

  /// For poll(2): readable when there is something to receive.
  [[nodiscard]] int fd() const { return socket_.number(); }
  /// Whether poll(2) should tell when the socket is writable, for send({}).
  [[nodiscard]] bool has_unsent() const { return sent_ < unsent_.size(); }

  // These throw Disconnected.

  /// Returns when the two sides agree; throws TimedOut too. Once, before anything is sent.
  void encrypt(std::unique_ptr<Cipher> cipher, Deadline deadline);
  /// Sends what the socket takes at once, and keeps the rest.
  void send(std::span<std::uint8_t const> bytes);
  /// Appends what is there. Returns whether that was anything.
  bool receive(std::vector<std::uint8_t> &to);
  /// Sends what is left until there is something to receive; throws TimedOut too.
  void wait_to_receive(Deadline deadline);

 private:
  void flush();
  void hear_complaint();
  /// Returns what poll(2) tells of the socket within that time, and throws if nobody is to reply.
  short poll_for(short events, int milliseconds) const;
  [[noreturn]] void fail(int error) const;

  std::string name_;
  events::Descriptor socket_;
  Lives lives_;
  std::unique_ptr<Cipher> cipher_;   // if there is one
  std::vector<std::uint8_t> early_;  // what came with the end of the agreement
  std::vector<std::uint8_t> unsent_;
  std::size_t sent_ = 0;  // of those
};

}  // namespace simhost::openvswitch
