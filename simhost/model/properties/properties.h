// The one way to the properties, for typed calls and raw ones alike.
#pragma once

#include <optional>
#include <string_view>
#include <vector>

#include "base/api.h"
#include "base/bytes.h"
#include "model/properties/descriptor.h"
#include "model/properties/registry.h"
#include "storage/properties.h"

namespace simhost {

/// The type that a caller gives as a number; refuses anything but one of the four (QEX_BAD_PARAM).
SIMHOST_API storage::PropertyType property_type(std::uint32_t number);

/// Sets a property. Refuses no name, a known key of another scope, and bytes that the key does not
/// allow (QEX_BAD_PARAM), a name of more than 255 bytes (QEX_NAME_TOO_LONG), and a key that callers
/// may only read (QEX_READ_ONLY). A key without a meaning to the host takes any bytes.
SIMHOST_API void set_property(storage::ChangingTransaction &transaction,
                              storage::PropertyOwner const &owner, std::string_view key,
                              BytesView value, storage::PropertyType type);
/// Likewise for a key with a meaning, with the type that typed calls give it.
SIMHOST_API void set_property(storage::ChangingTransaction &transaction,
                              storage::PropertyOwner const &owner, std::string_view key,
                              BytesView value);

/// The property as callers read it; nothing if it is not set.
SIMHOST_API std::optional<storage::Property> find_property(storage::Transaction &transaction,
                                                           storage::PropertyOwner const &owner,
                                                           std::string_view key);
/// All of them, in the order of their names.
SIMHOST_API std::vector<storage::NamedProperty> list_properties(
    storage::Transaction &transaction, storage::PropertyOwner const &owner);
/// The first property whose name comes after `name`.
SIMHOST_API std::optional<storage::NamedProperty> next_property(storage::Transaction &transaction,
                                                                storage::PropertyOwner const &owner,
                                                                std::string_view name);

/// What is stored, the part of a computed property that is under its key included. Throws
/// UnusableState for what is no value of its setting, here and wherever a property is read.
SIMHOST_API std::optional<storage::Property> find_stored(storage::Transaction &transaction,
                                                         storage::PropertyOwner const &owner,
                                                         std::string_view key);
SIMHOST_API std::vector<storage::NamedProperty> list_stored(storage::Transaction &transaction,
                                                            storage::PropertyOwner const &owner);
/// Of every port of a switch that has the setting, in the order of the ports.
SIMHOST_API std::vector<storage::PortProperty> list_stored_at_ports(
    storage::Transaction &transaction, Descriptor const &descriptor, storage::SwitchKey key);

/// Clears a property. Refuses one that is not set, which whatever cannot be set never is
/// (QEX_NOT_FOUND), and one that the host keeps elsewhere (QEX_READ_ONLY).
SIMHOST_API void clear_property(storage::ChangingTransaction &transaction,
                                storage::PropertyOwner const &owner, std::string_view key);
/// Likewise, but it need not be set.
SIMHOST_API void reset_property(storage::ChangingTransaction &transaction,
                                storage::PropertyOwner const &owner, std::string_view key);

/// Likewise of a setting that is known: its bytes, if it is set or computed.
SIMHOST_API std::optional<Bytes> find_bytes(storage::Transaction &transaction,
                                            Descriptor const &descriptor,
                                            storage::PropertyOwner const &owner);
/// Those that hold: what is set, what the port's switch has instead, or else the default.
SIMHOST_API Bytes effective_bytes(storage::Transaction &transaction, Descriptor const &descriptor,
                                  storage::PropertyOwner const &owner);
/// Sets it, with the type that typed calls give it.
SIMHOST_API void set_bytes(storage::ChangingTransaction &transaction, Descriptor const &descriptor,
                           storage::PropertyOwner const &owner, BytesView value);

/// The value of a setting, if it is set.
template <typename Value>
std::optional<Value> find_value(storage::Transaction &transaction, Property<Value> const &property,
                                storage::PropertyOwner const &owner) {
  auto const bytes = find_bytes(transaction, property, owner);
  return bytes ? std::optional(Codec<Value>::value(*bytes)) : std::nullopt;
}

/// The value that holds, set or not.
template <typename Value>
Value effective(storage::Transaction &transaction, Property<Value> const &property,
                storage::PropertyOwner const &owner) {
  return Codec<Value>::value(effective_bytes(transaction, property, owner));
}

/// Sets a value; refuses one that the property may not have.
template <typename Value>
void set(storage::ChangingTransaction &transaction, Property<Value> const &property,
         storage::PropertyOwner const &owner, std::type_identity_t<Value> const &value) {
  set_bytes(transaction, property, owner, Codec<Value>::bytes(value));
}

/// Clears a setting, which need not be set.
inline void clear(storage::ChangingTransaction &transaction, Descriptor const &descriptor,
                  storage::PropertyOwner const &owner) {
  reset_property(transaction, owner, descriptor.key);
}

}  // namespace simhost
