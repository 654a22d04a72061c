// Looking up, and refusing.
#include "model/lookup.h"

#include <fmt/format.h>

#include <cstdint>
#include <optional>
#include <string>
#include <utility>

#include "base/outcomes.h"
#include "storage/store.h"

namespace simhost {
namespace {

// `what` and `name` tell what is not there: "there is no uplink 'nic9'".
template <typename Found>
Found known(std::optional<Found> found, std::string_view what, std::string_view name) {
  if (!found) {
    throw Refused(QEX_NOT_FOUND, fmt::format("there is no {} '{}'", what, name));
  }
  return *std::move(found);
}

constexpr std::string_view kNumbered = "port with the number";

std::string text_of(storage::PortNumber number) {
  return std::to_string(std::int64_t(number));
}

std::string_view kind_of_name(storage::SwitchName kind) {
  switch (kind) {
    case storage::SwitchName::alias:
      break;
    case storage::SwitchName::identifier:
      return "switch identified as";
    case storage::SwitchName::portset:
      return "switch with the portset";
  }
  return "switch";
}

}  // namespace

storage::FoundSwitch get_switch(storage::Transaction &transaction, std::string_view name,
                                storage::SwitchName kind) {
  return known(storage::find_switch(transaction, kind, name), kind_of_name(kind), name);
}

storage::FoundSwitch get_running_switch(storage::Transaction &transaction, std::string_view alias) {
  auto found = get_switch(transaction, alias);
  if (!found.row.associated) {
    throw Refused(QEX_NOT_FOUND, fmt::format("the switch '{}' does not run", alias));
  }
  return found;
}

storage::Port get_port(storage::Transaction &transaction, storage::SwitchName kind,
                       std::string_view switch_name, std::string_view identifier) {
  return get_port(transaction, get_switch(transaction, switch_name, kind).key, identifier);
}

storage::Port get_port(storage::Transaction &transaction, storage::SwitchKey switch_key,
                       std::string_view identifier) {
  return known(storage::find_port(transaction, switch_key, identifier), "port", identifier);
}

storage::Port get_port(storage::Transaction &transaction, storage::PortNumber number) {
  return known(storage::find_port(transaction, number), kNumbered, text_of(number));
}

storage::Port get_port(storage::Transaction &transaction, storage::SwitchKey switch_key,
                       storage::PortNumber number) {
  return known(storage::find_port(transaction, switch_key, number), kNumbered, text_of(number));
}

storage::Port get_running_port(storage::Transaction &transaction, storage::PortNumber number) {
  auto port = storage::find_port(transaction, number);
  if (port && !storage::get_switch_row(transaction, port->switch_key).row.associated) {
    port.reset();
  }
  return known(std::move(port), kNumbered, text_of(number));
}

storage::Uplink get_uplink(storage::Transaction &transaction, std::string_view name) {
  return known(storage::find_uplink(transaction, name), "uplink", name);
}

storage::Uplink get_uplink(storage::Transaction &transaction, storage::SwitchKey switch_key,
                           std::string_view name) {
  auto uplink = get_uplink(transaction, name);
  if (!uplink.port) {
    throw Refused(QEX_NOT_FOUND, fmt::format("the uplink '{}' is at no switch", name));
  }
  get_port(transaction, switch_key, *uplink.port);
  return uplink;
}

std::optional<storage::Port> find_port(storage::Transaction &transaction, storage::SwitchName kind,
                                       std::string_view switch_name, std::string_view identifier) {
  auto const owner = storage::find_switch(transaction, kind, switch_name);
  return owner ? storage::find_port(transaction, owner->key, identifier) : std::nullopt;
}

bool is_there(storage::Transaction &transaction, storage::PropertyOwner const &owner) {
  return owner.port_number
             ? storage::find_port(transaction, owner.switch_key, *owner.port_number).has_value()
             : storage::find_switch(transaction, owner.switch_key).has_value();
}

}  // namespace simhost
