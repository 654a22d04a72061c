// What hosts and routers say of groups: IGMP, MLD, advertisements of multicast routers (MRD), and
// hellos of PIM. Frames are read that nobody vouches for: what is wrong is no message.
#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <span>
#include <variant>
#include <vector>

#include "planes/openvswitch/multicast/address.h"

namespace simhost::multicast {

/// The unit in which a query tells how long members may take to reply.
inline constexpr std::chrono::milliseconds kResponseUnit{100};

/// A router asks who is a member.
struct Query {
  unsigned version = 0;                         ///< 1 to 3 of IGMP, 1 or 2 of MLD
  std::optional<Address> group = std::nullopt;  ///< none: of all groups
  std::vector<Address> sources = {};            ///< only those, if there are any
  std::chrono::milliseconds response{};         ///< in which members have to reply
  unsigned robustness = 0;                      ///< how often it asks; 0 if it does not say so
  std::chrono::seconds interval{};              ///< between its queries; 0 if it does not say so

  friend bool operator==(Query const &, Query const &) = default;
};

enum class RecordType : std::uint8_t {
  is_include = 1,
  is_exclude = 2,
  to_include = 3,
  to_exclude = 4,
  allow = 5,
  block = 6,
};

struct Record {
  RecordType type = RecordType::is_exclude;
  Address group;
  std::vector<Address> sources = {};

  friend bool operator==(Record const &, Record const &) = default;
};

/// A member says what it wants. Reports without sources are records, too: one who joins excludes
/// nothing, one who leaves includes nothing.
struct Report {
  unsigned version = 0;
  std::vector<Record> records;

  friend bool operator==(Report const &, Report const &) = default;
};

/// A multicast router says that it is there for so long; it goes if that is nothing.
struct RouterHello {
  std::chrono::seconds hold{};

  friend bool operator==(RouterHello const &, RouterHello const &) = default;
};

struct Message {
  Address source;  ///< its family is that of the message
  std::variant<Query, Report, RouterHello> content;
};

/// Reads a frame with up to two tags. None if it is another one, or anything is wrong with it: its
/// lengths, its checksums, fragments, or what has to come from a neighbour and does not.
std::optional<Message> decode(std::span<std::uint8_t const> frame);

}  // namespace simhost::multicast
