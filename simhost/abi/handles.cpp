// Giving handles out, and knowing them again.
#include "abi/handles.h"

#include <array>
#include <cstdio>
#include <utility>

#include "base/outcomes.h"

namespace simhost {
namespace {

[[noreturn]] void refuse_address(char const *kind, void const *address) {
  throw Trapped(TrapKind::runtime_error, std::string("the host never gave out the ") + kind + " " +
                                             text_of_address(address));
}

}  // namespace

void *Handles::of_switch(storage::SwitchKey key) {
  return switches_.handle_of(key);
}

void *Handles::of_port(storage::Port const &port) {
  return ports_.handle_of({port.switch_key, port.number});
}

Item *Handles::of_property(storage::PropertyOwner const &owner, storage::NamedProperty content) {
  PropertyId id{owner.switch_key, owner.scope, owner.port_number.value_or(storage::PortNumber{}),
                content.name};
  auto const [found, is_new] = items_.try_emplace(std::move(id));
  auto &item = found->second;
  if (is_new) {
    item = std::make_unique<Item>(Item{.owner = owner, .content = std::move(content)});
    items_by_address_.emplace(item.get(), item.get());
  } else {
    item->content.property.type = content.property.type;
    // Callers look into the bytes, so these move only when they have changed.
    if (item->content.property.value != content.property.value) {
      item->content.property.value = std::move(content.property.value);
    }
  }
  return item.get();
}

storage::SwitchKey Handles::get_switch_key(void const *handle) const {
  auto const *const key = switches_.find_key(handle);
  if (key == nullptr) {
    refuse_address("switch handle", handle);
  }
  return *key;
}

PortKey Handles::get_port_key(void const *handle) const {
  auto const *const key = ports_.find_key(handle);
  if (key == nullptr) {
    refuse_address("port handle", handle);
  }
  return *key;
}

Item &Handles::get_item(void const *item) const {
  auto const found = items_by_address_.find(item);
  if (found == items_by_address_.end()) {
    refuse_address("item", item);
  }
  return *found->second;
}

char const *Handles::lasting(std::string_view text) {
  auto found = texts_.find(text);
  if (found == texts_.end()) {
    found = texts_.emplace(text).first;
  }
  return found->c_str();
}

std::string text_of_address(void const *address) {
  std::array<char, 2 + (2 * sizeof address) + 1> text;
  auto const length = std::snprintf(text.data(), text.size(), "%p", address);
  return {text.data(), static_cast<std::size_t>(length)};
}

}  // namespace simhost
