// The mirror sessions of a port, one by one.
#pragma once

#include <string_view>

#include "base/api.h"
#include "base/bytes.h"
#include "model/mirror/properties.h"
#include "storage/ports.h"
#include "vswitch/mirror.h"

namespace simhost::mirror {

/// The bytes of a caller's table, whose size only its counts tell. Refuses a wrong magic number
/// (QEX_BAD_PARAM) and counts past the limits (QEX_LIMIT_EXCEEDED).
SIMHOST_API BytesView table_bytes(DVMirrorSessionTable const &table);

/// Adds the sessions of a table. Refuses an identifier that is taken (QEX_EXISTS).
SIMHOST_API void append_sessions(storage::ChangingTransaction &transaction,
                                 storage::Port const &port, BytesView table);
/// Refuses an identifier that no session has (QEX_NOT_FOUND).
SIMHOST_API void remove_session(storage::ChangingTransaction &transaction,
                                storage::Port const &port, std::string_view sid);

}  // namespace simhost::mirror
