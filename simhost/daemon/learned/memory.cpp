// A flow is made anew by the one that taught it, as that is now.
#include "daemon/learned/memory.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <set>
#include <utility>

#include "planes/openvswitch/compile/pipeline.h"
#include "planes/openvswitch/reconcile/relearning.h"

namespace simhost::daemon {
namespace {

using openflow::Field;
using openflow::Flow;
using openvswitch::Counted;
using openvswitch::LearnedFlows;
using storage::Remembered;
using storage::RememberedAs;

constexpr std::uint16_t kPriority = 100;
constexpr auto kVlan = openflow::ones(openvswitch::kVlanBits);
// A source that was seen no later than that after the last time need not be put into the state.
constexpr storage::SeenAt kSeenAnew = std::chrono::seconds(1);

// What is learned in which table, and how.
struct Kind {
  std::uint8_t table;
  RememberedAs as;
  Counted counted;
  Field address;
};

constexpr std::array kKinds{Kind{openvswitch::table::kFirstAddresses, RememberedAs::first,
                                 Counted::first_address, Field::eth_dst},
                            Kind{openvswitch::table::kLearnedAddresses, RememberedAs::learned,
                                 Counted::learned, Field::eth_dst},
                            Kind{openvswitch::table::kCountedSources, RememberedAs::counted,
                                 Counted::counted_source, Field::eth_src}};

Flow flow_of(Remembered const &address) {
  auto const &kind = *std::ranges::find(kKinds, address.as, &Kind::as);
  openflow::EthernetAddress mac{};
  std::ranges::transform(address.mac, mac.begin(),
                         [](std::byte one) { return static_cast<std::uint8_t>(one); });
  Flow flow;
  flow.table = kind.table;
  flow.priority = kPriority;
  flow.cookie = openvswitch::cookie(
      kind.counted, static_cast<std::uint32_t>(address.port.value_or(storage::PortNumber{})));
  flow.match.with(kind.address, openflow::to_value(mac));
  if (address.vlan) {
    flow.match.with(openvswitch::field::kDomain, *address.vlan, kVlan);
  }
  return flow;
}

std::optional<Flow> relearned(openvswitch::Teachers const &teachers, Flow const &flow) {
  auto const learn = teachers.how_learned({.table = flow.table, .cookie = flow.cookie});
  return learn ? openvswitch::relearned(*learn, flow) : std::nullopt;
}

}  // namespace

Flow where_learned(Flow const &source) {
  auto const &fields = source.match.fields();
  Flow flow;
  flow.table = openvswitch::table::kLearnedAddresses;
  flow.priority = kPriority;
  for (auto const &[field, matched] : fields) {
    flow.match.with(field == Field::eth_src ? Field::eth_dst : field, matched.value, matched.mask);
  }
  return flow;
}

std::optional<Remembered> learned_in(Flow const &flow) {
  auto const kind = std::ranges::find(kKinds, flow.table, &Kind::table);
  if (kind == kKinds.end()) {
    return std::nullopt;
  }
  auto const &fields = flow.match.fields();
  auto const mac = fields.find(kind->address);
  if (mac == fields.end()) {
    return std::nullopt;
  }
  Remembered learned{.as = kind->as, .vlan = std::nullopt, .mac = {}, .port = std::nullopt};
  std::ranges::transform(openflow::to_address<6>(mac->second.value), learned.mac.begin(),
                         [](std::uint8_t one) { return std::byte{one}; });
  if (auto const vlan = fields.find(openvswitch::field::kDomain); vlan != fields.end()) {
    learned.vlan = static_cast<std::uint16_t>(vlan->second.value);
  }
  if (auto const port = openvswitch::number_of(flow.cookie); port != 0) {
    learned.port = storage::PortNumber{port};
  }
  // Whatever else a flow has, it was not learned.
  auto const as_learned = flow_of(learned);
  bool const is_learned = place(flow) == place(as_learned) && flow.cookie == as_learned.cookie;
  return is_learned ? std::optional(learned) : std::nullopt;
}

Memory::OfBridge &Memory::of_bridge(storage::SwitchKey key) {
  auto found = bridges_.find(key);
  if (found == bridges_.end()) {
    OfBridge known;
    storage::ReadingTransaction transaction(store_);
    for (auto const &address : storage::remembered_of(transaction, key)) {
      auto flow = flow_of(address);
      Place const place = openflow::place(flow);
      known.flows.emplace(place, Known{.flow = std::move(flow), .seen = {.seen = address.seen}});
    }
    found = bridges_.emplace(key, std::move(known)).first;
  }
  return found->second;
}

void Memory::note(storage::SwitchKey key, Known const &known, bool is_known) {
  if (auto address = learned_in(known.flow)) {
    address->seen = known.seen.seen;
    unsaved_.push_back({.key = key, .address = *address, .is_known = is_known});
    changed_();
  }
}

template <typename IsGone>
void Memory::remove(storage::SwitchKey key, IsGone const &is_gone) {
  std::erase_if(of_bridge(key).flows, [&](auto const &flow) {
    bool const goes = is_gone(flow.second);
    if (goes) {
      note(key, flow.second, false);
    }
    return goes;
  });
}

std::optional<std::uint32_t> Memory::follow(storage::SwitchKey key,
                                            openflow::FlowUpdate const &update) {
  using Event = openflow::FlowUpdate::Event;
  if (update.event >= Event::own || !learned_in(update.flow)) {
    return std::nullopt;
  }
  auto &flows = of_bridge(key).flows;
  auto const place = openflow::place(update.flow);
  auto const known = flows.find(place);
  if (update.event == Event::removed) {
    if (known != flows.end()) {
      note(key, known->second, false);
      flows.erase(known);
    }
    return std::nullopt;
  }
  auto const port = openvswitch::number_of(update.flow.cookie);
  bool const is_elsewhere =
      known != flows.end() && openvswitch::number_of(known->second.flow.cookie) != port;
  if (known != flows.end()) {
    known->second.flow = update.flow;
    known->second.is_missed = false;
    if (is_elsewhere) {
      note(key, known->second, true);
    }
  } else {
    bool const is_source = update.flow.table == openvswitch::table::kCountedSources;
    Known learned{.flow = update.flow};
    if (is_source) {
      learned.seen.seen = seen_now();
    }
    note(key, learned, true);
    flows.emplace(place, std::move(learned));
  }
  return is_elsewhere && update.flow.table == openvswitch::table::kLearnedAddresses
             ? std::optional(port)
             : std::nullopt;
}

bool Memory::miss(storage::SwitchKey key, Flow const &flow) {
  auto &flows = of_bridge(key).flows;
  auto const known = flows.find(openflow::place(flow));
  if (known == flows.end()) {
    return false;
  }
  known->second.is_missed = true;
  return true;
}

void Memory::replace(storage::SwitchKey key, std::span<Flow const> flows) {
  std::set<Place> there;
  for (auto const &flow : flows) {
    there.insert(openflow::place(flow));
  }
  remove(key, [&](Known const &known) {
    return !known.is_missed && !there.contains(openflow::place(known.flow));
  });
  for (auto const &flow : flows) {
    openflow::FlowUpdate update;
    update.flow = flow;
    follow(key, update);
  }
}

void Memory::follow_devices(storage::SwitchKey key,
                            std::map<std::string, std::uint32_t> const &devices) {
  auto &known = of_bridge(key).devices;
  if (known == devices) {
    return;
  }
  for (auto const &[device, port] : std::exchange(known, devices)) {
    auto const now = devices.find(device);
    if (now == devices.end() || now->second != port) {
      remove(key, [gone = port](Known const &one) {
        return openvswitch::number_of(one.flow.cookie) == gone;
      });
    }
  }
}

void Memory::forget(storage::SwitchKey key) {
  remove(key, [](Known const &) { return true; });
}

void Memory::keep(std::set<storage::SwitchKey> const &switches) {
  std::erase_if(bridges_, [&](auto const &known) { return !switches.contains(known.first); });
  std::erase_if(unsaved_, [&](Unsaved const &one) { return !switches.contains(one.key); });
}

std::vector<Source> Memory::saw(storage::SwitchKey key,
                                std::span<openflow::FlowEntry const> sources, storage::SeenAt now) {
  auto &flows = of_bridge(key).flows;
  std::vector<Source> unseen_for;
  for (auto const &entry : sources) {
    auto const known = flows.find(openflow::place(entry.flow));
    if (known == flows.end()) {
      continue;
    }
    auto &sighting = known->second.seen;
    auto const since = unseen(entry, sighting, now);
    auto const seen = now - std::chrono::duration_cast<storage::SeenAt>(since);
    bool const is_news = !sighting.seen || seen - *sighting.seen >= kSeenAnew;
    sighting = {.seen = is_news ? seen : sighting.seen, .flow_age = entry.age, .unseen = since};
    if (is_news) {
      note(key, known->second, true);
    }
    unseen_for.push_back({.flow = entry.flow, .unseen = since});
  }
  return unseen_for;
}

bool Memory::save() {
  if (unsaved_.empty()) {
    return true;
  }
  bool const is_saved =
      storage::commit_if_free(store_, [this](storage::ChangingTransaction &transaction) {
        for (auto const &[key, address, is_known] : unsaved_) {
          if (is_known) {
            storage::remember(transaction, key, address);
          } else {
            storage::remove_remembered(transaction, key, address);
          }
        }
      });
  if (is_saved) {
    unsaved_.clear();
  }
  return is_saved;
}

template <typename Condition>
std::vector<Flow> Memory::flows_that(storage::SwitchKey key, Condition const &condition) const {
  std::vector<Flow> flows;
  if (auto const found = bridges_.find(key); found != bridges_.end()) {
    for (auto const &[place, known] : found->second.flows) {
      if (condition(known.flow)) {
        flows.push_back(known.flow);
      }
    }
  }
  return flows;
}

std::vector<Flow> Memory::learned_at(storage::SwitchKey key, std::uint32_t port) const {
  return flows_that(key,
                    [&](Flow const &flow) { return openvswitch::number_of(flow.cookie) == port; });
}

std::vector<Flow> Memory::learned_addresses(storage::SwitchKey key) const {
  return flows_that(
      key, [](Flow const &flow) { return flow.table == openvswitch::table::kLearnedAddresses; });
}

std::vector<Flow> Memory::learned_of(storage::SwitchKey key,
                                     openflow::EthernetAddress const &address,
                                     std::uint16_t vlan) const {
  std::vector<Flow> flows;
  auto const bridge = bridges_.find(key);
  for (auto const as : {RememberedAs::learned, RememberedAs::counted}) {
    Remembered learned{.as = as, .vlan = vlan, .mac = {}, .port = std::nullopt};
    std::ranges::transform(address, learned.mac.begin(),
                           [](std::uint8_t one) { return std::byte{one}; });
    if (bridge != bridges_.end()) {
      auto const known = bridge->second.flows.find(openflow::place(flow_of(learned)));
      if (known != bridge->second.flows.end()) {
        flows.push_back(known->second.flow);
      }
    }
  }
  return flows;
}

std::vector<Flow> Memory::learned(storage::SwitchKey key, LearnedFlows const &known) const {
  return flows_that(key, [&](Flow const &flow) {
    return flow.table == known.table && flow.cookie == known.cookie;
  });
}

std::vector<Flow> Memory::recall(storage::SwitchKey key, openflow::FlowParts const &wanted,
                                 std::chrono::seconds aging, storage::SeenAt now) {
  std::set<Place> aged;
  for (auto const &[place, known] : of_bridge(key).flows) {
    if (known.seen.seen && is_aged(now - *known.seen.seen, aging)) {
      aged.insert(place);
      aged.insert(openflow::place(where_learned(known.flow)));
    }
  }
  remove(key, [&](Known const &known) { return aged.contains(openflow::place(known.flow)); });
  std::vector<Flow> recalled;
  openvswitch::Teachers const teachers(wanted);
  for (auto const &[place, known] : of_bridge(key).flows) {
    if (auto again = relearned(teachers, known.flow)) {
      recalled.push_back(*std::move(again));
    }
  }
  return recalled;
}

std::vector<Flow> Memory::missed(storage::SwitchKey key, openflow::FlowParts const &wanted) const {
  std::vector<Flow> flows;
  auto const bridge = bridges_.find(key);
  if (bridge == bridges_.end()) {
    return flows;
  }
  std::optional<openvswitch::Teachers> teachers;
  for (auto const &[place, known] : bridge->second.flows) {
    if (known.is_missed) {
      if (!teachers) {
        teachers.emplace(wanted);
      }
      if (auto again = relearned(*teachers, known.flow)) {
        flows.push_back(*std::move(again));
      }
    }
  }
  return flows;
}

std::vector<Flow> Memory::with_other_timeouts(storage::SwitchKey key,
                                              openflow::FlowParts const &wanted) const {
  std::vector<Flow> others;
  openvswitch::Teachers const teachers(wanted);
  for (auto const &flow : flows_that(key, [](Flow const &) { return true; })) {
    auto again = relearned(teachers, flow);
    if (again && again->hard_timeout != flow.hard_timeout) {
      others.push_back(*std::move(again));
    }
  }
  return others;
}

}  // namespace simhost::daemon
