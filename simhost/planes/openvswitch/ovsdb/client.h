// A client of ovsdb-server: JSON-RPC over a stream.
#pragma once

#include <cstdint>
#include <deque>
#include <filesystem>
#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "planes/openvswitch/ovsdb/json.h"
#include "planes/openvswitch/ovsdb/replica.h"
#include "planes/openvswitch/transport/stream.h"

namespace simhost::ovsdb {

using openvswitch::Deadline;

/// The database refuses a request, in its words.
class Refused : public std::runtime_error {
 public:
  using runtime_error::runtime_error;
};

/// It refuses a transaction, and so has changed nothing.
class TransactionRefused : public Refused {
 public:
  /// `operation` is the place of the one that it refuses; their number, if it is the whole.
  TransactionRefused(std::size_t operation, std::string const &words)
      : Refused(words), operation_(operation) {}

  [[nodiscard]] std::size_t operation() const { return operation_; }

 private:
  std::size_t operation_;
};

/// The replica is another.
struct Changed {
  std::vector<RowChange> rows;
};
/// A lock that was waited for is this client's.
struct LockGained {
  std::string name;
};
/// A lock that was this client's has been stolen.
struct LockLost {
  std::string name;
};
using Event = std::variant<Changed, LockGained, LockLost>;

/// Requests wait for their replies until a deadline; what the database sends by itself in the
/// meantime is kept for next_event(). A client that threw Disconnected, TimedOut or Malformed is of
/// no more use: its owner makes another one.
class Client {
 public:
  /// Of a database such as "Open_vSwitch". Throws Disconnected.
  Client(std::filesystem::path const &socket, std::string database, Deadline deadline,
         openvswitch::Lives lives = {});
  /// Likewise, over a stream to the server.
  Client(openvswitch::Stream stream, std::string database)
      : stream_(std::move(stream)), database_(std::move(database)) {}

  /// For poll(2): readable when there is something to receive.
  [[nodiscard]] int fd() const { return stream_.fd(); }
  /// Whether poll(2) should tell when fd() is writable, for receive().
  [[nodiscard]] bool has_unsent() const { return stream_.has_unsent(); }

  // Neither of these waits. They throw Disconnected and Malformed.

  /// Reads what is there, and sends what is left.
  void receive();
  /// What the database sent by itself, in its order; none when all is told.
  std::optional<Event> next_event();
  /// Asks for what end_monitor() takes: meanwhile the database finds it, of which there is much.
  /// Nothing else may be done with the client until then.
  void begin_monitor(Selected selected);

  // These wait. They throw Disconnected, TimedOut, Malformed and Refused.

  /// Does all of the operations (RFC 7047, section 5.2), or none: throws TransactionRefused.
  /// Returns the results, one for each. Texts are UTF-8: others are std::invalid_argument.
  Json transact(Json const &operations, Deadline deadline);
  /// Fills the replica, and keeps it up to date from now on. Once in a client's life.
  void monitor(Selected const &selected, Deadline deadline);
  /// Returns when that is so after begin_monitor(), at once if it is already.
  void end_monitor(Deadline deadline);
  [[nodiscard]] Replica const &replica() const { return replica_; }
  /// Of the database's schema, such as "1.0.0".
  std::string version(Deadline deadline);
  /// Returns when the server has replied to nothing in particular.
  void echo(Deadline deadline);
  /// Returns when the database has sent something by itself.
  void wait_for_news(Deadline deadline);

  /// Whether the lock is this client's at once; otherwise it waits in the line for it.
  bool lock(std::string const &name, Deadline deadline);
  /// Takes it from whoever has it.
  void steal(std::string const &name, Deadline deadline);
  void unlock(std::string const &name, Deadline deadline);

 private:
  struct Called {
    std::string method;
    std::int64_t id;
  };
  struct Monitor {
    Selected selected;
    Called schema;
    Called rows;
  };

  Json wait_for_message(Deadline deadline);
  Called begin_call(std::string const &method, Json params);
  Json end_call(Called const &called, Deadline deadline);
  Json call(std::string const &method, Json params, Deadline deadline);
  void send(Json const &message);
  /// Replies to an echo, keeps an event; returns whether it was such a message.
  bool is_handled(Json const &message);

  openvswitch::Stream stream_;
  std::string database_;
  Splitter splitter_;
  std::deque<Event> events_;
  Replica replica_;
  std::optional<Monitor> begun_;
  std::int64_t id_ = 0;
};

}  // namespace simhost::ovsdb
