// What is stored under a key and what the host keeps elsewhere, as one set of properties.
#include "model/properties/properties.h"

#include <algorithm>
#include <utility>

#include "base/outcomes.h"
#include "storage/store.h"

namespace simhost {
namespace {

constexpr std::size_t kLongestKey = 255;

// The key, if it has a meaning for such an owner.
PropertyKey const *key_of(storage::PropertyOwner const &owner, std::string_view name) {
  auto const *const key = find_property_key(name);
  return key != nullptr && key->scope == owner.scope ? key : nullptr;
}

void check_key(storage::PropertyOwner const &owner, std::string_view name) {
  if (name.empty()) {
    throw Refused(QEX_BAD_PARAM);
  }
  if (name.size() > kLongestKey) {
    throw Refused(QEX_NAME_TOO_LONG);
  }
  auto const *const key = find_property_key(name);
  if (key != nullptr && key->scope != owner.scope) {
    throw Refused(QEX_BAD_PARAM);
  }
}

storage::Property computed(storage::Transaction &transaction, storage::PropertyOwner const &owner,
                           PropertyKey const &key) {
  return {.type = key.type, .value = key.read(transaction, owner)};
}

bool by_name(storage::NamedProperty const &left, storage::NamedProperty const &right) {
  return left.name < right.name;
}

}  // namespace

storage::PropertyType property_type(std::uint32_t number) {
  switch (number) {
    case CONFIG_PROP_TYPE:
    case RUNTIME_PROP_TYPE:
    case VOLATILE_PROP_TYPE:
    case POLICY_PROP_TYPE:
      return storage::PropertyType(number);
    default:
      throw Refused(QEX_BAD_PARAM);
  }
}

void set_property(storage::Transaction &transaction, storage::PropertyOwner const &owner,
                  std::string_view key, BytesView value, storage::PropertyType type) {
  check_key(owner, key);
  auto const *const known = key_of(owner, key);
  if (known == nullptr) {
    storage::put_property(transaction, owner, key, value, type);
    return;
  }
  Setting const setting{.transaction = transaction, .owner = owner, .value = value};
  if (known->read != nullptr && known->write == nullptr) {
    throw Refused(QEX_READ_ONLY);
  }
  known->check(setting);
  if (known->write != nullptr) {
    known->write(setting);
  } else {
    storage::put_property(transaction, owner, key, value, type);
  }
}

void set_property(storage::Transaction &transaction, storage::PropertyOwner const &owner,
                  std::string_view key, BytesView value) {
  auto const *const known = key_of(owner, key);
  if (known == nullptr) {
    throw Refused(QEX_BAD_PARAM);
  }
  set_property(transaction, owner, key, value, known->type);
}

std::optional<storage::Property> get_property(storage::Transaction &transaction,
                                              storage::PropertyOwner const &owner,
                                              std::string_view key) {
  auto const *const known = key_of(owner, key);
  if (known != nullptr && known->read != nullptr) {
    return computed(transaction, owner, *known);
  }
  return storage::find_property(transaction, owner, key);
}

std::vector<storage::NamedProperty> list_properties(storage::Transaction &transaction,
                                                    storage::PropertyOwner const &owner) {
  auto all = storage::properties_of(transaction, owner);
  // Of a key that is read elsewhere, what is stored is only a part of the value.
  std::erase_if(all, [&](storage::NamedProperty const &property) {
    auto const *const key = key_of(owner, property.name);
    return key != nullptr && key->read != nullptr;
  });
  for (auto const &key : property_keys()) {
    if (key.scope == owner.scope && key.read != nullptr) {
      all.push_back({.name = std::string(key.name), .property = computed(transaction, owner, key)});
    }
  }
  std::sort(all.begin(), all.end(), by_name);
  return all;
}

std::optional<storage::NamedProperty> next_property(storage::Transaction &transaction,
                                                    storage::PropertyOwner const &owner,
                                                    std::string_view name) {
  auto all = list_properties(transaction, owner);
  auto const next =
      std::find_if(all.begin(), all.end(),
                   [&](storage::NamedProperty const &property) { return property.name > name; });
  if (next == all.end()) {
    return std::nullopt;
  }
  return std::move(*next);
}

void clear_property(storage::Transaction &transaction, storage::PropertyOwner const &owner,
                    std::string_view key) {
  auto const *const known = key_of(owner, key);
  if (known != nullptr && known->read != nullptr) {
    throw Refused(QEX_READ_ONLY);
  }
  if (!storage::remove_property(transaction, owner, key)) {
    throw Refused(QEX_NOT_FOUND);
  }
}

void reset_property(storage::Transaction &transaction, storage::PropertyOwner const &owner,
                    std::string_view key) {
  storage::remove_property(transaction, owner, key);
}

}  // namespace simhost
