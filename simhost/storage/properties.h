// The rows of the properties: bytes under a name, per switch, per switch on this host, or per port.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "nebpublic/property_types.h"
#include "storage/ports.h"

namespace simhost::storage {

enum class PropertyScope { global = 0, host = 1, port = 2 };

/// What a property belongs to.
struct PropertyOwner {
  static PropertyOwner global(SwitchKey key) { return {key, PropertyScope::global, std::nullopt}; }
  static PropertyOwner host(SwitchKey key) { return {key, PropertyScope::host, std::nullopt}; }
  static PropertyOwner port(SwitchKey key, PortNumber port) {
    return {key, PropertyScope::port, port};
  }

  SwitchKey switch_key;
  PropertyScope scope;
  std::optional<PortNumber> port_number;
};

/// What becomes of a property when the host restarts, by the numbers that callers use.
enum class PropertyType : std::uint32_t {
  config = CONFIG_PROP_TYPE,
  runtime = RUNTIME_PROP_TYPE,
  transient = VOLATILE_PROP_TYPE,
  policy = POLICY_PROP_TYPE,
};

struct Property {
  PropertyType type;
  std::vector<std::byte> value;
};

/// Sets a property, its type included, whether or not it was there.
void put_property(ChangingTransaction &transaction, PropertyOwner const &owner,
                  std::string_view name, std::span<std::byte const> value, PropertyType type);
std::optional<Property> find_property(Transaction &transaction, PropertyOwner const &owner,
                                      std::string_view name);
/// False if the property was not there.
bool remove_property(ChangingTransaction &transaction, PropertyOwner const &owner,
                     std::string_view name);

struct NamedProperty {
  std::string name;
  Property property;
};

/// The properties of an owner, in the order of their names.
std::vector<NamedProperty> properties_of(Transaction &transaction, PropertyOwner const &owner);

struct PortProperty {
  PortNumber port;
  std::vector<std::byte> value;
};

/// The property of that name of every port of a switch that has it, in the order of the ports.
std::vector<PortProperty> port_properties(Transaction &transaction, SwitchKey key,
                                          std::string_view name);
/// Removes every property of that type from the host.
void remove_properties(ChangingTransaction &transaction, PropertyType type);

}  // namespace simhost::storage
