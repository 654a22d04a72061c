// Settings of a switch or a port that a caller names: what most calls of both libraries are.
#pragma once

#include <algorithm>
#include <string_view>

#include "core/boundary.h"
#include "core/bytes.h"
#include "core/call.h"
#include "core/known.h"
#include "core/ledger.h"
#include "core/properties.h"
#include "store/properties.h"

namespace simhost {

/// A switch by one kind of its names.
struct NamedSwitch {
  std::string_view name;
  store::SwitchName kind;
};

/// A port of it by its identifier.
struct NamedPort {
  NamedSwitch owner;
  std::string_view identifier;
};

/// These refuse null (QEX_BAD_PARAM).
inline NamedSwitch switch_called(char const *alias) {
  return {.name = required_text(alias), .kind = store::SwitchName::alias};
}
inline NamedSwitch switch_identified(char const *identifier) {
  return {.name = required_text(identifier), .kind = store::SwitchName::identifier};
}
inline NamedPort port_of(NamedSwitch const &owner, char const *identifier) {
  return {.owner = owner, .identifier = required_text(identifier)};
}

/// These refuse what is not there (QEX_NOT_FOUND).
inline store::SwitchKey found(store::Transaction &transaction, NamedSwitch const &target) {
  return known_switch(transaction, target.name, target.kind).key;
}
inline store::Port found(store::Transaction &transaction, NamedPort const &target) {
  return known_port(transaction, found(transaction, target.owner), target.identifier);
}
inline store::PropertyOwner owner_of(store::Transaction &transaction, NamedSwitch const &target) {
  return store::PropertyOwner::global(found(transaction, target));
}
inline store::PropertyOwner owner_of(store::Transaction &transaction, NamedPort const &target) {
  return owner_of(found(transaction, target));
}

template <typename Target, typename Record>
Record read(Call &call, Target const &target, RecordProperty<Record> const &property) {
  auto &transaction = call.reading();
  return read(transaction, owner_of(transaction, target), property);
}

template <typename Target, typename Record>
void write(Call &call, Target const &target, RecordProperty<Record> const &property,
           Record const &record) {
  auto &transaction = call.changing();
  write(transaction, owner_of(transaction, target), property, record);
}

template <typename Target>
void reset(Call &call, Target const &target, std::string_view key) {
  auto &transaction = call.changing();
  reset_property(transaction, owner_of(transaction, target), key);
}

/// Memory for the caller with a copy of the bytes.
template <typename Record>
Record *give_out(Call &call, BytesView bytes) {
  auto *const memory = call.ledger().give_out(bytes.size(), call.name());
  std::copy(bytes.begin(), bytes.end(), static_cast<std::byte *>(memory));
  return static_cast<Record *>(memory);
}

}  // namespace simhost
