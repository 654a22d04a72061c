// Names that reading a document, describing a host and telling of documents have in common, beside
// those that forms declare.
#pragma once

#include <array>
#include <string_view>

namespace simhost::scenario {

/// What a description adds to an object, and a reader passes over.
inline constexpr std::string_view kObserved = "observed";

namespace keys {

inline constexpr char const *clock = "clock";
inline constexpr char const *underlay = "underlay";
inline constexpr char const *uplinks = "uplinks";
inline constexpr char const *runtime_options = "runtime_options";
inline constexpr char const *mac_learning = "mac_learning";
inline constexpr char const *switches = "switches";
inline constexpr char const *faults = "faults";
inline constexpr char const *uplink_ports = "uplink_ports";
inline constexpr char const *fabric = "fabric";
inline constexpr char const *lags = "lags";
inline constexpr char const *ports = "ports";
inline constexpr char const *addresses = "addresses";
inline constexpr char const *device = "device";
inline constexpr char const *groups = "groups";
inline constexpr char const *counters = "counters";
inline constexpr char const *mirror_counters = "mirror_counters";
inline constexpr char const *properties = "properties";
inline constexpr char const *host_properties = "host_properties";

}  // namespace keys

/// What a document and its larger objects consist of, beside their own members and settings.
inline constexpr auto kDocumentParts = std::to_array<std::string_view>(
    {keys::clock, keys::underlay, keys::uplinks, keys::runtime_options, keys::mac_learning,
     keys::switches, keys::faults, kObserved});
inline constexpr auto kSwitchParts = std::to_array<std::string_view>(
    {keys::fabric, keys::uplink_ports, keys::uplinks, keys::lags, keys::addresses, keys::counters,
     keys::mirror_counters, keys::properties, keys::host_properties, keys::ports, kObserved});
inline constexpr auto kPortParts = std::to_array<std::string_view>(
    {keys::device, keys::addresses, keys::groups, keys::counters, keys::properties, kObserved});
inline constexpr auto kUplinkPortParts =
    std::to_array<std::string_view>({keys::properties, kObserved});

}  // namespace simhost::scenario
