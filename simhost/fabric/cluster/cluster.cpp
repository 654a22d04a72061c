// What a server tells of itself is followed like any other rows, over a connection of its own,
// because a client follows one database.
#include "fabric/cluster/cluster.h"

#include <fmt/format.h>
#include <fmt/ranges.h>

#include <algorithm>
#include <iterator>
#include <utility>
#include <variant>

namespace simhost::fabric {
namespace {

using namespace std::chrono_literals;

// For a server to accept a connection, and for each thing that it says of itself.
constexpr auto kPatience = 2s;
// For one that has done so to say what it has, which may be much.
constexpr auto kPatienceWithContents = 10s;

Deadline reply_deadline() {
  return Deadline::clock::now() + kPatience;
}

// A server that will not do, and why.
class Unfit : public std::runtime_error {
  using std::runtime_error::runtime_error;
};

std::optional<ovsdb::Row> row_of(ovsdb::Replica const &replica, std::string const &database) {
  for (auto const &[uuid, row] : replica.rows("Database")) {
    if (row.at("name") == database) {
      return row;
    }
  }
  return std::nullopt;
}

std::vector<ovsdb::RowChange> news_of(ovsdb::Client &client) {
  std::vector<ovsdb::RowChange> news;
  client.receive();
  while (auto event = client.next_event()) {
    if (auto *const changed = std::get_if<ovsdb::Changed>(&*event)) {
      std::ranges::move(changed->rows, std::back_inserter(news));
    }
  }
  return news;
}

}  // namespace

Cluster::Cluster(Servers servers, Database database)
    : servers_(std::move(servers)), database_(std::move(database)) {}

std::string Cluster::server() const {
  return text_of(servers_.all[next_]);
}

// Lets go of a server that failed, and goes on with the next one.
template <typename Work>
auto Cluster::guarded(Work const &work) {
  try {
    return work();
  } catch (ovsdb::TransactionRefused const &) {
    throw;
  } catch (std::runtime_error const &error) {
    disconnect();
    next_ = (next_ + 1) % servers_.all.size();
    throw Unreachable(error.what());
  }
}

void Cluster::connect() {
  std::vector<std::string> reasons;
  bool is_other_version = false;
  for (std::size_t tried = 0; tried < servers_.all.size(); ++tried) {
    try {
      guarded([&] {
        try {
          connect_to(servers_.all[next_]);
        } catch (WrongVersion const &) {
          is_other_version = true;
          throw;
        }
      });
      return;
    } catch (Unreachable const &why) {
      // A file that will not do is no server's own reason.
      if (std::ranges::find(reasons, why.what()) == reasons.end()) {
        reasons.emplace_back(why.what());
      }
    }
  }
  auto const all = fmt::format("{}", fmt::join(reasons, "; "));
  if (is_other_version) {
    throw WrongVersion(all);
  }
  throw Unreachable(all);
}

void Cluster::connect_to(Server const &server) {
  auto const stream = [&] { return connected_to(server, servers_.credentials, reply_deadline()); };
  connection_.emplace(Connection{{stream(), database_.name}, {stream(), "_Server"}});
  connection_->server.monitor({{"Database", {"name", "connected", "cid", "index"}}},
                              reply_deadline());
  check_server();
  auto const version = connection_->database.version(reply_deadline());
  if (!version.starts_with(database_.version)) {
    throw WrongVersion(
        fmt::format("{}: its database '{}' has a schema of version {}, which is none "
                    "of {}x",
                    this->server(), database_.name, version, database_.version));
  }
  connection_->database.monitor(database_.selected, Deadline::clock::now() + kPatienceWithContents);
  ++connections_;
}

// A database that is none of a cluster is connected to itself, and has no log.
void Cluster::check_server() {
  auto const row = row_of(connection_->server.replica(), database_.name);
  if (!row) {
    throw Unfit(fmt::format("{}: it has no database '{}'", server(), database_.name));
  }
  if (!row->at("connected").get<bool>()) {
    throw Unfit(server() + ": it has lost the majority of its cluster");
  }
  auto const &cluster = row->at("cid");
  std::int64_t index = 0;
  for (auto const &atom : ovsdb::atoms_of(row->at("index"))) {
    index = atom.get<std::int64_t>();
  }
  if (cluster_ == cluster && index < index_) {
    throw Unfit(server() + ": it has not yet all that another one of its cluster said");
  }
  cluster_ = cluster;
  index_ = index;
}

std::array<int, 2> Cluster::descriptors() const {
  return {connection_->database.fd(), connection_->server.fd()};
}

std::vector<ovsdb::RowChange> Cluster::receive() {
  return guarded([&] {
    if (!news_of(connection_->server).empty()) {
      check_server();
    }
    return news_of(connection_->database);
  });
}

Json Cluster::transact(Json const &operations, Deadline deadline) {
  return guarded([&] { return connection_->database.transact(operations, deadline); });
}

void Cluster::require_reply(Deadline deadline) {
  guarded([&] { connection_->database.echo(deadline); });
}

}  // namespace simhost::fabric
