// DVSState_*: the state read in place. A walk is a row of short calls, each of which looks for what
// comes after the last: no lock is held and nothing wants destroying while the callback runs, which
// may call the host, change what is walked over, or jump.
#include "nebpublic/state.h"

#include <string_view>

#include "abi/boundary.h"
#include "abi/callers_code.h"
#include "abi/handles.h"
#include "abi/libnebPublic/arguments.h"
#include "abi/live_handles.h"
#include "abi/targets.h"
#include "model/lookup.h"
#include "model/properties/properties.h"
#include "model/state/images.h"
#include "storage/store.h"

namespace simhost {
namespace {

// A walk with nothing to walk over, or nobody to tell, is a call that does nothing.
bool is_nothing(void const *handle, DVSPortCallback callback) {
  return handle == nullptr || callback == nullptr;
}

// Tells the callback of what `first` returns, and then of what `next` returns time and again, until
// that is null or the callback returns 0. Both take the call.
template <typename Callback, typename First, typename Next>
void walk(char const *name, Callback callback, void *context, First const &first,
          Next const &next) {
  void *reached = reading_or_trap(name, first);
  while (reached != nullptr && call_back(callback, reached, context) != 0) {
    reached =
        reading_or_trap(resumed(name), [&](ReadingCall &call) { return next(call, reached); });
  }
}

// The item of the property of `owner` that comes after `last`; null after the last one, and when
// the owner is gone.
void *item_after(ReadingCall &call, storage::PropertyOwner const &owner, std::string_view last) {
  auto &transaction = call.transaction();
  if (!is_there(transaction, owner)) {
    return nullptr;
  }
  auto next = next_property(transaction, owner, last);
  return next ? call.handles().of_property(owner, *std::move(next)) : nullptr;
}

// The call traps for the handle of what is gone before the walk only: a callback may remove what it
// walks over, which ends the walk.
template <typename OwnerOf>
void walk_properties(char const *name, void *handle, DVSPortDataCallback callback, void *context,
                     OwnerOf const &owner_of) {
  walk(
      name, callback, context,
      [&](ReadingCall &call) {
        return is_nothing(handle, callback) ? nullptr
                                            : item_after(call, owner_of(call, handle), {});
      },
      [](ReadingCall &call, void const *last) {
        auto const &item = call.handles().get_item(last);
        return item_after(call, item.owner, item.content.name);
      });
}

template <typename OwnerOf>
QEX_ReturnStatus look_up(char const *name, char const *switch_id, char const *key,
                         DVSDataItem *item, OwnerOf const &owner_of) {
  return reading(name, [&](ReadingCall &call) {
    auto const target = switch_identified(switch_id);
    auto const wanted = require_text(key);
    auto &output = require(item);
    auto &transaction = call.transaction();
    auto const owner = owner_of(get_target(transaction, target));
    auto property = simhost::find_property(transaction, owner, wanted);
    if (!property) {
      refuse(QEX_NOT_FOUND);
    }
    output = call.handles().of_property(
        owner, {.name = std::string(wanted), .property = *std::move(property)});
  });
}

}  // namespace

extern "C" {

QEX_ReturnStatus DVSState_ConfigDeserialize(void *state, int length) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const image = argument_bytes(state, length);
    load_state(call.transaction(), image, Extent::persistent);
  });
}

QEX_ReturnStatus DVSState_ConfigReset(void) {
  return changing(__func__, [&](ChangingCall &call) { clear_state(call.transaction()); });
}

DVSwitchHandle DVSState_SwitchFindByAlias(char const *alias) {
  return reading_or_trap(__func__, [&](ReadingCall &call) {
    return alias == nullptr ? nullptr : handle_of_switch(call, alias);
  });
}

DVSPortHandle DVSState_PortFind(char const *switchId, char const *port) {
  return reading_or_trap(__func__, [&](ReadingCall &call) {
    return switchId == nullptr || port == nullptr ? nullptr : handle_of_port(call, switchId, port);
  });
}

void DVSState_SwitchForEach(DVSwitchCallback callback, void *context) {
  storage::SwitchKey last{};
  auto const step = [&](ReadingCall &call) { return handle_after(call, last); };
  walk(
      __func__, callback, context,
      [&](ReadingCall &call) { return callback == nullptr ? nullptr : step(call); },
      [&](ReadingCall &call, void const *) { return step(call); });
}

void DVSState_PortForEach(DVSwitchHandle handle, DVSPortCallback callback, void *context) {
  storage::SwitchKey key{};
  storage::PortNumber last{};
  auto const step = [&](ReadingCall &call) { return handle_after(call, key, last); };
  walk(
      __func__, callback, context,
      [&](ReadingCall &call) -> void * {
        if (is_nothing(handle, callback)) {
          return nullptr;
        }
        key = live_switch(call, handle).key;
        return step(call);
      },
      [&](ReadingCall &call, void const *) { return step(call); });
}

void DVSState_GlobalPropForEach(DVSwitchHandle handle, DVSPortDataCallback callback,
                                void *context) {
  walk_properties(__func__, handle, callback, context, [](ReadingCall &call, void const *of) {
    return storage::PropertyOwner::global(live_switch(call, of).key);
  });
}

void DVSState_HostPropForEach(DVSwitchHandle handle, DVSPortDataCallback callback, void *context) {
  walk_properties(__func__, handle, callback, context, [](ReadingCall &call, void const *of) {
    return storage::PropertyOwner::host(live_switch(call, of).key);
  });
}

void DVSState_PortDataForEach(DVSPortHandle handle, DVSPortDataCallback callback, void *context) {
  walk_properties(__func__, handle, callback, context,
                  [](ReadingCall &call, void const *of) { return owner_of(live_port(call, of)); });
}

QEX_ReturnStatus DVSState_GlobalPropLookup(char const *switchId, char const *key,
                                           DVSDataItem *item) {
  return look_up(__func__, switchId, key, item, storage::PropertyOwner::global);
}

QEX_ReturnStatus DVSState_HostPropLookup(char const *switchId, char const *key, DVSDataItem *item) {
  return look_up(__func__, switchId, key, item, storage::PropertyOwner::host);
}

}  // extern "C"
}  // namespace simhost
