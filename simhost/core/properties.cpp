// What is stored under a key and what the host keeps elsewhere, as one set of properties.
#include "core/properties.h"

#include <algorithm>
#include <utility>

#include "core/giving_up.h"
#include "store/store.h"

namespace simhost {
namespace {

constexpr std::size_t kLongestKey = 255;

// The key, if it has a meaning for such an owner.
PropertyKey const *key_of(store::PropertyOwner const &owner, std::string_view name) {
  auto const *const key = find_property_key(name);
  return key != nullptr && key->scope == owner.scope ? key : nullptr;
}

void check_key(store::PropertyOwner const &owner, std::string_view name) {
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

store::Property kept_elsewhere(store::Transaction &transaction, store::PropertyOwner const &owner,
                               PropertyKey const &key) {
  return {.type = key.type, .value = key.read(transaction, owner)};
}

bool by_name(store::NamedProperty const &left, store::NamedProperty const &right) {
  return left.name < right.name;
}

}  // namespace

store::PropertyType property_type(std::uint32_t number) {
  switch (number) {
    case CONFIG_PROP_TYPE:
    case RUNTIME_PROP_TYPE:
    case VOLATILE_PROP_TYPE:
    case POLICY_PROP_TYPE:
      return store::PropertyType(number);
    default:
      throw Refused(QEX_BAD_PARAM);
  }
}

void set_property(store::Transaction &transaction, store::PropertyOwner const &owner,
                  std::string_view key, BytesView value, store::PropertyType type) {
  check_key(owner, key);
  auto const *const known = key_of(owner, key);
  if (known == nullptr) {
    store::put_property(transaction, owner, key, value, type);
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
    store::put_property(transaction, owner, key, value, type);
  }
}

void set_property(store::Transaction &transaction, store::PropertyOwner const &owner,
                  std::string_view key, BytesView value) {
  auto const *const known = key_of(owner, key);
  if (known == nullptr) {
    throw Refused(QEX_BAD_PARAM);
  }
  set_property(transaction, owner, key, value, known->type);
}

std::optional<store::Property> get_property(store::Transaction &transaction,
                                            store::PropertyOwner const &owner,
                                            std::string_view key) {
  auto const *const known = key_of(owner, key);
  if (known != nullptr && known->read != nullptr) {
    return kept_elsewhere(transaction, owner, *known);
  }
  return store::find_property(transaction, owner, key);
}

std::vector<store::NamedProperty> list_properties(store::Transaction &transaction,
                                                  store::PropertyOwner const &owner) {
  auto all = store::properties_of(transaction, owner);
  // Of a key that is read elsewhere, what is stored is only a part of the value.
  std::erase_if(all, [&](store::NamedProperty const &property) {
    auto const *const key = key_of(owner, property.name);
    return key != nullptr && key->read != nullptr;
  });
  for (auto const &key : property_keys()) {
    if (key.scope == owner.scope && key.read != nullptr) {
      all.push_back(
          {.name = std::string(key.name), .property = kept_elsewhere(transaction, owner, key)});
    }
  }
  std::sort(all.begin(), all.end(), by_name);
  return all;
}

std::optional<store::NamedProperty> next_property(store::Transaction &transaction,
                                                  store::PropertyOwner const &owner,
                                                  std::string_view name) {
  auto all = list_properties(transaction, owner);
  auto const next = std::find_if(all.begin(), all.end(), [&](store::NamedProperty const &property) {
    return property.name > name;
  });
  if (next == all.end()) {
    return std::nullopt;
  }
  return std::move(*next);
}

void clear_property(store::Transaction &transaction, store::PropertyOwner const &owner,
                    std::string_view key) {
  auto const *const known = key_of(owner, key);
  if (known != nullptr && known->read != nullptr) {
    throw Refused(QEX_READ_ONLY);
  }
  if (!store::remove_property(transaction, owner, key)) {
    throw Refused(QEX_NOT_FOUND);
  }
}

void reset_property(store::Transaction &transaction, store::PropertyOwner const &owner,
                    std::string_view key) {
  store::remove_property(transaction, owner, key);
}

}  // namespace simhost
