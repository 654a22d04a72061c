// The tables of a state file, and the marks by which one is recognised.
#pragma once

#include <cstdint>

namespace simhost::storage {

/// "VSim": no other program's database carries it.
inline constexpr std::int64_t kApplicationId = 0x5653696D;
/// Rises with every change of the tables, by a step of state_format.cpp that brings a file of the
/// version before forward.
inline constexpr std::int64_t kSchemaVersion = 15;
/// The version that the first of those steps begins with; what is older is refused.
inline constexpr std::int64_t kOldestSchema = 3;

/// Creates the tables of an empty database.
extern char const *const kSchema;
/// Likewise those of the runtime state of the configuration that the tables of kSchema hold.
extern char const *const kRunningSchema;
/// Likewise the generations of the switches that are there.
extern char const *const kGenerationSchema;
/// Likewise those of a host whose frames a daemon moves.
extern char const *const kFramesSchema;
/// Likewise those of what its frames counted.
extern char const *const kReadingSchema;
/// Likewise those of what its data path learned.
extern char const *const kRememberedSchema;
/// Adds to those when it was seen last.
extern char const *const kSeenSchema;
/// Likewise those of a host that shares switches with others.
extern char const *const kSharedSchema;
/// Adds to groups what they agree on with their partners.
extern char const *const kLacpSchema;
/// Likewise those of what joins it to other hosts.
extern char const *const kFabricSchema;
/// Likewise those of the uplinks that ports use for what they send.
extern char const *const kChosenSchema;
/// Likewise those of what is counted at several hosts.
extern char const *const kCountedSchema;
/// Likewise the names of what is shared that a transaction touched.
extern char const *const kTouchedSchema;
/// Adds to those what a transaction touched of tunnels.
extern char const *const kTouchedTunnelsSchema;

}  // namespace simhost::storage
