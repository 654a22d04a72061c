// From rows to the state.
#include <algorithm>
#include <optional>
#include <utility>

#include "base/outcomes.h"
#include "fabric/shared/records.h"
#include "fabric/shared/settings.h"
#include "model/lookup.h"
#include "model/ports/ports.h"
#include "model/switches/switches.h"
#include "scenario/document.h"
#include "scenario/texts.h"
#include "storage/running/devices.h"
#include "storage/store.h"

namespace simhost::fabric {
namespace {

using storage::Shared;

class Following {
 public:
  Following(storage::ChangingTransaction &transaction, Membership const &membership,
            News const &news, std::map<SharedName, std::string> const &unborne)
      : transaction_(transaction),
        membership_(membership),
        records_(news.records),
        unborne_(unborne) {
    for (auto &row : news.names ? shared_of(*news.names) : storage::all_shared(transaction)) {
      auto name = row.name;
      known_.emplace(std::move(name), std::move(row));
    }
  }

  Followed run() {
    for (auto const &[name, row] : known_) {
      if (!records_.contains(name) && !row.fabric.empty()) {
        remove(name);
      }
    }
    for (auto const &[name, record] : records_) {
      if (is_agreed(name, record)) {
        continue;
      }
      // Of what stands in the way of a switch its ports need not tell.
      if (name.port.empty() || find_switch(name)) {
        apply(name, record);
      }
    }
    return followed_;
  }

 private:
  [[nodiscard]] std::vector<Shared> shared_of(std::set<SharedName> const &names) const {
    std::vector<Shared> all;
    for (auto const &name : names) {
      if (auto row = storage::find_shared(transaction_, name)) {
        all.push_back(std::move(*row));
      }
    }
    return all;
  }

  [[nodiscard]] std::optional<storage::FoundSwitch> find_switch(SharedName const &name) const {
    return storage::find_switch(transaction_, storage::SwitchName::identifier,
                                name.switch_identifier);
  }

  [[nodiscard]] std::optional<storage::Port> find_port(SharedName const &name) const {
    auto const found = find_switch(name);
    return found ? storage::find_port(transaction_, found->key, name.port) : std::nullopt;
  }

  [[nodiscard]] bool is_agreed(SharedName const &name, Json const &record) const {
    auto const row = known_.find(name);
    bool const is_same = row != known_.end() && row->second.fabric == record.dump();
    return is_same && row->second.fits != unborne_.contains(name);
  }

  void remove(SharedName const &name) {
    followed_.is_other = true;
    if (name.port.empty()) {
      if (auto const found = find_switch(name)) {
        destroy_switch(transaction_, found->key);
      }
      storage::remove_shared_switch(transaction_, name.switch_identifier);
      return;
    }
    if (auto const port = find_port(name)) {
      storage::remove_port(transaction_, port->number);
    }
    storage::remove_shared(transaction_, name);
  }

  void apply(SharedName const &name, Json const &record) {
    followed_.is_other = true;
    if (!unborne_.contains(name)) {
      try {
        name.port.empty() ? apply_switch(name, record) : apply_port(name, record);
      } catch (Refused const &refused) {
        throw Unborne(name, scenario::refusal_text(refused));
      } catch (scenario::DocumentError const &error) {
        throw Unborne(name, error.what());
      } catch (Json::exception const &) {
        throw Unborne(name, "the row of the fabric is none of this version");
      }
    }
    note(name, record);
  }

  void note(SharedName const &name, Json const &record) {
    Shared row{.name = name,
               .fabric = record.dump(),
               .image = std::nullopt,
               .fits = !unborne_.contains(name)};
    bool is_left = false;
    if (name.port.empty()) {
      if (auto const found = find_switch(name)) {
        row.image = image_of(transaction_, *found);
      }
    } else if (auto const port = find_port(name)) {
      row.image = image_of(transaction_, *port);
      bool const is_told_here = row.fits && record.at("host") == membership_.host;
      is_left = is_told_here && !storage::device_of(transaction_, port->number);
    }
    if (is_left) {
      // No port has such an image.
      row.image = Bytes();
    }
    storage::put_shared(transaction_, row);
    if (is_left) {
      storage::touch(transaction_, name);
      followed_.is_left = true;
    }
  }

  void apply_switch(SharedName const &name, Json const &record) {
    auto const alias = record.at("alias").get<std::string>();
    auto found = find_switch(name);
    if (found && !known_.contains(name)) {
      remove_ports(*found);
    }
    if (!found) {
      create_switch(transaction_,
                    {.alias = alias, .identifier = name.switch_identifier, .persistent = true});
      found = find_switch(name);
    } else if (found->row.alias != alias &&
               !storage::rename_switch(transaction_, found->key, alias)) {
      throw Refused(QEX_EXISTS, "another switch of this host has that alias");
    }
    apply_settings(transaction_, *found, record.at("settings").get<Settings>());
  }

  // A state from before the switch was shared may have ports that the fabric knows nothing of.
  void remove_ports(storage::FoundSwitch const &found) {
    for (auto const &port : storage::ports_of(transaction_, found.key)) {
      if (port.kind == storage::PortKind::client &&
          !records_.contains({found.row.identifier, port.identifier})) {
        storage::remove_port(transaction_, port.number);
      }
    }
  }

  void apply_port(SharedName const &name, Json const &record) {
    auto const found = find_switch(name);
    auto port = storage::find_port(transaction_, found->key, name.port);
    if (port && port->kind == storage::PortKind::uplink) {
      throw Refused(QEX_EXISTS, "an uplink port of this host has that identifier");
    }
    if (!port) {
      port = add_client_port(transaction_, found->key, name.port);
    }
    apply_settings(transaction_, *port, record.at("settings").get<Settings>());
    if (record.at("host") != membership_.host && storage::device_of(transaction_, port->number)) {
      storage::remove_device(transaction_, port->number);
    }
  }

  storage::ChangingTransaction &transaction_;
  Membership const &membership_;
  Records const &records_;
  std::map<SharedName, std::string> const &unborne_;
  std::map<SharedName, Shared> known_;
  Followed followed_;
};

}  // namespace

Followed follow(storage::ChangingTransaction &transaction, Membership const &membership,
                News const &news, std::map<SharedName, std::string> const &unborne) {
  return Following(transaction, membership, news, unborne).run();
}

}  // namespace simhost::fabric
