// Property rows in SQL.
#include "store/properties.h"

#include "store/store.h"

namespace simhost::store {
namespace {

// 0 stands for "no port" in the index as well: no port has that number.
std::int64_t number_or_none(PropertyOwner const &owner) {
  return owner.port_number ? std::int64_t(*owner.port_number) : 0;
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
  return Property{.type = PropertyType(static_cast<std::uint32_t>(select.integer(0))),
                  .value = select.bytes(1)};
}

}  // namespace simhost::store
