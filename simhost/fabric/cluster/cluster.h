// A clustered OVSDB: several servers of one database, of which one is talked to that is connected
// to the majority. Any of them will do, not only the leader: what a transaction assumes is checked
// where it is committed, and a connection to a follower outlasts an election.
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "fabric/cluster/servers.h"
#include "planes/openvswitch/ovsdb/client.h"

namespace simhost::fabric {

using openvswitch::Deadline;
using ovsdb::Json;

/// No server can be asked; what() says why, one after the other. Nothing is known of a transaction
/// that was on its way.
class Unreachable : public std::runtime_error {
  using std::runtime_error::runtime_error;
};

/// The database has a schema of another version.
class WrongVersion : public Unreachable {
  using Unreachable::Unreachable;
};

class Cluster {
 public:
  /// The versions of the schema that fit begin with `version`, as in "1.".
  struct Database {
    std::string name;
    std::string version;
    ovsdb::Selected selected;
  };

  Cluster(Servers servers, Database database);

  [[nodiscard]] bool is_connected() const { return connection_.has_value(); }
  /// Looks for a server that has the majority with it and all that was seen before, each once, the
  /// next one first. Throws Unreachable.
  void connect();
  void disconnect() { connection_.reset(); }
  /// How often it has connected. Nobody tells of what became of the replica in between.
  [[nodiscard]] std::uint64_t connections() const { return connections_; }

  // Of a connection. These throw Unreachable, and there is none any more then.

  /// For poll(2): there is something to receive where one of them is readable.
  [[nodiscard]] std::array<int, 2> descriptors() const;
  /// Reads what is there. Returns which rows of the replica have changed since.
  std::vector<ovsdb::RowChange> receive();
  /// As ovsdb::Client does: throws TransactionRefused, too.
  Json transact(Json const &operations, Deadline deadline);
  /// Returns when the server has replied: the kernel keeps up a connection for one that hangs. What
  /// came with the reply is for receive().
  void require_reply(Deadline deadline);
  [[nodiscard]] ovsdb::Replica const &replica() const { return connection_->database.replica(); }
  /// The server that is talked to.
  [[nodiscard]] std::string server() const;

 private:
  // To one server: of the database, and of what the server tells of itself.
  struct Connection {
    ovsdb::Client database;
    ovsdb::Client server;
  };

  void connect_to(Server const &server);
  void check_server();
  template <typename Work>
  auto guarded(Work const &work);

  Servers servers_;
  Database database_;
  std::size_t next_ = 0;  // server to be tried
  std::optional<Connection> connection_;
  std::uint64_t connections_ = 0;
  std::optional<Json> cluster_;  // its identity
  std::int64_t index_ = 0;       // of the last entry of its log that was seen
};

}  // namespace simhost::fabric
