// From the state to rows.
#include "fabric/shared/records.h"

#include <fmt/format.h>

#include <algorithm>
#include <optional>
#include <utility>

#include "base/outcomes.h"
#include "fabric/shared/settings.h"
#include "storage/running/devices.h"
#include "storage/store.h"

namespace simhost::fabric {
namespace {

using storage::Shared;
using storage::Transaction;

std::optional<storage::FoundSwitch> find_switch(Transaction &transaction,
                                                std::string const &identifier) {
  return storage::find_switch(transaction, storage::SwitchName::identifier, identifier);
}

Json record_of(Transaction &transaction, storage::FoundSwitch const &found, Json hosts) {
  return {{"alias", found.row.alias},
          {"hosts", std::move(hosts)},
          {"settings", settings_of(transaction, found)}};
}

// One that has a device is here; one that is somewhere else stays there.
Json record_of(Transaction &transaction, storage::Port const &port, Membership const &membership,
               std::string const &before) {
  auto const elsewhere = before == membership.host ? std::string() : before;
  auto const host = storage::device_of(transaction, port.number) ? membership.host : elsewhere;
  return {{"host", host}, {"settings", settings_of(transaction, port)}};
}

[[noreturn]] void refuse_unborne(std::string const &what) {
  throw Refused(QEX_BUSY, fmt::format("{} is other in the fabric than this host can bear", what));
}

class Comparison {
 public:
  Comparison(Transaction &transaction, Membership const &membership)
      : transaction_(transaction), membership_(membership) {}

  std::vector<Change> changes() {
    for (auto const &name : storage::touched(transaction_)) {
      if (!storage::is_shared(transaction_, name.switch_identifier)) {
        continue;
      }
      auto const found = find_switch(transaction_, name.switch_identifier);
      if (!found) {
        leave(name);
      } else if (name.port.empty()) {
        compare_switch(*found, *storage::find_shared(transaction_, name));
      } else {
        compare_port(*found, name);
      }
    }
    return std::move(changes_);
  }

 private:
  void compare_switch(storage::FoundSwitch const &found, Shared const &row) {
    if (row.fabric.empty()) {
      add(row.name, nullptr, record_of(transaction_, found, Json::array({membership_.host})));
    } else if (image_of(transaction_, found) != row.image) {
      if (!row.fits) {
        refuse_unborne(fmt::format("the switch '{}'", found.row.alias));
      }
      auto const was = Json::parse(row.fabric);
      add(row.name, was, record_of(transaction_, found, was.at("hosts")));
    }
  }

  void compare_port(storage::FoundSwitch const &found, SharedName const &name) {
    auto const row = storage::find_shared(transaction_, name);
    auto const port = storage::find_port(transaction_, found.key, name.port);
    if (!port || port->kind == storage::PortKind::uplink) {
      if (row && row->image) {
        add(name, Json::parse(row->fabric), nullptr);
      }
    } else if (!row) {
      add(name, nullptr, record_of(transaction_, *port, membership_, ""));
    } else if (image_of(transaction_, *port) != row->image) {
      if (!row->fits) {
        refuse_unborne(fmt::format("the port '{}'", name.port));
      }
      auto const was = Json::parse(row->fabric);
      add(name, was, record_of(transaction_, *port, membership_, was.at("host")));
    }
  }

  // Of a switch that this host had, and has no more.
  void leave(SharedName const &name) {
    auto const row = storage::find_shared(transaction_, name);
    if (!row || !had_switch(name)) {
      return;
    }
    auto const was = Json::parse(row->fabric);
    auto now = was;
    if (name.port.empty()) {
      std::erase(now.at("hosts").get_ref<Json::array_t &>(), Json(membership_.host));
    } else if (was.at("host") == membership_.host) {
      now["host"] = "";
    }
    add(name, was, now);
  }

  // Otherwise it could not bear it.
  [[nodiscard]] bool had_switch(SharedName const &name) {
    auto const row = storage::find_shared(
        transaction_, {.switch_identifier = name.switch_identifier, .port = {}});
    return row && row->image;
  }

  // What has another image may say the same.
  void add(SharedName const &name, Json was, Json now) {
    if (was != now) {
      changes_.push_back({.name = name, .was = std::move(was), .now = std::move(now)});
    }
  }

  Transaction &transaction_;
  Membership const &membership_;
  std::vector<Change> changes_;
};

}  // namespace

void to_json(Json &said, Change const &change) {
  said = {{"switch", change.name.switch_identifier},
          {"port", change.name.port},
          {"was", change.was},
          {"now", change.now}};
}

void from_json(Json const &said, Change &change) {
  said.at("switch").get_to(change.name.switch_identifier);
  said.at("port").get_to(change.name.port);
  change.was = said.at("was");
  change.now = said.at("now");
}

std::vector<Change> changes_of(Transaction &transaction, Membership const &membership) {
  try {
    return Comparison(transaction, membership).changes();
  } catch (Json::exception const &) {
    transaction.refuse("what it shares is told by no row of a fabric");
  }
}

void agree(storage::ChangingTransaction &transaction, std::vector<Change> const &changes) {
  for (auto const &change : changes) {
    auto const found = find_switch(transaction, change.name.switch_identifier);
    if (!found) {
      storage::remove_shared_switch(transaction, change.name.switch_identifier);
      continue;
    }
    if (change.now.is_null()) {
      storage::remove_shared(transaction, change.name);
      continue;
    }
    Shared row{.name = change.name, .fabric = change.now.dump(), .image = {}};
    if (change.name.port.empty()) {
      row.image = image_of(transaction, *found);
    } else if (auto const port = storage::find_port(transaction, found->key, change.name.port)) {
      row.image = image_of(transaction, *port);
    }
    storage::put_shared(transaction, row);
  }
}

}  // namespace simhost::fabric
