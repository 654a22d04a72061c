// What callers hold of the state: handles of switches and ports, items, and texts. They stay at
// their addresses as long as the process lives, so that a stale one is never taken for another.
#pragma once

#include <cstddef>
#include <deque>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <string_view>
#include <tuple>
#include <unordered_map>
#include <utility>

#include "base/api.h"
#include "storage/properties.h"

namespace simhost {

/// A property as it was when it was last looked up.
struct Item {
  storage::PropertyOwner owner;
  storage::NamedProperty content;
};

/// A port by which a stale handle is known: no two switches ever have a key in common, but ports of
/// two switches may have had one number, before a reset of the host and after it.
using PortKey = std::pair<storage::SwitchKey, storage::PortNumber>;

/// Handles of one kind, one for each key.
template <typename Key>
class HandleTable {
 public:
  void *handle_of(Key key) {
    auto const [found, is_new] = by_key_.try_emplace(key);
    if (is_new) {
      found->second = &slots_.emplace_back();
      by_address_.emplace(found->second, key);
    }
    return found->second;
  }
  /// Null if the address is none of these handles.
  Key const *find_key(void const *address) const {
    auto const found = by_address_.find(address);
    return found == by_address_.end() ? nullptr : &found->second;
  }

 private:
  std::map<Key, void *> by_key_;
  std::unordered_map<void const *, Key> by_address_;
  std::deque<std::byte> slots_;
};

/// Everything that takes an address throws Trapped for one that it never gave.
class Handles {
 public:
  SIMHOST_API void *of_switch(storage::SwitchKey key);
  SIMHOST_API void *of_port(storage::Port const &port);
  /// The one item of that property, with the content that it has now.
  SIMHOST_API Item *of_property(storage::PropertyOwner const &owner,
                                storage::NamedProperty content);

  [[nodiscard]] SIMHOST_API storage::SwitchKey get_switch_key(void const *handle) const;
  [[nodiscard]] SIMHOST_API PortKey get_port_key(void const *handle) const;
  [[nodiscard]] SIMHOST_API Item &get_item(void const *item) const;

  /// The same text at an address that stays.
  SIMHOST_API char const *lasting(std::string_view text);

 private:
  using PropertyId =
      std::tuple<storage::SwitchKey, storage::PropertyScope, storage::PortNumber, std::string>;

  HandleTable<storage::SwitchKey> switches_;
  HandleTable<PortKey> ports_;
  std::map<PropertyId, std::unique_ptr<Item>> items_;
  std::unordered_map<void const *, Item *> items_by_address_;
  std::set<std::string, std::less<>> texts_;
};

/// "0x7f...": how messages name an address.
std::string text_of_address(void const *address);

}  // namespace simhost
