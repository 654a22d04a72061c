// The same histories once more, as plainly as the RFCs put them: sets with the operators of their
// tables, all of them looked at whenever time passes. Of hosts that know sources.
#pragma once

#include <algorithm>
#include <map>
#include <set>
#include <tuple>
#include <vector>

#include "planes/openvswitch/multicast/groups.h"
#include "planes/openvswitch/multicast/messages.h"

namespace simhost::multicast {

class NaiveMembership {
 public:
  using Time = std::chrono::milliseconds;
  using Set = std::set<Address>;

  NaiveMembership(Time group_membership, Time last_member)
      : gmi_(group_membership), lmqt_(last_member) {}

  void receive(Place const &place, Record const &record) {
    Set const b(record.sources.begin(), record.sources.end());
    auto &state = states_[{place.vlan, record.group, place.port}];
    state.exclude ? receive_excluding(state, record.type, b)
                  : receive_including(state, record.type, b);
  }

  void pass(Time time) {
    for (auto &[key, state] : states_) {
      pass(state, time);
    }
    std::erase_if(states_,
                  [](auto const &one) { return !one.second.exclude && one.second.timers.empty(); });
  }

  std::vector<Group> groups() const {
    std::vector<Group> all;
    for (auto const &[key, state] : states_) {
      auto const &[vlan, group, port] = key;
      if (!state.exclude && state.timers.empty()) {
        continue;
      }
      if (all.empty() || all.back().vlan != vlan || all.back().address != group) {
        all.push_back({.vlan = vlan, .address = group, .members = {}});
      }
      Member member{.port = port, .sources = {.are_excluded = state.exclude}};
      auto const listed = state.exclude ? state.y : requested(state);
      member.sources.listed.assign(listed.begin(), listed.end());
      all.back().members.push_back(member);
    }
    return all;
  }

 private:
  // EXCLUDE(X, Y), or INCLUDE(X); X are those with timers.
  struct State {
    bool exclude = false;
    Time group_timer{};
    std::map<Address, Time> timers;
    Set y;
  };

  static Set requested(State const &state) {
    Set x;
    for (auto const &[source, timer] : state.timers) {
      x.insert(source);
    }
    return x;
  }
  static Set both(Set const &one, Set const &other) {
    Set all;
    std::set_intersection(one.begin(), one.end(), other.begin(), other.end(),
                          std::inserter(all, all.end()));
    return all;
  }
  static Set without(Set const &one, Set const &other) {
    Set all;
    std::set_difference(one.begin(), one.end(), other.begin(), other.end(),
                        std::inserter(all, all.end()));
    return all;
  }
  static void keep(State &state, Set const &sources) {
    std::erase_if(state.timers, [&](auto const &one) { return !sources.contains(one.first); });
  }
  static void set(State &state, Set const &sources, Time timer) {
    for (auto const &source : sources) {
      state.timers[source] = timer;
    }
  }
  void query(State &state, Set const &sources) const {
    for (auto const &source : sources) {
      auto &timer = state.timers.at(source);
      timer = std::min(timer, lmqt_);
    }
  }

  void receive_including(State &state, RecordType type, Set const &b) const {
    auto const a = requested(state);
    switch (type) {
      case RecordType::is_include:
      case RecordType::allow:
        set(state, b, gmi_);
        break;
      case RecordType::is_exclude:
      case RecordType::to_exclude:
        state.exclude = true;
        state.y = without(b, a);
        keep(state, b);
        state.group_timer = gmi_;
        if (type == RecordType::to_exclude) {
          query(state, both(a, b));
        }
        break;
      case RecordType::block:
        query(state, both(a, b));
        break;
      case RecordType::to_include:
        set(state, b, gmi_);
        query(state, without(a, b));
        break;
    }
  }

  void receive_excluding(State &state, RecordType type, Set const &a) const {
    auto const x = requested(state);
    auto const y = state.y;
    auto const fresh = without(without(a, x), y);
    switch (type) {
      case RecordType::is_include:
      case RecordType::allow:
        set(state, a, gmi_);
        state.y = without(y, a);
        break;
      case RecordType::is_exclude:
        set(state, fresh, gmi_);
        keep(state, a);
        state.y = both(y, a);
        state.group_timer = gmi_;
        break;
      case RecordType::to_exclude:
        set(state, fresh, state.group_timer);
        keep(state, a);
        state.y = both(y, a);
        query(state, without(a, y));
        state.group_timer = gmi_;
        break;
      case RecordType::block:
        set(state, fresh, state.group_timer);
        query(state, without(a, y));
        break;
      case RecordType::to_include:
        set(state, a, gmi_);
        state.y = without(y, a);
        query(state, without(x, a));
        state.group_timer = std::min(state.group_timer, lmqt_);
        break;
    }
  }

  static void pass(State &state, Time time) {
    Set over;
    for (auto &[source, timer] : state.timers) {
      timer -= time;
      if (timer <= Time{}) {
        over.insert(source);
      }
    }
    keep(state, without(requested(state), over));
    if (state.exclude) {
      state.y.insert(over.begin(), over.end());
      state.group_timer -= time;
      if (state.group_timer <= Time{}) {
        state.exclude = false;
        state.y.clear();
      }
    }
  }

  Time gmi_;
  Time lmqt_;
  std::map<std::tuple<std::uint16_t, Address, std::uint32_t>, State> states_;
};

}  // namespace simhost::multicast
