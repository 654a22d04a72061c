// What a frame said is what the flow that was learned of it matches.
#include "planes/openvswitch/reconcile/relearning.h"

#include <algorithm>
#include <utility>
#include <variant>

namespace simhost::openvswitch {
namespace {

using openflow::Flow;
using openflow::Learn;
using openflow::Value;

// Whether two make the same flow of a frame, each as long as it may.
bool make_the_same(Learn one, Learn const &other) {
  one.limit = other.limit;
  one.result = other.result;
  return one == other;
}

bool add(openflow::LearnedMatch const &spec, Flow const &before, Flow &flow) {
  if (auto const *const number = std::get_if<Value>(&spec.content)) {
    flow.match.with(spec.field.field, *number << spec.field.first,
                    openflow::ones(spec.field.bits) << spec.field.first);
    return true;
  }
  auto const found = before.match.fields().find(spec.field.field);
  if (found == before.match.fields().end()) {
    return false;
  }
  flow.match.with(found->first, found->second.value, found->second.mask);
  return true;
}

bool add(openflow::LearnedLoad const &spec, Flow const & /*before*/, Flow &flow) {
  auto const *const number = std::get_if<Value>(&spec.content);
  if (number != nullptr) {
    flow.actions.emplace_back(openflow::load(spec.destination, *number));
  }
  return number != nullptr;
}

bool add(openflow::LearnedOutput const & /*spec*/, Flow const & /*before*/, Flow & /*flow*/) {
  return false;
}

}  // namespace

Teachers::Teachers(openflow::FlowParts flows) : flows_(std::move(flows)) {
  for (auto const &flow : flows_) {
    for_each_learn(flow.actions,
                   [&](Learn const &learn) { ways_[taught_by(learn)].push_back(&learn); });
  }
}

Teachers::Teachers(openflow::FlowParts flows, std::set<LearnedFlows> const &learned)
    : flows_(std::move(flows)) {
  for (auto const &flow : flows_) {
    for_each_learn(flow.actions, [&](Learn const &learn) {
      if (auto const taught = taught_by(learn); learned.contains(taught)) {
        ways_[taught].push_back(&learn);
      }
    });
  }
}

std::optional<Learn> Teachers::how_learned(LearnedFlows const &learned) const {
  auto const found = ways_.find(learned);
  if (found == ways_.end()) {
    return std::nullopt;
  }
  auto const &ways = found->second;
  bool const is_one_way = std::ranges::all_of(
      ways, [&](Learn const *way) { return make_the_same(*way, *ways.front()); });
  return is_one_way ? std::optional(*ways.front()) : std::nullopt;
}

bool Teachers::teach(Flow const &flow) const {
  auto const found = ways_.find({.table = flow.table, .cookie = flow.cookie});
  return found != ways_.end() && std::ranges::any_of(found->second, [&](Learn const *way) {
           auto const taught = relearned(*way, flow);
           return taught && place(*taught) == place(flow) && taught->actions == flow.actions;
         });
}

std::optional<Flow> relearned(Learn const &learn, Flow const &before) {
  Flow flow;
  flow.table = learn.table;
  flow.priority = learn.priority;
  flow.cookie = learn.cookie;
  flow.idle_timeout = learn.idle_timeout;
  flow.hard_timeout = learn.hard_timeout;
  flow.tells_removal = learn.tells_removal;
  for (auto const &spec : learn.specs) {
    if (!std::visit([&](auto const &one) { return add(one, before, flow); }, spec)) {
      return std::nullopt;
    }
  }
  return flow;
}

}  // namespace simhost::openvswitch
