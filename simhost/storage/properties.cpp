// Property rows in SQL.
#include "storage/properties.h"

#include "storage/store.h"

namespace simhost::storage {
namespace {

// 0 stands for "no port" in the index as well: no port has that number.
std::int64_t number_or_none(PropertyOwner const &owner) {
  return owner.port_number ? std::int64_t(*owner.port_number) : 0;
}

// Of a row that begins with type, value.
Property property_at(Query const &query) {
  auto const type = PropertyType(query.number<std::uint32_t>(0));
  switch (type) {
    case PropertyType::config:
    case PropertyType::runtime:
    case PropertyType::transient:
    case PropertyType::policy:
      return {.type = type, .value = query.bytes(1)};
  }
  query.refuse(0, std::to_string(static_cast<std::uint32_t>(type)));
}

}  // namespace

void put_property(Transaction &transaction, PropertyOwner const &owner, std::string_view name,
                  std::span<std::byte const> value, PropertyType type) {
  auto upsert = transaction.query(
      "INSERT INTO property (switch, scope, port, name, type, value)"
      " VALUES (?, ?, nullif(?, 0), ?, ?, ?)"
      " ON CONFLICT (switch, scope, ifnull(port, 0), name)"
      " DO UPDATE SET type = excluded.type, value = excluded.value");
  upsert.with(std::int64_t(owner.switch_key)).with(std::int64_t(owner.scope));
  upsert.with(number_or_none(owner)).with(name).with(std::int64_t(type)).with(value).run();
}

std::optional<Property> find_property(Transaction &transaction, PropertyOwner const &owner,
                                      std::string_view name) {
  auto select = transaction.query(
      "SELECT type, value FROM property"
      " WHERE switch = ? AND scope = ? AND ifnull(port, 0) = ? AND name = ?");
  select.with(std::int64_t(owner.switch_key)).with(std::int64_t(owner.scope));
  if (!select.with(number_or_none(owner)).with(name).next()) {
    return std::nullopt;
  }
  return property_at(select);
}

bool remove_property(Transaction &transaction, PropertyOwner const &owner, std::string_view name) {
  auto remove = transaction.query(
      "DELETE FROM property"
      " WHERE switch = ? AND scope = ? AND ifnull(port, 0) = ? AND name = ?");
  remove.with(std::int64_t(owner.switch_key)).with(std::int64_t(owner.scope));
  return remove.with(number_or_none(owner)).with(name).run() != 0;
}

std::vector<NamedProperty> properties_of(Transaction &transaction, PropertyOwner const &owner) {
  auto select = transaction.query(
      "SELECT type, value, name FROM property"
      " WHERE switch = ? AND scope = ? AND ifnull(port, 0) = ? ORDER BY name");
  select.with(std::int64_t(owner.switch_key)).with(std::int64_t(owner.scope));
  select.with(number_or_none(owner));
  std::vector<NamedProperty> all;
  while (select.next()) {
    all.push_back({.name = select.text(2), .property = property_at(select)});
  }
  return all;
}

std::vector<PortProperty> port_properties(Transaction &transaction, SwitchKey key,
                                          std::string_view name) {
  auto select = transaction.query(
      "SELECT port, value FROM property WHERE switch = ? AND name = ? AND port IS NOT NULL");
  select.with(std::int64_t(key)).with(name);
  std::vector<PortProperty> all;
  while (select.next()) {
    all.push_back({.port = PortNumber(select.number<std::uint32_t>(0)), .value = select.bytes(1)});
  }
  return all;
}

void remove_properties(Transaction &transaction, PropertyType type) {
  transaction.query("DELETE FROM property WHERE type = ?").with(std::int64_t(type)).run();
}

}  // namespace simhost::storage
