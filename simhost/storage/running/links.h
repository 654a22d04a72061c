// The rows of the uplinks' links, and of the link-aggregation groups with their uplinks.
#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "storage/switches.h"

namespace simhost::storage {

/// The link of an uplink; as it is here while nobody has touched it.
struct Link {
  bool carrier = true;          ///< the cable is plugged in
  bool admin = true;            ///< the host has not switched it off
  bool partner = true;          ///< the other end takes part in link aggregation
  std::uint32_t speed = 10000;  ///< Mbit/s
  bool full_duplex = true;
  bool beacons = true;              ///< the beacons of the other uplinks arrive
  std::uint32_t error_percent = 0;  ///< of its frames are damaged
  bool driver = true;               ///< the driver of the card is loaded
  /// When it came up last, by the host's clock; the beginning of time if it was never down.
  std::chrono::milliseconds up_since = {};

  [[nodiscard]] bool up() const { return carrier && admin; }
};

std::optional<Link> find_link(Transaction &transaction, std::string_view uplink);
/// Sets the link of an uplink, whether or not it was there.
void put_link(ChangingTransaction &transaction, std::string_view uplink, Link const &link);

/// The number of a link-aggregation group: unique on the host.
enum class LagId : std::uint32_t {};

struct LagRow {
  LagId id;
  std::string name;
  bool is_fast = false;  ///< its partner is to tell of itself each second, not each 30 seconds
  std::vector<std::string> uplinks = {};
};

/// The groups of a switch, in the order in which they were made.
std::vector<LagRow> all_lags(Transaction &transaction, SwitchKey key);
std::optional<LagId> find_lag(Transaction &transaction, SwitchKey key, std::string_view name);
/// Makes a group without uplinks. Its name is unique on the switch.
LagId insert_lag(ChangingTransaction &transaction, SwitchKey key, std::string_view name);
void set_lag_rate(ChangingTransaction &transaction, LagId lag, bool is_fast);
/// How many groups the switch has.
std::uint32_t count_lags(Transaction &transaction, SwitchKey key);
/// Whether an uplink is in a group.
bool is_in_lag(Transaction &transaction, std::string_view uplink);
/// Puts an uplink that is in no group at the end of one.
void add_to_lag(ChangingTransaction &transaction, LagId lag, std::string_view uplink);
/// Takes all uplinks out of a group.
void empty_lag(ChangingTransaction &transaction, LagId lag);

}  // namespace simhost::storage
