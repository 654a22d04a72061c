// Both sides in the order of their places, side by side.
#include "planes/openvswitch/reconcile/difference.h"

#include <algorithm>
#include <set>
#include <utility>
#include <variant>

namespace simhost::openvswitch {
namespace {

using openflow::Flow;
using openflow::Group;

// Where something is learned, and by which cookie it is known.
using Learned = std::set<std::pair<std::uint8_t, std::uint64_t>>;

void add_learned(openflow::Actions const &actions, Learned &learned) {
  for (auto const &action : actions) {
    if (auto const *const learn = std::get_if<openflow::Learn>(&action)) {
      learned.emplace(learn->table, learn->cookie);
    } else if (auto const *const clone = std::get_if<openflow::Clone>(&action)) {
      add_learned(clone->actions, learned);
    }
  }
}

Learned learned_by(std::span<Flow const> flows) {
  Learned learned;
  for (auto const &flow : flows) {
    add_learned(flow.actions, learned);
  }
  return learned;
}

template <typename Value, typename Less>
std::vector<Value const *> in_order(std::span<Value const> values, Less const &less) {
  std::vector<Value const *> pointers;
  pointers.reserve(values.size());
  for (auto const &value : values) {
    pointers.push_back(&value);
  }
  std::ranges::sort(pointers,
                    [&](auto const *one, auto const *other) { return less(*one, *other); });
  return pointers;
}

// Does `removed` with what is only present, `added` with what is only wanted, and `both` with
// pairs.
template <typename Value, typename Less, typename Removed, typename Added, typename Both>
void side_by_side(std::span<Value const> present_values, std::span<Value const> wanted_values,
                  Less const &less, Removed const &removed, Added const &added, Both const &both) {
  auto const present = in_order(present_values, less);
  auto const wanted = in_order(wanted_values, less);
  auto have = present.begin();
  auto want = wanted.begin();
  while (have != present.end() || want != wanted.end()) {
    if (want == wanted.end() || (have != present.end() && less(**have, **want))) {
      removed(**have++);
    } else if (have == present.end() || less(**want, **have)) {
      added(**want++);
    } else {
      both(**have++, **want++);
    }
  }
}

bool differ_only_in_actions(Flow const &one, Flow const &other) {
  auto same = one;
  same.actions = other.actions;
  return same == other;
}

}  // namespace

bool Difference::empty() const {
  return added_groups.empty() && changed_groups.empty() && added_flows.empty() &&
         changed_flows.empty() && removed_flows.empty() && removed_groups.empty();
}

Difference difference(std::span<Flow const> present_flows, std::span<Group const> present_groups,
                      std::span<Flow const> wanted_flows, std::span<Group const> wanted_groups) {
  Difference all;
  side_by_side(
      present_groups, wanted_groups,
      [](Group const &one, Group const &other) { return one.id < other.id; },
      [&](Group const &group) { all.removed_groups.push_back(group.id); },
      [&](Group const &group) { all.added_groups.push_back(group); },
      [&](Group const &present, Group const &wanted) {
        if (present != wanted) {
          all.changed_groups.push_back(wanted);
        }
      });
  auto const learned = learned_by(wanted_flows);
  side_by_side(
      present_flows, wanted_flows,
      [](Flow const &one, Flow const &other) { return place(one) < place(other); },
      [&](Flow const &flow) {
        if (!learned.contains({flow.table, flow.cookie})) {
          all.removed_flows.push_back(flow);
        }
      },
      [&](Flow const &flow) { all.added_flows.push_back(flow); },
      [&](Flow const &present, Flow const &wanted) {
        if (differ_only_in_actions(present, wanted)) {
          if (present.actions != wanted.actions) {
            all.changed_flows.push_back(wanted);
          }
        } else {
          all.added_flows.push_back(wanted);
        }
      });
  return all;
}

}  // namespace simhost::openvswitch
