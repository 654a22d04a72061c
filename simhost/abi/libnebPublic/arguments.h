// Bytes as callers pass them: an address and a length.
#pragma once

#include <cstdint>

#include "abi/boundary.h"
#include "abi/targets.h"
#include "base/bytes.h"

namespace simhost {

/// Refuses a negative length, and null with any but 0 (QEX_BAD_PARAM).
inline BytesView argument_bytes(void const *data, std::int64_t length) {
  if (length < 0 || (data == nullptr && length != 0)) {
    refuse(QEX_BAD_PARAM);
  }
  return {static_cast<std::byte const *>(data), static_cast<std::size_t>(length)};
}

/// Refuses null (QEX_BAD_PARAM).
inline void *require_handle(void *handle) {
  if (handle == nullptr) {
    refuse(QEX_BAD_PARAM);
  }
  return handle;
}

/// Where a call returns bytes that it allocates.
struct Output {
  void **data;
  int *length;
};

/// Refuses null (QEX_BAD_PARAM).
inline Output output_at(void **data, int *length) {
  return {.data = &require(data), .length = &require(length)};
}

inline void allocate_copy(Call &call, Output const &output, BytesView bytes) {
  *output.data = allocate<void>(call, bytes);
  *output.length = static_cast<int>(bytes.size());
}

}  // namespace simhost
