// What is stored under a key and what the host keeps elsewhere, as one set of properties.
#include "model/properties/properties.h"

#include <fmt/format.h>

#include <algorithm>
#include <utility>

#include "base/outcomes.h"
#include "base/utf8.h"
#include "model/properties/longest_key.h"
#include "storage/store.h"

namespace simhost {
namespace {

// The setting of that key, if such an owner has it.
Descriptor const *find_meant(storage::PropertyOwner const &owner, std::string_view name) {
  auto const *const key = find_descriptor(name);
  return key != nullptr && key->scope == owner.scope ? key : nullptr;
}

// Anybody may have written the state. Any bytes do for a key without a meaning.
void check_stored(storage::Transaction &transaction, Descriptor const *known, BytesView value) {
  if (known == nullptr) {
    return;
  }
  try {
    known->check_value(*known, value);
  } catch (Refused const &) {
    transaction.refuse(fmt::format("the property '{}' holds what is no value of it", known->key));
  }
}

std::optional<storage::Property> find_checked(storage::Transaction &transaction,
                                              storage::PropertyOwner const &owner,
                                              std::string_view key, Descriptor const *known) {
  auto property = storage::find_property(transaction, owner, key);
  if (property) {
    check_stored(transaction, known, property->value);
  }
  return property;
}

void check_key(storage::PropertyOwner const &owner, std::string_view name) {
  if (name.empty()) {
    throw Refused(QEX_BAD_PARAM);
  }
  if (name.size() > kLongestKey) {
    throw Refused(QEX_NAME_TOO_LONG);
  }
  require_utf8(name);
  auto const *const known = find_descriptor(name);
  if (known != nullptr && known->scope != owner.scope) {
    throw Refused(QEX_BAD_PARAM);
  }
}

storage::Property computed(storage::Transaction &transaction, storage::PropertyOwner const &owner,
                           Descriptor const &descriptor) {
  return {.type = descriptor.type, .value = descriptor.read(transaction, owner)};
}

void put(storage::ChangingTransaction &transaction, Descriptor const &descriptor,
         storage::PropertyOwner const &owner, BytesView value, storage::PropertyType type) {
  if (descriptor.is_read_only()) {
    throw Refused(QEX_READ_ONLY);
  }
  Setting const setting{.transaction = transaction, .owner = owner, .value = value};
  check_setting(descriptor, setting);
  if (descriptor.is_computed()) {
    descriptor.write(setting);
  } else {
    storage::put_property(transaction, owner, descriptor.key, value, type);
  }
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

void set_property(storage::ChangingTransaction &transaction, storage::PropertyOwner const &owner,
                  std::string_view key, BytesView value, storage::PropertyType type) {
  check_key(owner, key);
  auto const *const known = find_meant(owner, key);
  if (known == nullptr) {
    storage::put_property(transaction, owner, key, value, type);
    return;
  }
  put(transaction, *known, owner, value, type);
}

void set_property(storage::ChangingTransaction &transaction, storage::PropertyOwner const &owner,
                  std::string_view key, BytesView value) {
  auto const *const known = find_meant(owner, key);
  if (known == nullptr) {
    throw Refused(QEX_BAD_PARAM);
  }
  set_property(transaction, owner, key, value, known->type);
}

std::optional<storage::Property> find_property(storage::Transaction &transaction,
                                               storage::PropertyOwner const &owner,
                                               std::string_view key) {
  auto const *const known = find_meant(owner, key);
  if (known != nullptr && known->is_computed()) {
    return computed(transaction, owner, *known);
  }
  return find_checked(transaction, owner, key, known);
}

std::optional<storage::Property> find_stored(storage::Transaction &transaction,
                                             storage::PropertyOwner const &owner,
                                             std::string_view key) {
  return find_checked(transaction, owner, key, find_meant(owner, key));
}

std::vector<storage::NamedProperty> list_stored(storage::Transaction &transaction,
                                                storage::PropertyOwner const &owner) {
  auto all = storage::properties_of(transaction, owner);
  for (auto const &[name, property] : all) {
    check_stored(transaction, find_meant(owner, name), property.value);
  }
  return all;
}

std::vector<storage::PortProperty> list_stored_at_ports(storage::Transaction &transaction,
                                                        Descriptor const &descriptor,
                                                        storage::SwitchKey key) {
  auto all = storage::port_properties(transaction, key, descriptor.key);
  for (auto const &[port, value] : all) {
    check_stored(transaction, &descriptor, value);
  }
  return all;
}

std::vector<storage::NamedProperty> list_properties(storage::Transaction &transaction,
                                                    storage::PropertyOwner const &owner) {
  auto all = list_stored(transaction, owner);
  // Of a key that is read elsewhere, what is stored is only a part of the value.
  std::erase_if(all, [&](storage::NamedProperty const &property) {
    auto const *const key = find_meant(owner, property.name);
    return key != nullptr && key->is_computed();
  });
  for (auto const *const known : descriptors()) {
    if (known->scope == owner.scope && known->is_computed()) {
      all.push_back(
          {.name = std::string(known->key), .property = computed(transaction, owner, *known)});
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

void clear_property(storage::ChangingTransaction &transaction, storage::PropertyOwner const &owner,
                    std::string_view key) {
  auto const *const known = find_meant(owner, key);
  if (known != nullptr && known->is_computed()) {
    throw Refused(QEX_READ_ONLY);
  }
  if (!storage::remove_property(transaction, owner, key)) {
    throw Refused(QEX_NOT_FOUND);
  }
}

void reset_property(storage::ChangingTransaction &transaction, storage::PropertyOwner const &owner,
                    std::string_view key) {
  storage::remove_property(transaction, owner, key);
}

std::optional<Bytes> find_bytes(storage::Transaction &transaction, Descriptor const &descriptor,
                                storage::PropertyOwner const &owner) {
  if (descriptor.is_computed()) {
    return descriptor.read(transaction, owner);
  }
  auto property = find_checked(transaction, owner, descriptor.key, &descriptor);
  return property ? std::optional(std::move(property->value)) : std::nullopt;
}

Bytes effective_bytes(storage::Transaction &transaction, Descriptor const &descriptor,
                      storage::PropertyOwner const &owner) {
  if (auto own = find_bytes(transaction, descriptor, owner)) {
    return *std::move(own);
  }
  return descriptor.inherited == nullptr
             ? descriptor.default_bytes()
             : effective_bytes(transaction, *descriptor.inherited,
                               storage::PropertyOwner::global(owner.switch_key));
}

void set_bytes(storage::ChangingTransaction &transaction, Descriptor const &descriptor,
               storage::PropertyOwner const &owner, BytesView value) {
  put(transaction, descriptor, owner, value, descriptor.type);
}

}  // namespace simhost
