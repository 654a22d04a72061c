// DVS_*: what handles of switches and ports designate.

#include "abi/handles.h"
#include "abi/boundary.h"
#include "abi/live_handles.h"
#include "model/ports/ports.h"
#include "nebpublic/data.h"
#include "vswitch/properties.h"

namespace simhost {
namespace {

// What `result_of` makes of a switch; `nothing` for a null handle.
template <typename Result, typename ResultOf>
Result of_switch(char const *name, DVSwitchHandle handle, Result nothing,
                 ResultOf const &result_of) {
  return reading_or_trap(name, [&](ReadingCall &call) {
    return handle == nullptr ? nothing : result_of(call, live_switch(call, handle).row);
  });
}

}  // namespace

extern "C" {

char const *DVS_SwitchId(DVSwitchHandle handle) {
  return of_switch<char const *>(__func__, handle, nullptr,
                                 [](Call &call, storage::Switch const &row) {
                                   return call.handles().lasting(row.identifier);
                                 });
}

char const *DVS_SwitchName(DVSwitchHandle handle) {
  return of_switch<char const *>(
      __func__, handle, nullptr,
      [](Call &call, storage::Switch const &row) { return call.handles().lasting(row.alias); });
}

char const *DVS_ClassName(DVSwitchHandle handle) {
  return of_switch<char const *>(__func__, handle, nullptr,
                                 [](Call &, storage::Switch const &) { return PS_CLASS_NAME; });
}

int DVS_GetMaxPorts(DVSwitchHandle handle) {
  return of_switch(__func__, handle, 0, [](Call &, storage::Switch const &row) {
    return static_cast<int>(row.max_ports);
  });
}

NEBVersion DVS_Version(DVSwitchHandle handle) {
  return of_switch(__func__, handle, NEBVersion{0},
                   [](Call &, storage::Switch const &row) { return NEBVersion{row.version}; });
}

char const *DVS_PortId(DVSPortHandle handle) {
  return reading_or_trap(__func__, [&](ReadingCall &call) -> char const * {
    return handle == nullptr ? nullptr : call.handles().lasting(live_port(call, handle).identifier);
  });
}

char const *DVS_PortAlias(DVSPortHandle handle) {
  return reading_or_trap(__func__, [&](ReadingCall &call) -> char const * {
    if (handle == nullptr) {
      return nullptr;
    }
    auto const alias = alias_of(call.transaction(), live_port(call, handle));
    return alias ? call.handles().lasting(*alias) : nullptr;
  });
}

}  // extern "C"
}  // namespace simhost
