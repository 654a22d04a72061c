// Each group at a port is looked at when something of it is due, and not before: reports that come
// in time only put that off.
#include "planes/openvswitch/multicast/membership.h"

#include <algorithm>
#include <iterator>
#include <utility>
#include <variant>

namespace simhost::multicast {
namespace {

using namespace std::chrono_literals;

// In which members reply: to queries of all groups, to the first one, and to those about a member
// that left. No longer than half the interval.
constexpr Time kResponse = 10s;
constexpr Time kFirstResponse = 1s;
constexpr Time kLastResponse = 1s;
// The first queries come so many times as often as the others.
constexpr int kFirstQueriesFaster = 4;

// Of routers that do not say how often they ask.
constexpr unsigned kUsualRobustness = 2;
constexpr auto kUsualInterval = 125s;

}  // namespace

Time Membership::response() const {
  return std::min<Time>(kResponse, Time(options_.interval) / 2);
}

Timing Membership::timing() const {
  return {.membership = options_.robustness * Time(options_.interval) + response(),
          .between_asking = std::min(kLastResponse, response()),
          .times_asked = options_.robustness};
}

Time Membership::first_response() const {
  return std::min(kFirstResponse, response());
}

void Membership::set_options(Options const &options, Time now) {
  if (options == options_) {
    return;
  }
  options_ = options;
  groups_.clear();
  routers_.clear();
  due_ = {};
  next_of_places_.reset();
  ++revision_;
  for (auto const &[place, schedule] : places_) {
    begin(place, now);
  }
}

void Membership::begin(Place const &place, Time now) {
  auto &schedule = places_[place];
  schedule = {.first_queries_left = options_.robustness, .next_query = now};
  if (is_asking()) {
    schedule.undecided_until = now + 2 * first_response();
    look_at(schedule);
    ++revision_;
  }
}

void Membership::set_places(std::set<Place> const &places, Time now) {
  std::vector<Place> gone;
  for (auto const &[place, schedule] : places_) {
    if (!places.contains(place)) {
      gone.push_back(place);
    }
  }
  for (auto const &place : gone) {
    forget(place);
  }
  for (auto const &place : places) {
    if (!places_.contains(place)) {
      begin(place, now);
    }
  }
}

void Membership::forget(Place const &place) {
  places_.erase(place);
  std::erase_if(routers_, [&](auto const &router) { return router.first.place == place; });
  for (auto group = groups_.lower_bound({.vlan = place.vlan, .address = {}});
       group != groups_.end() && group->first.vlan == place.vlan;) {
    group->second.erase(place.port);
    group = group->second.empty() ? groups_.erase(group) : std::next(group);
  }
  ++revision_;
}

void Membership::receive(Place const &place, Message const &message, Time now) {
  auto const family = message.source.family;
  if (!places_.contains(place) || !options_.of(family).is_heard) {
    return;
  }
  if (auto const *query = std::get_if<Query>(&message.content)) {
    receive_query(place, message, *query, now);
  } else if (auto const *report = std::get_if<Report>(&message.content)) {
    receive_report(place, *report, now);
  } else {
    auto const hold = std::get<RouterHello>(message.content).hold;
    Router const router{.place = place, .family = family};
    if (hold == 0s) {
      remove_router(router);
    } else {
      put_router(router, now + hold);
    }
  }
}

void Membership::receive_query(Place const &place, Message const &message, Query const &query,
                               Time now) {
  // A switch that asks for others has no address.
  if (is_unspecified(message.source)) {
    return;
  }
  auto const robustness = query.robustness == 0 ? kUsualRobustness : query.robustness;
  auto const interval = query.interval == 0s ? kUsualInterval : query.interval;
  put_router({.place = place, .family = message.source.family},
             now + robustness * interval + query.response);
}

void Membership::put_router(Router const &router, Time until) {
  auto const [known, is_new] = routers_.emplace(router, until);
  known->second = std::max(known->second, until);
  revision_ += is_new ? 1 : 0;
}

void Membership::remove_router(Router const &router) {
  revision_ += routers_.erase(router);
}

void Membership::receive_report(Place const &place, Report const &report, Time now) {
  for (auto const &record : report.records) {
    if (!is_for_all(record.group)) {
      receive_record(place, record, report.version, now);
    }
  }
}

void Membership::receive_record(Place const &place, Record const &record, unsigned version,
                                Time now) {
  GroupAtPort const key{.group = {.vlan = place.vlan, .address = record.group}, .port = place.port};
  auto *known = find(key);
  if (known == nullptr) {
    auto &groups = places_.at(place).groups;
    if (groups == kMostGroups) {
      return;
    }
    ++groups;
    known = &groups_[key.group][key.port];
  }
  auto const before = known->filter.wanted();
  auto const &options = options_.of(record.group.family);
  known->version = version;
  known->reported = now;
  known->filter.apply(record, level_of(record.group.family, version),
                      {.level = level_of(record.group.family, options.version),
                       .most_sources = options.most_sources},
                      timing(), now);
  settle(key, *known, before);
}

Membership::Known *Membership::find(GroupAtPort const &key) {
  auto const group = groups_.find(key.group);
  if (group == groups_.end()) {
    return nullptr;
  }
  auto const member = group->second.find(key.port);
  return member == group->second.end() ? nullptr : &member->second;
}

void Membership::settle(GroupAtPort const &key, Known &known, Sources const &before) {
  if (known.filter.wanted() != before) {
    ++revision_;
  }
  if (known.filter.is_over()) {
    remove(key);
    return;
  }
  auto const next = known.filter.next();
  if (next && (!known.looked_at || *next < *known.looked_at)) {
    known.looked_at = next;
    due_.emplace(*next, key);
  }
}

void Membership::remove(GroupAtPort const &key) {
  auto const group = groups_.find(key.group);
  group->second.erase(key.port);
  if (group->second.empty()) {
    groups_.erase(group);
  }
  --places_.at({.port = key.port, .vlan = key.group.vlan}).groups;
}

std::optional<Time> Membership::next() const {
  auto next = next_of_places_;
  auto const sooner = [&](Time time) { next = next ? std::min(*next, time) : time; };
  for (auto const &[router, until] : routers_) {
    sooner(until);
  }
  if (!due_.empty()) {
    sooner(due_.top().first);
  }
  return next;
}

std::vector<Asked> Membership::advance(Time now) {
  std::vector<Asked> asked;
  advance_groups(now, asked);
  advance_places(now, asked);
  revision_ += std::erase_if(routers_, [&](auto const &router) { return router.second <= now; });
  return asked;
}

void Membership::advance_groups(Time now, std::vector<Asked> &asked) {
  while (!due_.empty() && due_.top().first <= now) {
    auto const [time, key] = due_.top();
    due_.pop();
    auto *const known = find(key);
    if (known == nullptr || known->looked_at != time) {
      continue;
    }
    known->looked_at.reset();
    auto const before = known->filter.wanted();
    for (auto &sources : known->filter.advance(timing(), now)) {
      ask_about(key, std::move(sources), asked);
    }
    settle(key, *known, before);
  }
}

void Membership::ask_about(GroupAtPort const &key, std::vector<Address> sources,
                           std::vector<Asked> &asked) const {
  auto const family = key.group.address.family;
  auto const level = level_of(family, options_.of(family).version);
  // Older queries ask for less.
  if (level == Level::joins || (level == Level::leaves && !sources.empty())) {
    return;
  }
  auto query = query_of(family, timing().between_asking);
  query.group = key.group.address;
  query.sources = std::move(sources);
  asked.push_back({.place = {.port = key.port, .vlan = key.group.vlan},
                   .family = family,
                   .query = std::move(query)});
}

Query Membership::query_of(Family family, Time response) const {
  return {.version = options_.of(family).version,
          .response = response,
          .robustness = options_.robustness,
          .interval = options_.interval};
}

void Membership::advance_places(Time now, std::vector<Asked> &asked) {
  if (!next_of_places_ || *next_of_places_ > now) {
    return;
  }
  next_of_places_.reset();
  for (auto &[place, schedule] : places_) {
    if (schedule.next_query <= now) {
      ask_all(place, schedule, now, asked);
    }
    if (schedule.undecided_until && *schedule.undecided_until <= now) {
      schedule.undecided_until.reset();
      ++revision_;
    }
    look_at(schedule);
  }
}

void Membership::ask_all(Place const &place, Schedule &schedule, Time now,
                         std::vector<Asked> &asked) const {
  bool const is_first = schedule.first_queries_left > 0;
  for (auto const family : {Family::ipv4, Family::ipv6}) {
    if (options_.of(family).is_heard) {
      asked.push_back({.place = place,
                       .family = family,
                       .query = query_of(family, is_first ? first_response() : response())});
    }
  }
  schedule.first_queries_left -= is_first ? 1 : 0;
  auto const interval = Time(options_.interval);
  schedule.next_query =
      now + (schedule.first_queries_left > 0 ? interval / kFirstQueriesFaster : interval);
}

void Membership::look_at(Schedule const &schedule) {
  auto const next = schedule.undecided_until
                        ? std::min(schedule.next_query, *schedule.undecided_until)
                        : schedule.next_query;
  next_of_places_ = next_of_places_ ? std::min(*next_of_places_, next) : next;
}

Groups Membership::groups() const {
  Groups all;
  for (auto const &[group, members] : groups_) {
    all.groups.push_back({.vlan = group.vlan, .address = group.address, .members = {}});
    for (auto const &[port, known] : members) {
      all.groups.back().members.push_back({.port = port, .sources = known.filter.wanted()});
    }
  }
  for (auto const &[router, until] : routers_) {
    all.routers.push_back(router);
  }
  for (auto const &[place, schedule] : places_) {
    if (schedule.undecided_until) {
      all.undecided.push_back(place);
    }
  }
  return all;
}

std::map<Address, Joined> Membership::joined(std::uint32_t port) const {
  std::map<Address, Joined> all;
  for (auto const &[group, members] : groups_) {
    if (auto const member = members.find(port); member != members.end()) {
      auto const &known = member->second;
      all.emplace(group.address, Joined{.version = known.version,
                                        .sources = known.filter.wanted(),
                                        .reported = known.reported});
    }
  }
  return all;
}

}  // namespace simhost::multicast
