// What a host says it has counted never falls, be its counters set, or removed by a restart. So it
// may be told late, again, and in any order: what is more than was known is added, and nothing
// counts twice.
#include "fabric/shared/counts.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <optional>
#include <utility>

#include "model/counters/counters.h"
#include "storage/store.h"

namespace simhost::fabric {
namespace {

using storage::ChangingTransaction;
using storage::CountedByHost;
using storage::Membership;
using storage::PortNumber;
using storage::SharedName;

// No host has this name.
constexpr auto *kSeen = "";

std::uint64_t value_of(Counts const &counts, std::string const &name) {
  auto const found = counts.find(name);
  return found == counts.end() ? 0 : found->second;
}

std::uint64_t sum(std::uint64_t value, std::uint64_t more) {
  return value + std::min(more, ~value);
}

Counts counts_of(CountedByHost const &counted, std::string const &host) {
  auto const found = counted.find(host);
  return found == counted.end() ? Counts() : counts_in(found->second);
}

// The counters of a port, and what is known of where they come from.
class PortCounts {
 public:
  PortCounts(ChangingTransaction &transaction, storage::Port const &port, CountedByHost counted)
      : transaction_(transaction),
        owner_{.switch_key = port.switch_key, .port = port.number, .session = {}},
        counted_(std::move(counted)),
        seen_(counts_of(counted_, kSeen)) {}

  void take(std::string const &host, Counts const &now) {
    auto known = counts_of(counted_, host);
    for (auto const &[name, value] : now) {
      auto &before = known[name];
      if (value > before) {
        add(name, value - std::exchange(before, value));
      }
    }
    put(host, known);
  }

  // A counter that is lower than it was has begun anew.
  Counts look(std::string const &host, std::vector<storage::CounterRow> const &rows) {
    auto own = counts_of(counted_, host);
    Counts now;
    for (auto const &[name, value] : rows) {
      if (find_counter(CounterKind::of_port, name) != nullptr && value > 0) {
        auto const before = value_of(seen_, name);
        auto const gained = value < before ? value : value - before;
        now[name] = value;
        if (gained > 0) {
          own[name] = sum(own[name], gained);
        }
      }
    }
    seen_ = std::move(now);
    put(host, own);
    return own;
  }

  // Returns whether anything became other.
  bool save() {
    put(kSeen, seen_);
    return changed_;
  }

 private:
  void add(std::string const &name, std::uint64_t more) {
    auto const greatest = find_counter(CounterKind::of_port, name)->greatest;
    auto const value =
        std::min(storage::find_counter(transaction_, owner_, name).value_or(0), greatest);
    auto const added = std::min(more, greatest - value);
    storage::put_counter(transaction_, owner_, name, value + added);
    seen_[name] = sum(value_of(seen_, name), added);
  }

  void put(std::string const &host, Counts const &counts) {
    auto const text = text_of(counts);
    auto const known = counted_.find(host);
    if (known == counted_.end() ? !counts.empty() : known->second != text) {
      storage::put_counted(transaction_, *owner_.port, host, text);
      counted_[host] = text;
      changed_ = true;
    }
  }

  ChangingTransaction &transaction_;
  CounterOwner owner_;
  CountedByHost counted_;
  Counts seen_;
  bool changed_ = false;
};

std::optional<storage::Port> find_port(storage::Transaction &transaction, SharedName const &name) {
  auto const found =
      storage::find_switch(transaction, storage::SwitchName::identifier, name.switch_identifier);
  return found ? storage::find_port(transaction, found->key, name.port) : std::nullopt;
}

void add_own(ChangingTransaction &transaction, Membership const &membership,
             storage::FoundSwitch const &found, std::map<SharedName, Counts> &all) {
  auto rows = storage::counters_of_ports(transaction, found.key);
  auto counted = storage::counted_of_ports(transaction, found.key);
  for (auto const &[number, of_hosts] : counted) {
    rows[number];  // whose counters may have been removed
  }
  for (auto const &[number, counters] : rows) {
    auto const port = storage::find_port(transaction, number);
    if (!port || port->kind != storage::PortKind::client) {
      continue;
    }
    PortCounts counts(transaction, *port, std::move(counted[number]));
    auto own = counts.look(membership.host, counters);
    counts.save();
    if (!own.empty()) {
      all.emplace(SharedName{found.row.identifier, port->identifier}, std::move(own));
    }
  }
}

}  // namespace

Counts counts_in(std::string_view text) {
  Counts counts;
  auto const said = nlohmann::json::parse(text, nullptr, false);
  if (!said.is_object()) {
    return counts;
  }
  for (auto const &[name, value] : said.items()) {
    if (value.is_number_unsigned() && find_counter(CounterKind::of_port, name) != nullptr) {
      counts[name] = value.get<std::uint64_t>();
    }
  }
  return counts;
}

std::string text_of(Counts const &counts) {
  return nlohmann::json(counts).dump();
}

bool take_counts(ChangingTransaction &transaction,
                 std::map<SharedName, CountsOfHosts> const &of_fabric) {
  bool any = false;
  for (auto const &[name, of_hosts] : of_fabric) {
    auto const port = find_port(transaction, name);
    if (!port) {
      continue;
    }
    PortCounts counts(transaction, *port, storage::counted_of(transaction, port->number));
    for (auto const &[host, now] : of_hosts) {
      if (!host.empty()) {
        counts.take(host, now);
      }
    }
    any = counts.save() || any;
  }
  return any;
}

std::map<SharedName, Counts> own_counts(ChangingTransaction &transaction,
                                        Membership const &membership) {
  std::map<SharedName, Counts> all;
  for (auto const &found : storage::all_switches(transaction)) {
    if (storage::is_shared(transaction, found.row.identifier)) {
      add_own(transaction, membership, found, all);
    }
  }
  return all;
}

}  // namespace simhost::fabric
