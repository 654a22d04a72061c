// The first slot that has a link, all of them, or the one that there is.
#include "planes/openvswitch/compile/outlets.h"

#include <algorithm>
#include <cstdint>
#include <utility>

#include "planes/openvswitch/compile/program.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;

openflow::Selection selection_of(Way const &way) {
  if (way.balance == Balance::source) {
    return {.method = "hash", .fields = {{Field::eth_src, openflow::ones(48)}}};
  }
  if (way.balance == Balance::addresses) {
    return {.method = "hash",
            .fields = {{Field::ip_src, openflow::ones(32)},
                       {Field::ip_dst, openflow::ones(32)},
                       {Field::ipv6_src, openflow::ones(128)},
                       {Field::ipv6_dst, openflow::ones(128)}}};
  }
  return {};
}

// What is in frames that those of one flow have in common.
openflow::Selection selection_by_flow() {
  openflow::Selection selection{.method = "hash", .fields = {}};
  for (auto const &[field, bits] : {std::pair(Field::eth_src, 48U),
                                    {Field::eth_dst, 48U},
                                    {Field::ip_src, 32U},
                                    {Field::ip_dst, 32U},
                                    {Field::ipv6_src, 128U},
                                    {Field::ipv6_dst, 128U},
                                    {Field::tcp_src, 16U},
                                    {Field::tcp_dst, 16U},
                                    {Field::udp_src, 16U},
                                    {Field::udp_dst, 16U}}) {
    selection.fields.emplace(field, openflow::ones(bits));
  }
  return selection;
}

// The groups that spread what slots carry over their uplinks.
class Spreading {
 public:
  // Makes one unless it is there.
  openflow::GroupId of(Slot slot) {
    std::sort(slot.begin(), slot.end());
    auto const found = numbers_.find(slot);
    if (found != numbers_.end()) {
      return found->second;
    }
    auto const nth = static_cast<openflow::GroupId>(
        std::count_if(numbers_.begin(), numbers_.end(),
                      [&](auto const &other) { return other.first.front() == slot.front(); }));
    auto const number = kSpreadingGroups | nth << 16U | slot.front();
    openflow::Group group{.id = number,
                          .type = openflow::GroupType::select,
                          .selection = selection_by_flow(),
                          .buckets = {}};
    // By their numbers, so that flows stay where they are when others come and go.
    for (auto const uplink : slot) {
      group.buckets.push_back({.id = uplink, .watch_port = uplink, .actions = over(uplink)});
    }
    groups_.push_back(std::move(group));
    numbers_.emplace(std::move(slot), number);
    return number;
  }

  std::vector<openflow::Group> groups() && { return std::move(groups_); }

 private:
  std::map<Slot, openflow::GroupId> numbers_;
  std::vector<openflow::Group> groups_;
};

Actions over_slot(Slot const &slot, Spreading &spreading) {
  return slot.size() == 1 ? over(slot.front())
                          : Actions{openflow::ToGroup{.group = spreading.of(slot)}};
}

// The first slot with a link.
openflow::Group failing_over(Way const &way, Spreading &spreading) {
  openflow::Group group{
      .id = kSendingGroups | way.number, .type = openflow::GroupType::fast_failover, .buckets = {}};
  std::uint32_t id = 0;
  for (auto const &slot : way.slots) {
    openflow::Bucket bucket{.id = id++, .actions = over_slot(slot, spreading)};
    if (slot.size() == 1) {
      bucket.watch_port = slot.front();
    } else {
      bucket.watch_group = spreading.of(slot);
    }
    group.buckets.push_back(std::move(bucket));
  }
  return group;
}

// All uplinks, whichever slots they are in.
openflow::Group spreading_frames(Way const &way) {
  openflow::Group group{.id = kSendingGroups | way.number,
                        .type = openflow::GroupType::select,
                        .selection = selection_of(way),
                        .buckets = {}};
  std::uint32_t id = 0;
  for (auto const &slot : way.slots) {
    for (auto const uplink : slot) {
      group.buckets.push_back({.id = id++, .watch_port = uplink, .actions = over(uplink)});
    }
  }
  return group;
}

}  // namespace

Actions over(openflow::Port uplink) {
  return {openflow::set(field::kWire, uplink), go_to(table::kWires)};
}

Outlets outlets_of(Ways const &ways) {
  Outlets outlets;
  Spreading spreading;
  for (auto const &way : ways.all()) {
    auto &actions = outlets.actions[way.number];
    if (way.balance == Balance::mesh) {
      actions = {go_to(table::kMesh)};
    } else if (way.slots.size() == 1 && (way.is_single() || !way.spreads_frames())) {
      actions = over_slot(way.slots.front(), spreading);
    } else {
      outlets.groups.push_back(way.spreads_frames() ? spreading_frames(way)
                                                    : failing_over(way, spreading));
      actions = {openflow::ToGroup{.group = kSendingGroups | way.number}};
    }
  }
  std::ranges::move(std::move(spreading).groups(), std::back_inserter(outlets.groups));
  return outlets;
}

}  // namespace simhost::openvswitch
