// A handle outlives what it designates, and then says so.
#include "abi/live_handles.h"

#include <optional>
#include <string>
#include <utility>

#include "abi/handles.h"
#include "base/outcomes.h"
#include "model/lookup.h"
#include "storage/store.h"

namespace simhost {
namespace {

template <typename Found>
Found alive(std::optional<Found> found, char const *kind, void const *handle) {
  if (!found) {
    throw Trapped(TrapKind::runtime_error, std::string("the ") + kind + " of the handle " +
                                               text_of_address(handle) + " is gone");
  }
  return *std::move(found);
}

}  // namespace

storage::FoundSwitch live_switch(ReadingCall &call, void const *handle) {
  auto const key = call.handles().get_switch_key(handle);
  return alive(storage::find_switch(call.transaction(), key), "switch", handle);
}

storage::Port live_port(ReadingCall &call, void const *handle) {
  auto const [switch_key, number] = call.handles().get_port_key(handle);
  return alive(storage::find_port(call.transaction(), switch_key, number), "port", handle);
}

void *handle_of_switch(ReadingCall &call, std::string_view alias) {
  auto const found = storage::find_switch(call.transaction(), storage::SwitchName::alias, alias);
  return found ? call.handles().of_switch(found->key) : nullptr;
}

void *handle_of_port(ReadingCall &call, std::string_view switch_identifier,
                     std::string_view identifier) {
  auto const found =
      find_port(call.transaction(), storage::SwitchName::identifier, switch_identifier, identifier);
  return found ? call.handles().of_port(*found) : nullptr;
}

void *handle_after(ReadingCall &call, storage::SwitchKey &last) {
  auto const next = storage::next_switch(call.transaction(), last);
  if (!next) {
    return nullptr;
  }
  last = next->key;
  return call.handles().of_switch(last);
}

void *handle_after(ReadingCall &call, storage::SwitchKey switch_key, storage::PortNumber &last) {
  auto const next = storage::next_port(call.transaction(), switch_key, last);
  if (!next) {
    return nullptr;
  }
  last = next->number;
  return call.handles().of_port(*next);
}

}  // namespace simhost
