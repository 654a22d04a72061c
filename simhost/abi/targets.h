// Settings of a switch or a port that a caller names: what most calls of both libraries are.
#pragma once

#include <algorithm>
#include <string_view>

#include "abi/boundary.h"
#include "abi/call.h"
#include "abi/ledger.h"
#include "base/bytes.h"
#include "model/lookup.h"
#include "model/properties/properties.h"
#include "storage/properties.h"

namespace simhost {

/// A switch by one kind of its names.
struct NamedSwitch {
  std::string_view name;
  storage::SwitchName kind;
};

/// A port of it by its identifier.
struct NamedPort {
  NamedSwitch owner;
  std::string_view identifier;
};

/// These refuse null (QEX_BAD_PARAM).
inline NamedSwitch switch_called(char const *alias) {
  return {.name = require_text(alias), .kind = storage::SwitchName::alias};
}
inline NamedSwitch switch_identified(char const *identifier) {
  return {.name = require_text(identifier), .kind = storage::SwitchName::identifier};
}
inline NamedPort port_of(NamedSwitch const &owner, char const *identifier) {
  return {.owner = owner, .identifier = require_text(identifier)};
}

/// These refuse what is not there (QEX_NOT_FOUND).
inline storage::SwitchKey get_target(storage::Transaction &transaction, NamedSwitch const &target) {
  return get_switch(transaction, target.name, target.kind).key;
}
inline storage::Port get_target(storage::Transaction &transaction, NamedPort const &target) {
  return get_port(transaction, get_target(transaction, target.owner), target.identifier);
}
inline storage::PropertyOwner owner_of(storage::Transaction &transaction,
                                       NamedSwitch const &target) {
  return storage::PropertyOwner::global(get_target(transaction, target));
}
inline storage::PropertyOwner owner_of(storage::Transaction &transaction, NamedPort const &target) {
  return owner_of(get_target(transaction, target));
}

/// What most typed calls are: one setting of a target is read, set or cleared.
template <typename Target, typename Value>
Value get(ReadingCall &call, Target const &target, Property<Value> const &property) {
  auto &transaction = call.transaction();
  return effective(transaction, property, owner_of(transaction, target));
}

template <typename Target, typename Value>
void set(ChangingCall &call, Target const &target, Property<Value> const &property,
         std::type_identity_t<Value> const &value) {
  auto &transaction = call.transaction();
  set(transaction, property, owner_of(transaction, target), value);
}

template <typename Target>
void clear(ChangingCall &call, Target const &target, Descriptor const &descriptor) {
  auto &transaction = call.transaction();
  clear(transaction, descriptor, owner_of(transaction, target));
}

/// Memory for the caller with a copy of the bytes.
template <typename Record>
Record *allocate(Call &call, BytesView bytes) {
  auto *const memory = call.ledger().allocate(bytes.size(), call.name());
  std::copy(bytes.begin(), bytes.end(), static_cast<std::byte *>(memory));
  return static_cast<Record *>(memory);
}

}  // namespace simhost
