// Both sides in the order of their places, side by side.
#include "planes/openvswitch/reconcile/difference.h"

#include <algorithm>
#include <compare>
#include <map>
#include <set>
#include <utility>
#include <variant>

#include "planes/openvswitch/reconcile/relearning.h"

namespace simhost::openvswitch {
namespace {

using openflow::Flow;
using openflow::Group;

using Specs = decltype(openflow::Learn::specs);

struct InOrder {
  bool operator()(Specs const *one, Specs const *other) const { return *one < *other; }
};

// What is learned where, by the cookies that it is known by: how long it stays, and how much of it
// there may be, makes it nothing else.
using Learned = std::map<LearnedFlows, std::set<Specs const *, InOrder>>;

void add_learned(openflow::Actions const &actions, Learned &learned) {
  for (auto const &action : actions) {
    if (auto const *const learn = std::get_if<openflow::Learn>(&action)) {
      learned[{.table = learn->table, .cookie = learn->cookie}].insert(&learn->specs);
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
    if (found != after.end() && !std::ranges::includes(found->second, specs, InOrder())) {
      changed.push_back(flows);
    }
  }
  return changed;
}

template <typename Value, typename Place>
std::vector<Value const *> in_order(std::span<Value const> values, Place const &place) {
  std::vector<Value const *> pointers;
  pointers.reserve(values.size());
  for (auto const &value : values) {
    pointers.push_back(&value);
  }
  auto const less = [&](auto const *one, auto const *other) { return place(*one) < place(*other); };
  // What was compiled is so already.
  if (!std::ranges::is_sorted(pointers, less)) {
    std::ranges::sort(pointers, less);
  }
  return pointers;
}

// Does `removed` with what is only present, `added` with what is only wanted, and `both` with
// pairs.
template <typename Value, typename Place, typename Removed, typename Added, typename Both>
void side_by_side(std::span<Value const> present_values, std::span<Value const> wanted_values,
                  Place const &place, Removed const &removed, Added const &added,
                  Both const &both) {
  auto const present = in_order(present_values, place);
  auto const wanted = in_order(wanted_values, place);
  auto have = present.begin();
  auto want = wanted.begin();
  while (have != present.end() && want != wanted.end()) {
    auto const order = place(**have) <=> place(**want);
    if (std::is_lt(order)) {
      removed(**have++);
    } else if (std::is_gt(order)) {
      added(**want++);
    } else {
      both(**have++, **want++);
    }
  }
  std::for_each(have, present.end(), [&](auto const *one) { removed(*one); });
  std::for_each(want, wanted.end(), [&](auto const *one) { added(*one); });
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
      present_groups, wanted_groups, [](Group const &group) { return group.id; },
      [&](Group const &group) { all.removed_groups.push_back(group.id); },
      [&](Group const &group) { all.added_groups.push_back(group); },
      [&](Group const &present, Group const &wanted) {
        if (present != wanted) {
          all.changed_groups.push_back(wanted);
        }
      });
  all.forgotten = learned_otherwise(learned_by(present_flows), learned_by(wanted_flows));
  Teachers const teachers(wanted_flows);
  auto const stays_or_is_forgotten = [&](Flow const &flow) {
    LearnedFlows const known{.table = flow.table, .cookie = flow.cookie};
    return teachers.teach(flow) || std::ranges::binary_search(all.forgotten, known);
  };
  side_by_side(
      present_flows, wanted_flows, [](Flow const &flow) { return place(flow); },
      [&](Flow const &flow) {
        if (!stays_or_is_forgotten(flow)) {
          all.removed_flows.push_back(flow);
        }
      },
      [&](Flow const &flow) { all.added_flows.push_back(flow); },
      [&](Flow const &present, Flow const &wanted) {
        if (settings(present) != settings(wanted)) {
          all.added_flows.push_back(wanted);
        } else if (present.actions != wanted.actions) {
          all.changed_flows.push_back(wanted);
        }
      });
  return all;
}

}  // namespace simhost::openvswitch
