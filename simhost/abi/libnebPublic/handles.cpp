// DVS_*: what handles of switches and ports designate.

#include "abi/handles.h"
#include "abi/boundary.h"
#include "abi/live_handles.h"
#include "model/ports/ports.h"
#include "nebpublic/data.h"
#include "vswitch/properties.h"

using simhost::Call;

namespace {

using simhost::storage::Switch;

// What `result_of` makes of a switch; `nothing` for a null handle.
template <typename Result, typename ResultOf>
Result of_switch(char const *name, DVSwitchHandle handle, Result nothing,
                 ResultOf const &result_of) {
  auto result = nothing;
  simhost::run(name, [&](Call &call) {
    if (handle != nullptr) {
      result = result_of(call, simhost::live_switch(call, call.reading(), handle).row);
    }
  });
  return result;
}

}  // namespace

extern "C" {

char const *DVS_SwitchId(DVSwitchHandle handle) {
  return of_switch<char const *>(__func__, handle, nullptr, [](Call &call, Switch const &row) {
    return call.handles().lasting(row.identifier);
  });
}

char const *DVS_SwitchName(DVSwitchHandle handle) {
  return of_switch<char const *>(__func__, handle, nullptr, [](Call &call, Switch const &row) {
    return call.handles().lasting(row.alias);
  });
}

char const *DVS_ClassName(DVSwitchHandle handle) {
  return of_switch<char const *>(__func__, handle, nullptr,
                                 [](Call &, Switch const &) { return PS_CLASS_NAME; });
}

int DVS_GetMaxPorts(DVSwitchHandle handle) {
  return of_switch(__func__, handle, 0,
                   [](Call &, Switch const &row) { return static_cast<int>(row.max_ports); });
}

NEBVersion DVS_Version(DVSwitchHandle handle) {
  return of_switch(__func__, handle, NEBVersion{0},
                   [](Call &, Switch const &row) { return NEBVersion{row.version}; });
}

char const *DVS_PortId(DVSPortHandle handle) {
  char const *identifier = nullptr;
  simhost::run(__func__, [&](Call &call) {
    if (handle != nullptr) {
      identifier =
          call.handles().lasting(simhost::live_port(call, call.reading(), handle).identifier);
    }
  });
  return identifier;
}

char const *DVS_PortAlias(DVSPortHandle handle) {
  char const *alias = nullptr;
  simhost::run(__func__, [&](Call &call) {
    if (handle == nullptr) {
      return;
    }
    auto &transaction = call.reading();
    auto const port = simhost::live_port(call, transaction, handle);
    if (auto const text = simhost::alias_of(transaction, port)) {
      alias = call.handles().lasting(*text);
    }
  });
  return alias;
}

}  // extern "C"
