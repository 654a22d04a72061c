// Looking up, and refusing.
#include "core/known.h"

#include <fmt/format.h>

#include <cstdint>
#include <optional>
#include <string>
#include <utility>

#include "core/giving_up.h"
#include "store/store.h"

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

std::string text_of(store::PortNumber number) {
  return std::to_string(std::int64_t(number));
}

std::string_view kind_of_name(store::SwitchName kind) {
  switch (kind) {
    case store::SwitchName::alias:
      break;
    case store::SwitchName::identifier:
      return "switch identified as";
    case store::SwitchName::portset:
      return "switch with the portset";
  }
  return "switch";
}

}  // namespace

store::FoundSwitch known_switch(store::Transaction &transaction, std::string_view name,
                                store::SwitchName kind) {
  return known(store::find_switch(transaction, kind, name), kind_of_name(kind), name);
}

store::FoundSwitch running_switch(store::Transaction &transaction, std::string_view alias) {
  auto found = known_switch(transaction, alias);
  if (!found.row.associated) {
    throw Refused(QEX_NOT_FOUND, fmt::format("the switch '{}' does not run", alias));
  }
  return found;
}

store::Port known_port(store::Transaction &transaction, store::SwitchName kind,
                       std::string_view switch_name, std::string_view identifier) {
  return known_port(transaction, known_switch(transaction, switch_name, kind).key, identifier);
}

store::Port known_port(store::Transaction &transaction, store::SwitchKey switch_key,
                       std::string_view identifier) {
  return known(store::find_port(transaction, switch_key, identifier), "port", identifier);
}

store::Port known_port(store::Transaction &transaction, store::PortNumber number) {
  return known(store::find_port(transaction, number), kNumbered, text_of(number));
}

store::Port known_port(store::Transaction &transaction, store::SwitchKey switch_key,
                       store::PortNumber number) {
  return known(store::find_port(transaction, switch_key, number), kNumbered, text_of(number));
}

store::Port running_port(store::Transaction &transaction, store::PortNumber number) {
  auto port = store::find_port(transaction, number);
  if (port && !store::find_switch(transaction, port->switch_key).value().row.associated) {
    port.reset();
  }
  return known(std::move(port), kNumbered, text_of(number));
}

store::Uplink known_uplink(store::Transaction &transaction, std::string_view name) {
  return known(store::find_uplink(transaction, name), "uplink", name);
}

store::Uplink known_uplink(store::Transaction &transaction, store::SwitchKey switch_key,
                           std::string_view name) {
  auto uplink = known_uplink(transaction, name);
  if (!uplink.port) {
    throw Refused(QEX_NOT_FOUND, fmt::format("the uplink '{}' is at no switch", name));
  }
  known_port(transaction, switch_key, *uplink.port);
  return uplink;
}

std::optional<store::Port> find_port(store::Transaction &transaction, store::SwitchName kind,
                                     std::string_view switch_name, std::string_view identifier) {
  auto const owner = store::find_switch(transaction, kind, switch_name);
  return owner ? store::find_port(transaction, owner->key, identifier) : std::nullopt;
}

bool is_there(store::Transaction &transaction, store::PropertyOwner const &owner) {
  return owner.port_number
             ? store::find_port(transaction, owner.switch_key, *owner.port_number).has_value()
             : store::find_switch(transaction, owner.switch_key).has_value();
}

}  // namespace simhost
