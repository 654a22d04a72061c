// Property rows in SQL.
#include "storage/properties.h"

#include "storage/query.h"

namespace simhost::storage {
namespace {

// 0 stands for "no port" in the index as well: no port has that number.
std::int64_t number_or_none(PropertyOwner const &owner) {
  return owner.port_number ? std::int64_t(*owner.port_number) : 0;
}

// Of a row that begins with type, value.
Property property_at(Query const &row) {
  auto const type = PropertyType(row.number<std::uint32_t>(0));
  switch (type) {
    case PropertyType::config:
    case PropertyType::runtime:
    case PropertyType::transient:
    case PropertyType::policy:
      return {.type = type, .value = row.bytes(1)};
  }
  row.refuse(0, std::to_string(static_cast<std::uint32_t>(type)));
}

}  // namespace

void put_property(ChangingTransaction &transaction, PropertyOwner const &owner,
                  std::string_view name, std::span<std::byte const> value, PropertyType type) {
  Change upsert(transaction,
                "INSERT INTO property (switch, scope, port, name, type, value)"
                " VALUES (?, ?, nullif(?, 0), ?, ?, ?)"
                " ON CONFLICT (switch, scope, ifnull(port, 0), name)"
                " DO UPDATE SET type = excluded.type, value = excluded.value");
  upsert.with(owner.switch_key).with(owner.scope);
  upsert.with(number_or_none(owner)).with(name).with(type).with(value).run();
}

std::optional<Property> find_property(Transaction &transaction, PropertyOwner const &owner,
                                      std::string_view name) {
  Query select(transaction,
               "SELECT type, value FROM property"
               " WHERE switch = ? AND scope = ? AND ifnull(port, 0) = ? AND name = ?");
  select.with(owner.switch_key).with(owner.scope);
  return select.with(number_or_none(owner)).with(name).first(property_at);
}

bool remove_property(ChangingTransaction &transaction, PropertyOwner const &owner,
                     std::string_view name) {
  Change remove(transaction,
                "DELETE FROM property"
                " WHERE switch = ? AND scope = ? AND ifnull(port, 0) = ? AND name = ?");
  remove.with(owner.switch_key).with(owner.scope);
  return remove.with(number_or_none(owner)).with(name).run() != 0;
}

std::vector<NamedProperty> properties_of(Transaction &transaction, PropertyOwner const &owner) {
  Query select(transaction,
               "SELECT type, value, name FROM property"
               " WHERE switch = ? AND scope = ? AND ifnull(port, 0) = ? ORDER BY name");
  select.with(owner.switch_key).with(owner.scope);
  return select.with(number_or_none(owner)).all([](Query const &row) {
    return NamedProperty{.name = row.text(2), .property = property_at(row)};
  });
}

std::vector<PortProperty> port_properties(Transaction &transaction, SwitchKey key,
                                          std::string_view name) {
  Query select(transaction,
               "SELECT port, value FROM property WHERE switch = ? AND name = ? AND port IS NOT NULL"
               " ORDER BY port");
  return select.with(key).with(name).all([](Query const &row) {
    return PortProperty{.port = PortNumber(row.number<std::uint32_t>(0)), .value = row.bytes(1)};
  });
}

void remove_properties(ChangingTransaction &transaction, PropertyType type) {
  Change(transaction, "DELETE FROM property WHERE type = ?").with(type).run();
}

}  // namespace simhost::storage
