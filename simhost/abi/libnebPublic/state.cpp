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

using simhost::Call;
using simhost::changing;
using simhost::ChangingCall;
using simhost::reading;
using simhost::reading_or_trap;
using simhost::ReadingCall;
using simhost::require_text;
using simhost::storage::PortNumber;
using simhost::storage::PropertyOwner;
using simhost::storage::SwitchKey;

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
  while (reached != nullptr && simhost::call_back(callback, reached, context) != 0) {
    reached = reading_or_trap(simhost::resumed(name),
                              [&](ReadingCall &call) { return next(call, reached); });
  }
}

// The item of the property of `owner` that comes after `last`; null after the last one, and when
// the owner is gone.
void *item_after(ReadingCall &call, PropertyOwner const &owner, std::string_view last) {
  auto &transaction = call.transaction();
  if (!simhost::is_there(transaction, owner)) {
    return nullptr;
  }
  auto next = simhost::next_property(transaction, owner, last);
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
    auto const target = simhost::switch_identified(switch_id);
    auto const wanted = require_text(key);
    auto &output = simhost::require(item);
    auto &transaction = call.transaction();
    auto const owner = owner_of(simhost::get_target(transaction, target));
    auto property = simhost::find_property(transaction, owner, wanted);
    if (!property) {
      simhost::refuse(QEX_NOT_FOUND);
    }
    output = call.handles().of_property(
        owner, {.name = std::string(wanted), .property = *std::move(property)});
  });
}

}  // namespace

extern "C" {

QEX_ReturnStatus DVSState_ConfigDeserialize(void *state, int length) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const image = simhost::argument_bytes(state, length);
    simhost::load_state(call.transaction(), image, simhost::Extent::persistent);
  });
}

QEX_ReturnStatus DVSState_ConfigReset(void) {
  return changing(__func__, [&](ChangingCall &call) { simhost::clear_state(call.transaction()); });
}

DVSwitchHandle DVSState_SwitchFindByAlias(char const *alias) {
  return reading_or_trap(__func__, [&](ReadingCall &call) {
    return alias == nullptr ? nullptr : simhost::handle_of_switch(call, alias);
  });
}

DVSPortHandle DVSState_PortFind(char const *switchId, char const *port) {
  return reading_or_trap(__func__, [&](ReadingCall &call) {
    return switchId == nullptr || port == nullptr ? nullptr
                                                  : simhost::handle_of_port(call, switchId, port);
  });
}

void DVSState_SwitchForEach(DVSwitchCallback callback, void *context) {
  SwitchKey last{};
  auto const step = [&](ReadingCall &call) { return simhost::handle_after(call, last); };
  walk(
      __func__, callback, context,
      [&](ReadingCall &call) { return callback == nullptr ? nullptr : step(call); },
      [&](ReadingCall &call, void const *) { return step(call); });
}

void DVSState_PortForEach(DVSwitchHandle handle, DVSPortCallback callback, void *context) {
  SwitchKey key{};
  PortNumber last{};
  auto const step = [&](ReadingCall &call) { return simhost::handle_after(call, key, last); };
  walk(
      __func__, callback, context,
      [&](ReadingCall &call) -> void * {
        if (is_nothing(handle, callback)) {
          return nullptr;
        }
        key = simhost::live_switch(call, handle).key;
        return step(call);
      },
      [&](ReadingCall &call, void const *) { return step(call); });
}

void DVSState_GlobalPropForEach(DVSwitchHandle handle, DVSPortDataCallback callback,
                                void *context) {
  walk_properties(__func__, handle, callback, context, [](ReadingCall &call, void const *of) {
    return PropertyOwner::global(simhost::live_switch(call, of).key);
  });
}

void DVSState_HostPropForEach(DVSwitchHandle handle, DVSPortDataCallback callback, void *context) {
  walk_properties(__func__, handle, callback, context, [](ReadingCall &call, void const *of) {
    return PropertyOwner::host(simhost::live_switch(call, of).key);
  });
}

void DVSState_PortDataForEach(DVSPortHandle handle, DVSPortDataCallback callback, void *context) {
  walk_properties(__func__, handle, callback, context, [](ReadingCall &call, void const *of) {
    return simhost::owner_of(simhost::live_port(call, of));
  });
}

QEX_ReturnStatus DVSState_GlobalPropLookup(char const *switchId, char const *key,
                                           DVSDataItem *item) {
  return look_up(__func__, switchId, key, item, PropertyOwner::global);
}

QEX_ReturnStatus DVSState_HostPropLookup(char const *switchId, char const *key, DVSDataItem *item) {
  return look_up(__func__, switchId, key, item, PropertyOwner::host);
}

}  // extern "C"
