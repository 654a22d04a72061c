// Groups: lists of actions, some or all of which a frame undergoes.
#pragma once

#include <compare>
#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "planes/openvswitch/openflow/action.h"
#include "planes/openvswitch/openflow/field.h"
#include "planes/openvswitch/openflow/port.h"

namespace simhost::openflow {

struct Bucket {
  std::uint32_t id = 0;      // up to 0xffffff00, unique in the group
  std::uint16_t weight = 1;  // its share, in a select group
  // It is live while this port is; and while this group has a live bucket.
  Port watch_port = kAnyPort;
  GroupId watch_group = kAnyGroup;
  Actions actions{};

  friend auto operator<=>(Bucket const &, Bucket const &) = default;
};

enum class GroupType : std::uint8_t {
  all,            // a copy of the frame for each bucket
  select,         // one live bucket, chosen by a hash
  indirect,       // the only bucket
  fast_failover,  // the first live one
};

/// How a select group chooses, where it is not left to the switch.
struct Selection {
  std::string method;               // "hash" or "dp_hash"; up to 15 characters
  std::uint64_t parameter = 0;      // makes hashes others
  std::map<Field, Value> fields{};  // what "hash" looks at, of each the bits that count

  friend auto operator<=>(Selection const &, Selection const &) = default;
};

/// Groups are ordered by their numbers.
struct Group {
  GroupId id = 0;  // up to 0xffffff00
  GroupType type = GroupType::all;
  Selection selection{};
  std::vector<Bucket> buckets{};

  friend auto operator<=>(Group const &, Group const &) = default;
};

}  // namespace simhost::openflow
