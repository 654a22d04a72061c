// A server may make a transaction, lose sight of its leader, and make it a second time: what it
// refuses then is looked for before that is believed.
#include "fabric/agent/claim.h"

#include <fmt/format.h>

#include <chrono>
#include <random>
#include <stdexcept>
#include <utility>

namespace simhost::fabric {
namespace {

using namespace std::chrono_literals;

constexpr auto kForName = 4s;
// Nobody asks for the outcome of older changes.
constexpr std::int64_t kKeptSeconds = 3600;

Deadline soon() {
  return Deadline::clock::now() + kForName;
}

std::int64_t long_ago() {
  auto const now = std::chrono::system_clock::now().time_since_epoch();
  return std::chrono::duration_cast<std::chrono::seconds>(now).count() - kKeptSeconds;
}

}  // namespace

std::string random_name() {
  std::random_device random;
  return fmt::format("{:08x}{:08x}", random(), random());
}

Membership membership_in(storage::Store &store, std::string const &host) {
  storage::ReadingTransaction transaction(store);
  auto const found = storage::find_membership(transaction);
  if (found && found->host != host) {
    throw std::runtime_error(
        fmt::format("the state belongs to a fabric as '{}', not as '{}'", found->host, host));
  }
  return found.value_or(Membership{.host = host, .state = random_name()});
}

Claim::Claim(Speaker speaker, std::string state)
    : speaker_(std::move(speaker)), state_(std::move(state)) {}

void Claim::make(Cluster &cluster) {
  auto const row = find_host(cluster.replica(), speaker_.host);
  if (!row) {
    insert_host(cluster);
  } else if (row->state != state_) {
    throw std::runtime_error(fmt::format(
        "the name '{}' is taken by another host; the operators of the fabric can remove its row",
        speaker_.host));
  } else if (row->session != speaker_.session) {
    contend(cluster, *row);
  } else {
    former_session_ = former_if_is_ours_;
  }
  speaks_ = true;
  spoke_ = true;
}

// A server may yet tell of the session that had the name before.
void Claim::contend(Cluster &cluster, HostRow const &row) {
  gave_way_ = spoke_ && row.session != former_session_;
  if (gave_way_) {
    throw std::runtime_error("another simhostd is this host by now");
  }
  if (!speaks_) {
    take_over(cluster, row);
  }
}

void Claim::insert_host(Cluster &cluster) const {
  try {
    cluster.transact(
        Json::array({{{"op", "insert"}, {"table", "Fabric"}, {"row", Json::object()}}}), soon());
  } catch (ovsdb::TransactionRefused const &) {
    // It has its one row already.
  }
  become_speaker(
      cluster,
      Json::array(
          {{{"op", "insert"},
            {"table", "Host"},
            {"row",
             {{"name", speaker_.host}, {"state", state_}, {"session", speaker_.session}}}}}));
}

void Claim::take_over(Cluster &cluster, HostRow const &row) {
  // Of two that took the name from one another again and again there would be no end: whoever spoke
  // takes it from none but the first.
  if (!spoke_) {
    former_if_is_ours_ = row.session;
  }
  auto operations = only_for({.host = speaker_.host, .session = row.session});
  operations.push_back({{"op", "update"},
                        {"table", "Host"},
                        {"where", Json::array({Json::array({"name", "==", speaker_.host})})},
                        {"row", {{"session", speaker_.session}}}});
  become_speaker(cluster, together({operations, old_changes_deletion(speaker_.host, long_ago())}));
  former_session_ = former_if_is_ours_;
}

void Claim::become_speaker(Cluster &cluster, Json const &operations) const {
  try {
    cluster.transact(operations, soon());
  } catch (ovsdb::TransactionRefused const &) {
    auto const found = cluster.transact(session_selection(speaker_.host), soon());
    auto const &rows = found.at(0).at("rows");
    if (rows.empty() || rows.at(0).at("session") != speaker_.session) {
      throw;
    }
  }
}

}  // namespace simhost::fabric
