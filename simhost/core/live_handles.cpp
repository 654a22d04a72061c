// A handle outlives what it designates, and then says so.
#include "core/live_handles.h"

#include <optional>
#include <string>
#include <utility>

#include "core/giving_up.h"
#include "core/handles.h"
#include "core/known.h"
#include "store/store.h"

namespace simhost {
namespace {

template <typename Found>
Found alive(std::optional<Found> found, char const *kind, void const *handle) {
  if (!found) {
    throw HostPanic(PanicKind::runtime_error, std::string("the ") + kind + " behind the handle " +
                                                  text_of_address(handle) + " is gone");
  }
  return *std::move(found);
}

}  // namespace

store::FoundSwitch live_switch(Call &call, store::Transaction &transaction, void const *handle) {
  auto const key = call.handles().switch_behind(handle);
  return alive(store::find_switch(transaction, key), "switch", handle);
}

store::Port live_port(Call &call, store::Transaction &transaction, void const *handle) {
  auto const [switch_key, number] = call.handles().port_behind(handle);
  return alive(store::find_port(transaction, switch_key, number), "port", handle);
}

void *handle_of_switch(Call &call, std::string_view alias) {
  auto const found = store::find_switch(call.reading(), store::SwitchName::alias, alias);
  return found ? call.handles().of_switch(found->key) : nullptr;
}

void *handle_of_port(Call &call, std::string_view switch_identifier, std::string_view identifier) {
  auto const found =
      find_port(call.reading(), store::SwitchName::identifier, switch_identifier, identifier);
  return found ? call.handles().of_port(*found) : nullptr;
}

void *handle_after(Call &call, store::SwitchKey &last) {
  auto const next = store::next_switch(call.reading(), last);
  if (!next) {
    return nullptr;
  }
  last = next->key;
  return call.handles().of_switch(last);
}

void *handle_after(Call &call, store::SwitchKey switch_key, store::PortNumber &last) {
  auto const next = store::next_port(call.reading(), switch_key, last);
  if (!next) {
    return nullptr;
  }
  last = next->number;
  return call.handles().of_port(*next);
}

}  // namespace simhost
