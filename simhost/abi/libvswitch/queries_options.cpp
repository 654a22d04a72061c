// VSQEX_*: the runtime options of the host.
#include <numeric>
#include <vector>

#include "abi/targets.h"
#include "model/options/runtime_options.h"
#include "vswitch/queries.h"

namespace simhost {
namespace {

std::vector<qex_uint16> wanted_types(qex_uint16 const *ids, qex_uint16 count) {
  if (ids == nullptr && count == 0) {
    std::vector<qex_uint16> all(VS_NUM_RT_OPT);
    std::iota(all.begin(), all.end(), qex_uint16{0});
    return all;
  }
  auto const *const first = &require(ids);
  return {first, first + count};
}

}  // namespace

extern "C" {

QEX_ReturnStatus VSQEX_GetRuntimeOptions(qex_uint16 const *ids, qex_uint16 count,
                                         VSRuntimeOptions **options) {
  return reading(__func__, [&](ReadingCall &call) {
    auto &output = require(options);
    auto const types = wanted_types(ids, count);
    auto const list = packed_runtime_options(call.transaction(), types);
    output = allocate<VSRuntimeOptions>(call, list);
  });
}

QEX_ReturnStatus VSQEX_SetRuntimeOptions(VSRuntimeOptions *options) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const &list = require(options);
    set_runtime_options(call.transaction(), list);
  });
}

}  // extern "C"
}  // namespace simhost
