// Mirror session tables: what the host accepts as one, and the sessions of a port.
#pragma once

#include <string_view>

#include "base/api.h"
#include "base/bytes.h"
#include "model/properties/keys.h"
#include "storage/ports.h"
#include "vswitch/mirror.h"

namespace simhost {

/// More than any port has; what a count in a caller's table may claim without having it.
inline constexpr qex_uint32 kMostMirrorSessions = 1024;
inline constexpr qex_uint32 kMostMirrorEntities = 65536;

/// The rules of VSPROP_PORT_MIRROR_SESSIONS: refuses a wrong magic number, another size than the
/// counts make, unknown values and bits, entities that are not in the table, no session identifier
/// (QEX_BAD_PARAM), an unknown version (QEX_VERSION_MISMATCH_MAJOR), VLANs past 4094
/// (QEX_BAD_VLANID), texts that do not end (QEX_NAME_TOO_LONG), an identifier twice (QEX_EXISTS),
/// more sessions or entities than above (QEX_LIMIT_EXCEEDED).
void check_mirror_sessions(Setting const &setting);

/// The bytes of a caller's table, whose size only its counts tell. Refuses a wrong magic number
/// (QEX_BAD_PARAM) and counts past the limits (QEX_LIMIT_EXCEEDED).
SIMHOST_API BytesView mirror_table_bytes(DVMirrorSessionTable const &table);

/// The sessions of a port; a table without sessions if it has none.
SIMHOST_API Bytes mirror_sessions_of(storage::Transaction &transaction, storage::Port const &port);
/// Adds the sessions of a table. Refuses an identifier that is taken (QEX_EXISTS).
SIMHOST_API void append_mirror_sessions(storage::Transaction &transaction,
                                        storage::Port const &port, BytesView table);
/// Refuses an identifier that no session has (QEX_NOT_FOUND).
SIMHOST_API void remove_mirror_session(storage::Transaction &transaction, storage::Port const &port,
                                       std::string_view sid);

}  // namespace simhost
