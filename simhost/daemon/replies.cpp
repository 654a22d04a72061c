// What callers ask the daemon of a state, and what it replies.
#include <unistd.h>

#include <exception>
#include <functional>
#include <map>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "daemon/bridge/cached_flows.h"
#include "daemon/daemon.h"
#include "daemon/devices/packet_sizes.h"
#include "daemon/learned/source_facts.h"
#include "daemon/underlay/tunnel_sizes.h"
#include "daemon/wanted.h"

namespace simhost::daemon {
namespace {

// No text of JSON has all that a path may have.
std::vector<std::uint8_t> bytes_of(std::filesystem::path const &path) {
  auto const &text = path.native();
  return {text.begin(), text.end()};
}

TunnelSize tunnel_in(Json const &said) {
  auto const &way = said.at(0);
  auto const peer = way.at(1).get<std::vector<std::uint8_t>>();
  auto const bytes = std::as_bytes(std::span(peer));
  return {.device = way.at(0).get<std::string>(),
          .peer = {bytes.begin(), bytes.end()},
          .size = said.at(1).get<std::uint32_t>()};
}

storage::SwitchKey switch_in(Json const &question) {
  return storage::SwitchKey{question.at("switch").get<std::int64_t>()};
}

}  // namespace

Questions Daemon::questions() {
  auto const told_by = [this](auto member) {
    return [this, member](Json const &question, Reply const &reply) {
      reply(std::invoke(member, *this, question));
    };
  };
  return {
      {"in force",
       [this](Json const &question, Reply const &reply) {
         handle_in_force(question.at("change").get<std::uint64_t>(), reply);
       }},
      {"device", told_by(&Daemon::is_there)},
      {"carry", told_by(&Daemon::carry)},
      {"carrier", told_by(&Daemon::carrier)},
      {"addresses", told_by(&Daemon::addresses)},
      {"forget learned", told_by(&Daemon::forget_learned)},
      {"counters", told_by(&Daemon::counters)},
      {"sessions", told_by(&Daemon::counting_sessions)},
      {"bridge", told_by(&Daemon::bridge)},
      {"source", told_by(&Daemon::source)},
      {"groups", told_by(&Daemon::groups)},
      {"multicast mode", told_by(&Daemon::multicast_mode)},
      {"status", told_by(&Daemon::status)},
  };
}

void Daemon::handle_in_force(std::uint64_t change, Reply const &reply) {
  if (change <= in_force_) {
    reply({{"change", in_force_}});
    return;
  }
  std::erase_if(waiting_, [](auto const &one) { return !one.second.is_awaited(); });
  waiting_.emplace(change, reply);
  sync_soon();
}

// 0 for a port of no team that goes by load: all others are known by their numbers.
Json Daemon::carrier(Json const &question) const {
  return {{"device",
           load_balance_.carrier(switch_in(question), question.at("port").get<std::uint32_t>())}};
}

std::optional<std::vector<Learned>> Daemon::learned_of(storage::SwitchKey key) {
  try {
    if (bridges_) {
      return bridges_->learned(key);
    }
  } catch (std::exception const &error) {
    fail(error.what());
  }
  return std::nullopt;
}

Json Daemon::addresses(Json const &question) {
  auto const key = switch_in(question);
  auto const port = question.at("port").get<std::uint32_t>();
  auto const learned = learned_of(key);
  if (!learned) {
    return {{"refused", "Open vSwitch cannot be reached: " + troubles_.text()}};
  }
  Json entries = Json::array();
  for (auto const &one : *learned) {
    if (one.port == port) {
      entries.push_back({{"mac", one.address}, {"vlan", one.vlan}, {"age", one.age}});
    }
  }
  return {{"addresses", entries}};
}

// What the data path has not added up yet would teach it once more, and what it remembers still
// goes there.
Json Daemon::forget_learned(Json const &question) {
  auto const forget_cached = [this] {
    simhost::daemon::forget_cached_flows(options_.database.parent_path(), lives_);
  };
  bool was_learned = false;
  try {
    if (!bridges_) {
      return {{"refused", "Open vSwitch cannot be reached: " + troubles_.text()}};
    }
    forget_cached();
    was_learned =
        bridges_->forget_learned(switch_in(question), question.at("port").get<std::uint32_t>(),
                                 {question.at("mac").get<openflow::EthernetAddress>(),
                                  question.at("vlan").get<std::uint16_t>()});
    if (was_learned) {
      forget_cached();
    }
  } catch (std::runtime_error const &error) {
    fail(error.what());
    return {{"refused", error.what()}};
  }
  return {{"learned", was_learned}};
}

Json Daemon::is_there(Json const &question) {
  auto const device = question.at("name").get<std::string>();
  devices_.refresh();
  auto at = bridges_ ? bridges_->elsewhere(device).value_or("") : std::string();
  // One that is at a bridge of Open vSwitch may have a master because of that.
  if (at.empty() && !at_bridges_.contains(device)) {
    at = devices_.master_of(device);
  }
  auto const found = devices_.find(device);
  return {{"there", found.has_value()}, {"ethernet", !found || found->has_ethernet}, {"at", at}};
}

// Before it is committed that switches have packets of these sizes, and devices likewise.
Json Daemon::carry(Json const &question) {
  PacketSizes sizes;
  devices_.refresh();
  storage::ReadingTransaction transaction(store_);
  for (auto const &one : question.at("tunnels")) {
    if (auto const why = why_too_large(transaction, tunnel_in(one), devices_)) {
      return {{"why", *why}};
    }
  }
  for (auto const &one : question.at("switches")) {
    add_packet_sizes(transaction, storage::SwitchKey{one.at(0).get<std::int64_t>()},
                     one.at(1).get<std::uint32_t>(), sizes);
  }
  for (auto const &one : question.at("devices")) {
    sizes[one.at(0).get<std::string>()] = one.at(1).get<std::uint32_t>();
  }
  auto const why = raise_all_packet_sizes(transaction, sizes, devices_);
  return {{"why", why.value_or("")}};
}

// What goes wrong with it is no reason to say nothing of what is known.
void Daemon::count_of(storage::SwitchKey key) {
  try {
    if (bridges_) {
      bridges_->count(key);
    }
  } catch (std::exception const &error) {
    fail(error.what());
  }
}

Json Daemon::counters(Json const &question) {
  CounterOwner owner{.switch_key = switch_in(question),
                     .port = std::nullopt,
                     .session = question.at("session").get<std::string>()};
  if (auto const port = question.at("port").get<std::uint32_t>()) {
    owner.port = storage::PortNumber{port};
  }
  count_of(owner.switch_key);
  storage::ReadingTransaction transaction(store_);
  counting_.forget_removed(transaction);
  Json values = Json::object();
  for (auto const &[name, value] : counting_.counters_of(transaction, owner)) {
    values[std::string(name)] = value;
  }
  return {{"counters", values}};
}

Json Daemon::counting_sessions(Json const &question) {
  auto const key = switch_in(question);
  count_of(key);
  return {{"sessions", counting_.unsaved_sessions(key)}};
}

Json Daemon::groups(Json const &question) const {
  auto const to_json = [](multicast::Address const &address) {
    return address.family == multicast::Family::ipv4 ? Json(multicast::ipv4_of(address))
                                                     : Json(address.bytes);
  };
  Json groups = Json::array();
  for (auto const &one :
       members_.joined(switch_in(question), question.at("port").get<std::uint32_t>())) {
    auto const &sources = one.joined.sources;
    Json listed = Json::array();
    for (auto const &source : sources.listed) {
      listed.push_back(to_json(source));
    }
    groups.push_back({{"address", to_json(one.address)},
                      {"version", one.joined.version},
                      {"excludes", sources.are_excluded},
                      {"sources", listed},
                      {"age", one.age.count()}});
  }
  return {{"groups", groups}};
}

// None of a switch that has moved no frames.
Json Daemon::multicast_mode(Json const &question) const {
  auto const found = multicast_modes_.find(switch_in(question));
  return found == multicast_modes_.end() ? Json::object() : Json{{"mode", found->second}};
}

Json Daemon::bridge(Json const &question) const {
  return {{"name", bridge_name(host_, question.at("switch").get<std::string>())},
          {"folder", bytes_of(options_.database.parent_path())}};
}

Json Daemon::source(Json const &question) const {
  auto const known =
      facts_of_source(memory_, switch_in(question), question.at("port").get<std::uint32_t>(),
                      question.at("address").get<openflow::EthernetAddress>());
  return {{"learned", known.learned},
          {"not first", known.is_not_first},
          {"at port", known.at_port},
          {"on switch", known.on_switch}};
}

Json Daemon::status(Json const & /*question*/) const {
  return {{"change", in_force_},
          {"said", troubles_.text()},
          {"process", getpid()},
          {"datapath", options_.datapath}};
}

}  // namespace simhost::daemon
