// Compiles switches for tests: a line of standard input says a host, as scenario documents, and
// what of it has a device; a line of standard output is what Open vSwitch would be told of its
// switch "s".
#include <arpa/inet.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <exception>
#include <iostream>
#include <nlohmann/json.hpp>
#include <optional>
#include <set>
#include <stdexcept>
#include <string>
#include <vector>

#include "base/outcomes.h"
#include "model/lookup.h"
#include "model/plane.h"
#include "model/teaming/team.h"
#include "planes/openvswitch/compile/compile.h"
#include "planes/openvswitch/multicast/membership.h"
#include "planes/openvswitch/multicast/messages.h"
#include "planes/openvswitch/openflow/text.h"
#include "planes/openvswitch/reading/read_network.h"
#include "planes/stored/links.h"
#include "planes/stored/stored_plane.h"
#include "scenario/scenario.h"
#include "storage/running/devices.h"
#include "storage/store.h"

namespace {

using Json = nlohmann::json;
using simhost::storage::ChangingTransaction;

simhost::storage::MacBytes to_mac(std::string const &text) {
  std::array<unsigned, 6> bytes{};
  if (std::sscanf(text.c_str(), "%x:%x:%x:%x:%x:%x", bytes.data(), &bytes[1], &bytes[2], &bytes[3],
                  &bytes[4], &bytes[5]) != 6) {
    throw std::invalid_argument(text);
  }
  simhost::storage::MacBytes mac{};
  for (std::size_t at = 0; at < mac.size(); ++at) {
    mac[at] = static_cast<std::byte>(bytes[at]);
  }
  return mac;
}

simhost::multicast::Address address_from(std::string const &text) {
  using simhost::multicast::Family;
  bool const is_ipv4 = text.find(':') == std::string::npos;
  simhost::multicast::Address address{.family = is_ipv4 ? Family::ipv4 : Family::ipv6};
  if (inet_pton(is_ipv4 ? AF_INET : AF_INET6, text.c_str(), address.bytes.data()) != 1) {
    throw std::invalid_argument(text);
  }
  return address;
}

simhost::multicast::Place place_of(ChangingTransaction &transaction,
                                   simhost::storage::SwitchKey key, Json const &said) {
  auto const port = simhost::get_port(transaction, key, said.at("port").get<std::string>());
  return {.port = static_cast<std::uint32_t>(port.number),
          .vlan = said.value("vlan", std::uint16_t{0})};
}

// {"address", "vlan", "members": [{"port", "from": [...]} or {"port", "not_from": [...]}]}
simhost::multicast::Group group_of(ChangingTransaction &transaction,
                                   simhost::storage::SwitchKey key, Json const &said) {
  simhost::multicast::Group group{.vlan = said.value("vlan", std::uint16_t{0}),
                                  .address = address_from(said.at("address")),
                                  .members = {}};
  for (auto const &one : said.at("members")) {
    simhost::multicast::Member member{.port = place_of(transaction, key, one).port,
                                      .sources = {.are_excluded = !one.contains("from")}};
    for (auto const &source :
         one.value(one.contains("from") ? "from" : "not_from", Json::array())) {
      member.sources.listed.push_back(address_from(source));
    }
    group.members.push_back(member);
  }
  return group;
}

simhost::multicast::Groups groups_of(ChangingTransaction &transaction,
                                     simhost::storage::SwitchKey key, Json const &said) {
  using simhost::multicast::Family;
  simhost::multicast::Groups all;
  for (auto const &group : said.value("groups", Json::array())) {
    all.groups.push_back(group_of(transaction, key, group));
  }
  for (auto const &router : said.value("routers", Json::array())) {
    all.routers.push_back({.place = place_of(transaction, key, router),
                           .family = router.value("ipv6", false) ? Family::ipv6 : Family::ipv4});
  }
  for (auto const &place : said.value("undecided", Json::array())) {
    all.undecided.push_back(place_of(transaction, key, place));
  }
  return all;
}

std::vector<std::uint8_t> bytes_of(std::string const &hexadecimal) {
  std::vector<std::uint8_t> bytes;
  for (std::size_t at = 0; at + 1 < hexadecimal.size(); at += 2) {
    bytes.push_back(static_cast<std::uint8_t>(std::stoul(hexadecimal.substr(at, 2), nullptr, 16)));
  }
  return bytes;
}

// {"queries", "interval": seconds, "places": [{"port", "vlan"}], "said": [{"at": milliseconds,
// "port", "vlan", "frame"}], "until": milliseconds}. Nobody gets the queries: who is there says
// again what it wants.
simhost::multicast::Groups groups_heard(ChangingTransaction &transaction,
                                        simhost::storage::SwitchKey key,
                                        simhost::openvswitch::Multicast const &mode,
                                        Json const &heard) {
  using simhost::multicast::Time;
  constexpr std::size_t kMostSources = 10;
  simhost::multicast::Membership members;
  Time now{};
  members.set_options(
      {.igmp = {.is_heard = mode.hears_igmp, .version = 3, .most_sources = kMostSources},
       .mld = {.is_heard = mode.hears_mld, .version = 2, .most_sources = kMostSources},
       .robustness = heard.at("queries"),
       .interval = std::chrono::seconds(heard.at("interval").get<int>())},
      now);
  std::set<simhost::multicast::Place> places;
  for (auto const &place : heard.at("places")) {
    places.insert(place_of(transaction, key, place));
  }
  members.set_places(places, now);
  auto const pass = [&](Time until) {
    while (now < until) {
      constexpr Time kLeast{1};
      now = std::min(until, std::max(members.next().value_or(until), now + kLeast));
      members.advance(now);
    }
  };
  for (auto const &said : heard.at("said")) {
    pass(Time(said.at("at").get<std::int64_t>()));
    auto const message = simhost::multicast::decode(bytes_of(said.at("frame")));
    members.receive(place_of(transaction, key, said), message.value(), now);
  }
  pass(Time(heard.at("until").get<std::int64_t>()));
  return members.groups();
}

simhost::openvswitch::Observed connect(ChangingTransaction &transaction,
                                       simhost::storage::SwitchKey key, Json const &said) {
  simhost::openvswitch::Observed observed;
  for (auto const &uplink : said.value("uplinks", Json::array())) {
    simhost::storage::put_device(transaction, uplink.get<std::string>(),
                                 "to-" + uplink.get<std::string>());
  }
  for (auto const &client : said.value("clients", Json::array())) {
    auto const name = client.at("port").get<std::string>();
    auto const port = simhost::get_port(transaction, key, name);
    std::optional<simhost::storage::MacBytes> mac;
    if (client.contains("mac")) {
      mac = to_mac(client.at("mac"));
    }
    simhost::storage::put_device(transaction, port.number, "to-" + name, mac);
    if (client.contains("seen")) {
      auto const seen = to_mac(client.at("seen"));
      auto &address = observed.addresses[port.number];
      for (std::size_t at = 0; at < seen.size(); ++at) {
        address[at] = std::to_integer<std::uint8_t>(seen[at]);
      }
    }
    if (client.contains("share")) {
      observed.shares[port.number] = client.at("share");
    }
  }
  return observed;
}

Json numbers_of_ports(ChangingTransaction &transaction, simhost::storage::SwitchKey key) {
  auto numbers = Json::object();
  for (auto const &port : simhost::storage::ports_of(transaction, key)) {
    numbers[port.identifier] = static_cast<std::uint32_t>(port.number);
  }
  return numbers;
}

Json numbers_of_devices(ChangingTransaction &transaction, simhost::storage::SwitchKey key) {
  auto numbers = Json::object();
  for (auto const &[name, port] : simhost::storage::uplinks_of(transaction, key)) {
    if (auto const device = simhost::storage::device_of(transaction, name)) {
      numbers[name] = device->number;
    }
  }
  for (auto const &[number, device] : simhost::storage::port_devices(transaction, key)) {
    numbers[simhost::get_port(transaction, number).identifier] = device.number;
  }
  return numbers;
}

// A caller looks no further than may_be_refused() says.
simhost::openvswitch::Compiled made_of(ChangingTransaction &transaction,
                                       simhost::storage::SwitchKey key,
                                       simhost::openvswitch::Observed const &observed,
                                       Json const &heard) {
  try {
    auto const team = simhost::teaming::team_of(transaction, key, simhost::stored::link_of);
    auto const connected = simhost::storage::port_devices(transaction, key);
    auto network = simhost::openvswitch::read_network(transaction, key, team, connected, observed);
    if (!heard.is_null()) {
      network.multicast.groups = groups_heard(transaction, key, network.multicast, heard);
    }
    return simhost::openvswitch::compile(network);
  } catch (simhost::Refused const &refused) {
    if (!simhost::openvswitch::may_be_refused(transaction, key)) {
      throw std::logic_error("no caller expects this to be refused: " +
                             std::string(refused.what()));
    }
    throw;
  }
}

Json compiled(Json const &said) {
  simhost::storage::Store store(std::nullopt, [](ChangingTransaction &) {});
  ChangingTransaction transaction(store);
  for (auto const &document : said.at("host")) {
    simhost::scenario::apply(transaction, document.dump());
  }
  auto const key = simhost::get_switch(transaction, "s").key;
  auto observed = connect(transaction, key, said);
  observed.groups = groups_of(transaction, key, said.value("multicast", Json::object()));
  auto const made = made_of(transaction, key, observed, said.value("heard", Json()));

  Json answer{{"devices", numbers_of_devices(transaction, key)},
              {"numbers", numbers_of_ports(transaction, key)},
              {"most_learned", made.rows.most_learned},
              {"most_tags", made.rows.most_tags},
              {"flows", Json::array()},
              {"groups", Json::array()}};
  for (auto const &flow : made.flows) {
    answer["flows"].push_back(simhost::openflow::to_text(flow));
  }
  for (auto const &group : made.groups) {
    answer["groups"].push_back(simhost::openflow::to_text(group));
  }
  return answer;
}

std::string name_of(QEX_ReturnStatus status) {
  switch (status) {
    case QEX_NOT_SUPPORTED:
      return "QEX_NOT_SUPPORTED";
    case QEX_BAD_PARAM:
      return "QEX_BAD_PARAM";
    default:
      return std::to_string(status);
  }
}

}  // namespace

int main() try {
  simhost::run_on(simhost::stored::plane());
  std::string line;
  while (std::getline(std::cin, line)) {
    Json answer;
    try {
      answer = compiled(Json::parse(line));
    } catch (simhost::Refused const &refused) {
      answer = {{"refused", refused.what()}, {"status", name_of(refused.status())}};
    }
    std::cout << answer.dump() << std::endl;
  }
} catch (std::exception const &error) {
  std::fputs(error.what(), stderr);
  return 1;
}
