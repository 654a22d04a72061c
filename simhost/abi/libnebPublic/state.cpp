// DVSState_*: the state read in place. A walk is a row of short calls, each of which looks for what
// comes after the last: no lock is held and nothing wants destroying while the callback runs, which
// may call the host, change what is walked over, or jump.
#include "nebpublic/state.h"

#include <string_view>

#include "abi/boundary.h"
#include "abi/handles.h"
#include "abi/libnebPublic/arguments.h"
#include "abi/live_handles.h"
#include "abi/targets.h"
#include "model/lookup.h"
#include "model/properties/properties.h"
#include "model/state/images.h"
#include "storage/store.h"

using simhost::answer;
using simhost::Call;
using simhost::require_text;
using simhost::storage::PortNumber;
using simhost::storage::PropertyOwner;
using simhost::storage::SwitchKey;
using simhost::storage::Transaction;

namespace {

// The item of the property of `owner` that comes after `last`, or of the first one; null after the
// last one, and when the owner is gone.
void *item_after(Call &call, Transaction &transaction, PropertyOwner const &owner,
                 void const *last) {
  if (!simhost::is_there(transaction, owner)) {
    return nullptr;
  }
  auto const name = last == nullptr ? std::string_view()
                                    : std::string_view(call.handles().get_item(last).content.name);
  auto next = simhost::next_property(transaction, owner, name);
  return next ? call.handles().of_property(owner, *std::move(next)) : nullptr;
}

// The host gives up on the handle of what is gone before the walk only: a callback may remove what
// it walks over, which ends the walk.
template <typename OwnerOf>
void walk_properties(char const *name, void const *handle, DVSPortDataCallback callback,
                     void *context, OwnerOf const &owner_of) {
  if (handle == nullptr || callback == nullptr) {
    return;
  }
  void *item = nullptr;
  simhost::run(name, [&](Call &call) {
    auto &transaction = call.reading();
    item = item_after(call, transaction, owner_of(call, transaction, handle), nullptr);
  });
  while (item != nullptr && simhost::call_back(callback, item, context) != 0) {
    simhost::run(
        name,
        [&](Call &call) {
          auto const owner = call.handles().get_item(item).owner;
          item = item_after(call, call.reading(), owner, item);
        },
        Call::Resumed{});
  }
}

template <typename OwnerOf>
QEX_ReturnStatus look_up(char const *name, char const *switch_id, char const *key,
                         DVSDataItem *item, OwnerOf const &owner_of) {
  return answer(name, [&](Call &call) {
    auto const target = simhost::switch_identified(switch_id);
    auto const wanted = require_text(key);
    auto &output = simhost::require(item);
    auto &transaction = call.reading();
    auto const owner = owner_of(simhost::found(transaction, target));
    auto property = simhost::get_property(transaction, owner, wanted);
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
  return answer(__func__, [&](Call &call) {
    auto const image = simhost::argument_bytes(state, length);
    simhost::load_state(call.changing(), image, simhost::Extent::persistent);
  });
}

QEX_ReturnStatus DVSState_ConfigReset(void) {
  return answer(__func__, [&](Call &call) { simhost::clear_state(call.changing()); });
}

DVSwitchHandle DVSState_SwitchFindByAlias(char const *alias) {
  DVSwitchHandle handle = nullptr;
  simhost::run(__func__, [&](Call &call) {
    if (alias != nullptr) {
      handle = simhost::handle_of_switch(call, alias);
    }
  });
  return handle;
}

DVSPortHandle DVSState_PortFind(char const *switchId, char const *port) {
  DVSPortHandle handle = nullptr;
  simhost::run(__func__, [&](Call &call) {
    if (switchId != nullptr && port != nullptr) {
      handle = simhost::handle_of_port(call, switchId, port);
    }
  });
  return handle;
}

void DVSState_SwitchForEach(DVSwitchCallback callback, void *context) {
  if (callback == nullptr) {
    return;
  }
  SwitchKey last{};
  void *handle = nullptr;
  auto const step = [&](Call &call) { handle = simhost::handle_after(call, last); };
  simhost::run(__func__, step);
  while (handle != nullptr && simhost::call_back(callback, handle, context) != 0) {
    simhost::run(__func__, step, Call::Resumed{});
  }
}

void DVSState_PortForEach(DVSwitchHandle handle, DVSPortCallback callback, void *context) {
  if (handle == nullptr || callback == nullptr) {
    return;
  }
  SwitchKey key{};
  simhost::run(__func__,
               [&](Call &call) { key = simhost::live_switch(call, call.reading(), handle).key; });
  PortNumber last{};
  void *port = nullptr;
  auto const step = [&](Call &call) { port = simhost::handle_after(call, key, last); };
  do {
    simhost::run(__func__, step, Call::Resumed{});
  } while (port != nullptr && simhost::call_back(callback, port, context) != 0);
}

void DVSState_GlobalPropForEach(DVSwitchHandle handle, DVSPortDataCallback callback,
                                void *context) {
  walk_properties(__func__, handle, callback, context,
                  [](Call &call, Transaction &transaction, void const *of) {
                    return PropertyOwner::global(simhost::live_switch(call, transaction, of).key);
                  });
}

void DVSState_HostPropForEach(DVSwitchHandle handle, DVSPortDataCallback callback, void *context) {
  walk_properties(__func__, handle, callback, context,
                  [](Call &call, Transaction &transaction, void const *of) {
                    return PropertyOwner::host(simhost::live_switch(call, transaction, of).key);
                  });
}

void DVSState_PortDataForEach(DVSPortHandle handle, DVSPortDataCallback callback, void *context) {
  walk_properties(__func__, handle, callback, context,
                  [](Call &call, Transaction &transaction, void const *of) {
                    return simhost::owner_of(simhost::live_port(call, transaction, of));
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
