// A change is written as it is sent, but with the same numbers as all that are like it.
#include "planes/openvswitch/openflow/form.h"

#include <algorithm>
#include <bit>
#include <cstddef>
#include <type_traits>
#include <utility>
#include <variant>

#include "planes/openvswitch/openflow/codec/requests.h"

namespace simhost::openflow {
namespace {

// Of many changes a bundle takes so long that one wait more is nothing.
constexpr std::size_t kMostChanges = 256;
// What is made of a switch has some dozens; all are forgotten when there are more than that.
constexpr std::size_t kMostForms = 4096;
constexpr std::size_t kLongestForm = 1024;

bool takes_any(Field field) {
  return (field >= Field::reg0 && field <= Field::reg15) || field == Field::metadata ||
         field == Field::tun_id || field == Field::eth_src || field == Field::eth_dst;
}

Port port_like(Port port) {
  return port > 0 && port <= kLastOwn ? 1 : port;
}

// Of a flow, or of a learned one.
std::uint64_t cookie_like(std::uint64_t cookie) {
  return cookie == ~std::uint64_t{0} ? cookie : 0;
}

Value value_like(Field field, Value value) {
  if (takes_any(field)) {
    return 0;
  }
  if (field == Field::vlan_vid) {
    return value & kVlanPresent;
  }
  return field == Field::in_port ? port_like(static_cast<Port>(value)) : value;
}

Match like(Match const &match) {
  Match masked;
  for (auto const &[field, content] : match.fields()) {
    masked.with(field, value_like(field, content.value), content.mask);
  }
  return masked;
}

Actions like(Actions const &actions);

template <typename Kind>
Kind like(Kind const &action) {
  return action;
}
Output like(Output const &action) {
  return {port_like(action.port)};
}
SetField like(SetField const &action) {
  return {
      .field = action.field, .value = value_like(action.field, action.value), .mask = action.mask};
}
Clone like(Clone const &action) {
  return {like(action.actions)};
}

void mask_number(SubField const &where, std::variant<SubField, Value> &content) {
  auto *const number = std::get_if<Value>(&content);
  if (number != nullptr && takes_any(where.field)) {
    *number = 0;
  }
}

void mask_spec(LearnedMatch &spec) {
  mask_number(spec.field, spec.content);
}
void mask_spec(LearnedLoad &spec) {
  mask_number(spec.destination, spec.content);
}
void mask_spec(LearnedOutput & /*spec*/) {}

Learn like(Learn const &action) {
  auto masked = action;
  masked.cookie = cookie_like(masked.cookie);
  for (auto &spec : masked.specs) {
    std::visit([](auto &one) { mask_spec(one); }, spec);
  }
  return masked;
}

// Whether the next actions are taken or refused as if it were not there.
bool leaves_all(Action const &action) {
  auto const *const set = std::get_if<SetField>(&action);
  return std::holds_alternative<Output>(action) || std::holds_alternative<Resubmit>(action) ||
         (set != nullptr && takes_any(set->field));
}

Actions like(Actions const &actions) {
  Actions masked;
  std::size_t first = 0;  // since others changed what the next ones meet
  for (auto const &action : actions) {
    auto one = std::visit([](auto const &kind) { return Action(like(kind)); },
                          static_cast<Action::variant const &>(action));
    if (!leaves_all(one)) {
      masked.push_back(std::move(one));
      first = masked.size();
    } else if (std::find(masked.begin() + static_cast<std::ptrdiff_t>(first), masked.end(), one) ==
               masked.end()) {
      masked.push_back(std::move(one));
    }
  }
  return masked;
}

// With those of its clones.
std::size_t count_of(Actions const &actions) {
  auto count = actions.size();
  for (auto const &action : actions) {
    if (auto const *const clone = std::get_if<Clone>(&action)) {
      count += count_of(clone->actions);
    }
  }
  return count;
}

// Not exactly: one action more makes the form no other one, but twice as many do.
char magnitude_of(Change const &change) {
  auto const *const of_flow = std::get_if<FlowChange>(&change);
  return of_flow == nullptr ? '\0'
                            : static_cast<char>(std::bit_width(count_of(of_flow->flow.actions)));
}

FlowChange like(FlowChange const &change) {
  auto const &flow = change.flow;
  auto masked = change;
  masked.flow.match = like(flow.match);
  masked.flow.cookie = cookie_like(flow.cookie);
  masked.flow.actions = like(flow.actions);
  return masked;
}

}  // namespace

std::string form_of(Change const &change) {
  Writer out;
  put_change(out, 0, std::visit([](auto const &kind) { return Change(like(kind)); }, change));
  std::string form(1, magnitude_of(change));
  form.append(out.bytes().begin(), out.bytes().end());
  return form;
}

bool KnownForms::include(Changes const &changes) const {
  return changes.size() <= kMostChanges && std::ranges::all_of(changes, [&](Change const &change) {
           return forms_.contains(form_of(change));
         });
}

void KnownForms::add(Changes const &changes) {
  if (changes.size() > kMostChanges) {
    return;
  }
  if (forms_.size() + changes.size() > kMostForms) {
    forms_.clear();
  }
  for (auto const &change : changes) {
    if (auto form = form_of(change); form.size() <= kLongestForm) {
      forms_.insert(std::move(form));
    }
  }
}

}  // namespace simhost::openflow
