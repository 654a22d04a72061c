// Both sides in the order of their places, side by side.
#include "planes/openvswitch/reconcile/difference.h"

#include <algorithm>
#include <map>
#include <set>
#include <utility>
#include <variant>

namespace simhost::openvswitch {
namespace {

using openflow::Flow;
using openflow::Group;

using Specs = decltype(openflow::Learn::specs);
// What is learned where, by the cookies that it is known by: how long it stays, and how much of it
// there may be, makes it nothing else.
using Learned = std::map<LearnedFlows, std::set<Specs>>;

void add_learned(openflow::Actions const &actions, Learned &learned) {
  for (auto const &action : actions) {
    if (auto const *const learn = std::get_if<openflow::Learn>(&action)) {
      learned[{.table = learn->table, .cookie = learn->cookie}].insert(learn->specs);
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

// What is learned now and was before, in another way.
std::vector<LearnedFlows> learned_otherwise(Learned const &before, Learned const &after) {
  std::vector<LearnedFlows> changed;
  for (auto const &[flows, specs] : before) {
    auto const found = after.find(flows);
    if (found != after.end() && !std::ranges::includes(found->second, specs)) {
      changed.push_back(flows);
    }
  }
  return changed;
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
  return forgotten.empty() && added_groups.empty() && changed_groups.empty() &&
         added_flows.empty() && changed_flows.empty() && removed_flows.empty() &&
         removed_groups.empty();
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
  all.forgotten = learned_otherwise(learned_by(present_flows), learned);
  side_by_side(
      present_flows, wanted_flows,
      [](Flow const &one, Flow const &other) { return place(one) < place(other); },
      [&](Flow const &flow) {
        if (!learned.contains({.table = flow.table, .cookie = flow.cookie})) {
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
