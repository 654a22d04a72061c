// Side by side, in the order of the places, but for what both have in common.
#include "planes/openvswitch/reconcile/difference.h"

#include <algorithm>
#include <compare>
#include <map>
#include <set>
#include <utility>

#include "planes/openvswitch/reconcile/relearning.h"

namespace simhost::openvswitch {
namespace {

using openflow::Flow;
using openflow::Group;
using openflow::Learn;

using Specs = decltype(Learn::specs);

struct InOrder {
  bool operator()(Specs const *one, Specs const *other) const { return *one < *other; }
};

// What is learned where, by the cookies that it is known by: how long it stays, and how much of it
// there may be, makes it nothing else.
using Learned = std::map<LearnedFlows, std::set<Specs const *, InOrder>>;

// What is learned by `wanted`, as far as it was learned by what goes: nearly all flows stay.
Learned learned_instead(openflow::FlowParts const &wanted, Learned const &gone) {
  Learned learned;
  if (!gone.empty()) {
    for (auto const &flow : wanted) {
      for_each_learn(flow.actions, [&](Learn const &learn) {
        if (auto const taught = taught_by(learn); gone.contains(taught)) {
          learned[taught].insert(&learn.specs);
        }
      });
    }
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

// Without those that somebody wanted teaches, and those that are forgotten anyway.
std::vector<Flow> removed(std::vector<Flow const *> const &unwanted,
                          openflow::FlowParts const &wanted,
                          std::vector<LearnedFlows> const &forgotten) {
  std::set<LearnedFlows> known;
  for (auto const *flow : unwanted) {
    known.insert(cookie_of(*flow));
  }
  std::vector<Flow> removed;
  if (!known.empty()) {
    Teachers const teachers(wanted, known);
    for (auto const *flow : unwanted) {
      if (!teachers.teach(*flow) && !std::ranges::binary_search(forgotten, cookie_of(*flow))) {
        removed.push_back(*flow);
      }
    }
  }
  return removed;
}

// Does `removed` with what is only present, `added` with what is only wanted, and `both` with
// pairs.
template <typename Values, typename Place, typename Removed, typename Added, typename Both>
void side_by_side(Values const &present, Values const &wanted, Place const &place,
                  Removed const &removed, Added const &added, Both const &both) {
  auto have = present.begin();
  auto want = wanted.begin();
  while (have != present.end() && want != wanted.end()) {
    auto const order = place(*have) <=> place(*want);
    if (std::is_lt(order)) {
      removed(*have++);
    } else if (std::is_gt(order)) {
      added(*want++);
    } else {
      both(*have++, *want++);
    }
  }
  std::for_each(have, present.end(), removed);
  std::for_each(want, wanted.end(), added);
}

}  // namespace

bool Difference::empty() const {
  return forgotten.empty() && added_groups.empty() && changed_groups.empty() &&
         added_flows.empty() && changed_flows.empty() && removed_flows.empty() &&
         removed_groups.empty();
}

Difference difference(openflow::FlowParts const &present_flows,
                      std::span<Group const> present_groups,
                      openflow::FlowParts const &wanted_flows,
                      std::span<Group const> wanted_groups) {
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
  std::vector<Flow const *> unwanted;
  Learned gone;
  auto const note_learned = [&](Flow const &flow) {
    for_each_learn(flow.actions,
                   [&](Learn const &learn) { gone[taught_by(learn)].insert(&learn.specs); });
  };
  side_by_side(
      present_flows.beside(wanted_flows), wanted_flows.beside(present_flows),
      [](Flow const *flow) { return place(*flow); },
      [&](Flow const *flow) {
        note_learned(*flow);
        unwanted.push_back(flow);
      },
      [&](Flow const *flow) { all.added_flows.push_back(*flow); },
      [&](Flow const *present, Flow const *wanted) {
        bool const is_same_kind = settings(*present) == settings(*wanted);
        if (!is_same_kind || present->actions != wanted->actions) {
          note_learned(*present);
          (is_same_kind ? all.changed_flows : all.added_flows).push_back(*wanted);
        }
      });
  all.forgotten = learned_otherwise(gone, learned_instead(wanted_flows, gone));
  all.removed_flows = removed(unwanted, wanted_flows, all.forgotten);
  return all;
}

}  // namespace simhost::openvswitch
