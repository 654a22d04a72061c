// Settings in documents: each that has a name is a member of its switch or its port, beside the raw
// bytes of all.
#pragma once

#include <span>
#include <string_view>
#include <vector>

#include "model/properties/descriptor.h"
#include "scenario/document.h"
#include "scenario/keys.h"
#include "storage/properties.h"

namespace simhost::scenario {

/// Whose settings; uplink ports have few, and names of their own for them.
enum class SettingOwner { of_switch, of_host, of_port, of_uplink_port };

/// What documents call a type.
Json type_to_json(storage::PropertyType type);

/// The members that such an owner has for its settings.
std::vector<std::string_view> setting_names(SettingOwner kind);

/// What an uplink port calls the setting that other ports have under that name; empty if it has
/// none.
std::string_view name_at_uplink_port(std::string_view name);

/// Sets what has no name but its key.
void apply_raw(storage::ChangingTransaction &transaction, storage::PropertyOwner const &owner,
               SettingOwner kind, Node const &node, std::string_view under = keys::properties);
/// Sets what members name; where the bytes are there too, they win, for a member may not be able to
/// say them.
void apply_named(storage::ChangingTransaction &transaction, storage::PropertyOwner const &owner,
                 SettingOwner kind, Node const &node);
/// Both, in this order.
void apply_settings(storage::ChangingTransaction &transaction, storage::PropertyOwner const &owner,
                    SettingOwner kind, Node const &node);

/// Adds to an object the members of the settings that are set.
void describe_named(Json &described, storage::Transaction &transaction,
                    storage::PropertyOwner const &owner, SettingOwner kind);
/// Adds the bytes of those that have no member that says them whole.
void describe_raw(Json &described, storage::Transaction &transaction,
                  storage::PropertyOwner const &owner, SettingOwner kind,
                  std::string_view under = keys::properties);

}  // namespace simhost::scenario
