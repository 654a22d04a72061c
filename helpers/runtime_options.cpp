// The runtime options list; see runtime_options.h.

#include "helpers/runtime_options.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <string_view>

#include "helpers/exported.h"

namespace {

constexpr size_t kHeaderSize = sizeof(VSRuntimeOptionHeader);
constexpr size_t kLengthSize = sizeof(VSRuntimeOptions);
constexpr size_t kLongestText = VS_CHARDEV_MAX_RUNTIME_STRING_OPTION_LENGTH - 1;

std::uintptr_t address(void const *position) {
  return reinterpret_cast<std::uintptr_t>(position);
}

VSRuntimeOptionHeader *after(void *position, size_t bytes) {
  return reinterpret_cast<VSRuntimeOptionHeader *>(address(position) + bytes);
}

bool lies_inside(VSRuntimeOptions const *list, VSRuntimeOptionHeader const *position) {
  return address(position) < address(list) + list->totalLength;
}

bool is_text(VSRuntimeOptionHeader const *option) {
  return option->type > VS_RT_OPT_ALLOW_MIRROR_STATS;
}

/// The option at `at` if `length` bytes fit there, and where the next one goes.
VSRuntimeOptionHeader *write(VSRuntimeOptions *list, VSRuntimeOptionHeader *at, int type,
                             size_t length, void const *value) {
  VSRuntimeOptionHeader *const next = after(at, length);
  if (!lies_inside(list, next)) {
    return nullptr;
  }
  at->type = static_cast<qex_uint16>(type);
  at->length = static_cast<qex_uint16>(length);
  std::memcpy(after(at, kHeaderSize), value, length - kHeaderSize);
  return next;
}

}  // namespace

extern "C" {

char const *runtimeOptionNames[VS_NUM_RT_OPT] = {
    "IGMPQueryInterval",   "IGMPV3MaxSrcIPNum",
    "IGMPQueries",         "IGMPVersion",
    "MLDVersion",          "MLDV2MaxSrcIPNum",
    "MaxRARPsPerInterval", "RARPAdvertisementDuration",
    "ReversePathFwdCheck", "ReversePathFwdCheckPromisc",
    "AllowFastPath",       "TeamPolicyUpDelay",
    "AllowMirrorStats",    "IGMPRouterIP",
    "MLDRouterIP"};

EXPORTED int get_runtime_option_type_from_name(char *name) {
  if (name == nullptr) {
    return VS_NUM_RT_OPT;
  }
  auto **const found = std::find(std::begin(runtimeOptionNames), std::end(runtimeOptionNames),
                                 std::string_view(name));
  return static_cast<int>(found - std::begin(runtimeOptionNames));
}

VSRuntimeOptions *runtime_options_new(int size) {
  // Fewer bytes than the length takes would be overrun by setting it.
  auto const bytes = static_cast<size_t>(size);
  auto *const list = static_cast<VSRuntimeOptions *>(std::malloc(std::max(bytes, kLengthSize)));
  if (list != nullptr) {
    list->totalLength = static_cast<qex_uint32>(size);
  }
  return list;
}

VSRuntimeOptionHeader *runtime_options_add_int(VSRuntimeOptions *list, VSRuntimeOptionHeader *at,
                                               char const * /*name*/, int type, int value) {
  return write(list, at, type, kHeaderSize + sizeof value, &value);
}

VSRuntimeOptionHeader *runtime_options_add_text(VSRuntimeOptions *list, VSRuntimeOptionHeader *at,
                                                char const * /*name*/, int type,
                                                char const *value) {
  size_t const length = std::strlen(value);
  return length <= kLongestText ? write(list, at, type, kHeaderSize + length + 1, value) : nullptr;
}

void runtime_options_set_length(VSRuntimeOptions *list, int used) {
  list->totalLength = static_cast<qex_uint32>(used) + kLengthSize;
}

VSRuntimeOptionHeader *runtime_options_first(VSRuntimeOptions *list) {
  return after(list, kLengthSize);
}

VSRuntimeOptionHeader *runtime_options_next(VSRuntimeOptions *list, VSRuntimeOptionHeader *option) {
  VSRuntimeOptionHeader *const next = after(option, option->length);
  return lies_inside(list, next) ? next : nullptr;
}

char const *runtime_option_name(VSRuntimeOptionHeader *option) {
  return *(static_cast<char const **>(runtimeOptionNames) + option->type);
}

PyObject *runtime_option_value(VSRuntimeOptionHeader *option) {
  void const *const value = after(option, kHeaderSize);
  if (is_text(option)) {
    return PyBytes_FromString(static_cast<char const *>(value));
  }
  qex_uint32 number = 0;
  std::memcpy(&number, value, sizeof number);
  return PyLong_FromUnsignedLong(number);
}

}  // extern "C"
