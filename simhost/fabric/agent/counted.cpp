// Of a port that the fabric has no longer nothing is told.
#include "fabric/agent/counted.h"

#include <algorithm>
#include <map>
#include <utility>

#include "fabric/rows/operations.h"
#include "fabric/shared/counts.h"
#include "storage/running/frames.h"

namespace simhost::fabric {
namespace {

std::string text_by(ovsdb::Row const &row, std::string const &host) {
  for (auto const &[name, text] : ovsdb::entries_of(row.at("counters"))) {
    if (name == host) {
      return text;
    }
  }
  return {};
}

// Wherever the ports are connected.
std::map<SharedName, CountsOfHosts> told_by(ovsdb::Replica const &replica,
                                            std::string const &host) {
  std::map<SharedName, CountsOfHosts> told;
  for (auto const &[uuid, row] : replica.rows("Port")) {
    if (auto const text = text_by(row, host); !text.empty()) {
      told[port_in(row)][host] = counts_in(text);
    }
  }
  return told;
}

// Those that the fabric has otherwise, by the switches and the UUIDs of the ports.
std::map<std::string, std::map<std::string, std::string>> others(
    ovsdb::Replica const &replica, std::string const &host,
    std::map<SharedName, Counts> const &own) {
  std::map<std::string, std::map<std::string, std::string>> texts;
  for (auto const &[uuid, row] : replica.rows("Port")) {
    auto const counts = own.find(port_in(row));
    if (counts == own.end()) {
      continue;
    }
    if (auto text = text_of(counts->second); text != text_by(row, host)) {
      texts[counts->first.switch_identifier].emplace(uuid, std::move(text));
    }
  }
  return texts;
}

}  // namespace

bool lets_any_go(ovsdb::Replica const &replica, std::vector<ovsdb::RowChange> const &changes,
                 std::string const &host) {
  return std::ranges::any_of(changes, [&](ovsdb::RowChange const &change) {
    if (change.table != "Port" || !change.before || change.before->at("host") != host) {
      return false;
    }
    auto const now = replica.rows("Port").find(change.uuid);
    return now != replica.rows("Port").end() && now->second.at("host") != host;
  });
}

std::optional<Untold> untold(storage::Store &store, ovsdb::Replica const &replica,
                             storage::Membership const &membership) {
  auto const told = told_by(replica, membership.host);
  std::map<SharedName, Counts> own;
  Untold untold;
  bool const has_looked =
      storage::commit_if_free(store, [&](storage::ChangingTransaction &transaction) {
        take_counts(transaction, told);
        own = own_counts(transaction, membership);
        untold.change = storage::frames_change(transaction).value_or(0);
      });
  if (!has_looked) {
    return std::nullopt;
  }
  for (auto const &[switch_identifier, counts] : others(replica, membership.host, own)) {
    untold.operations[switch_identifier] = counts_update(membership.host, counts);
  }
  return untold;
}

}  // namespace simhost::fabric
