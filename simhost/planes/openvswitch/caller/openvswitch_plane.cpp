// What the state knows is asked of the plane without frames, and the rest of the daemon.
#include "planes/openvswitch/caller/openvswitch_plane.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <map>
#include <utility>

#include "base/outcomes.h"
#include "model/lookup.h"
#include "model/mac/properties.h"
#include "model/multicast/properties.h"
#include "model/properties/properties.h"
#include "model/teaming/properties.h"
#include "model/teaming/team.h"
#include "planes/openvswitch/caller/switches_with_frames.h"
#include "planes/openvswitch/line/line.h"
#include "planes/openvswitch/multicast/address.h"
#include "storage/load/chosen.h"
#include "storage/running/devices.h"
#include "storage/running/frames.h"
#include "storage/running/remembered.h"
#include "storage/tunnels/fabrics.h"
#include "vswitch/mcast_filters.h"

namespace simhost::openvswitch {
namespace {

Counters counters_in(Json const &said, CounterKind kind) {
  Counters counters;
  for (auto const &counter : counters_of(kind)) {
    auto const value = said.find(counter.name);
    if (value != said.end()) {
      counters.set(counter, value->get<std::uint64_t>());
    }
  }
  return counters;
}

// Six numbers of 0 to 255.
void put_mac(Json const &said, VSMACEntry &entry) {
  auto const bytes = said.get<std::array<std::uint8_t, sizeof entry.macAddress>>();
  std::memcpy(entry.macAddress, bytes.data(), bytes.size());
}

std::vector<VSMACEntry> learned_in(Json const &said) {
  std::vector<VSMACEntry> entries;
  for (auto const &one : said) {
    VSMACEntry entry{};
    put_mac(one.at("mac"), entry);
    entry.vid = one.at("vlan").get<std::uint16_t>();
    entry.macAddrType = VS_MAC_ADDR_TYPE_LEARNED;
    entry.aging = 1;
    entry.elapsed = one.at("age").get<std::uint32_t>();
    entries.push_back(entry);
  }
  return entries;
}

bool comes_before(VSMACEntry const &one, VSMACEntry const &other) {
  auto const order = std::memcmp(one.macAddress, other.macAddress, sizeof one.macAddress);
  return order != 0 ? order < 0 : one.vid < other.vid;
}

template <typename Bytes>
AddressBytes bytes_of(Bytes const &address) {
  auto const *const first = reinterpret_cast<std::byte const *>(std::data(address));
  return {first, first + std::size(address)};
}

AddressBytes address_in(Json const &said) {
  return bytes_of(said.get<std::vector<std::uint8_t>>());
}

// The address of Ethernet to which frames for a group of IPv4 or IPv6 go.
AddressBytes ethernet_of(AddressBytes const &group) {
  auto const ethernet = [&] {
    if (group.size() == sizeof(qex_IPv4Address)) {
      openflow::Ipv4Address address;
      std::memcpy(address.data(), group.data(), address.size());
      return multicast::ethernet_of(multicast::address_of(address));
    }
    openflow::Ipv6Address address{};
    std::memcpy(address.data(), group.data(), std::min(address.size(), group.size()));
    return multicast::ethernet_of(multicast::address_of(address));
  }();
  return bytes_of(ethernet);
}

// Who reports in a version without sources wants all of them, and does not say so.
McastGroup group_in(Json const &said, ClockTime now) {
  McastGroup group{.address = address_in(said.at("address")),
                   .version = said.at("version").get<std::uint32_t>(),
                   .source_mode = said.at("excludes").get<bool>()
                                      ? VS_MCAST_SRC_IP_FILTER_MODE_EXCLUDE
                                      : VS_MCAST_SRC_IP_FILTER_MODE_INCLUDE,
                   .vni = 0,
                   .updated = now - std::chrono::milliseconds(said.at("age").get<std::int64_t>()),
                   .sources = {}};
  for (auto const &source : said.at("sources")) {
    group.sources.push_back(address_in(source));
  }
  auto const with_sources = group.address.size() == sizeof(qex_IPv4Address) ? 3U : 2U;
  if (group.version < with_sources && group.sources.empty()) {
    group.source_mode = VS_MCAST_SRC_IP_FILTER_MODE_NONE;
  }
  return group;
}

Json question_about(std::string_view what, Place const &place) {
  return {{"ask", what},
          {"switch", static_cast<std::int64_t>(place.switch_key)},
          {"port", place.port ? static_cast<std::uint32_t>(*place.port) : 0}};
}

// Whether an address was put there, and is not any more.
bool remove_fixed(Plane &stored, storage::ChangingTransaction &transaction, Place const &place,
                  VSMACEntry const &entry) {
  for (auto const type : {VS_MAC_ADDR_TYPE_STATIC, VS_MAC_ADDR_TYPE_USER}) {
    try {
      auto fixed = entry;
      fixed.macAddrType = type;
      stored.remove_address(transaction, place, fixed);
      return true;
    } catch (Refused const &refused) {
      if (refused.status() != QEX_NOT_FOUND) {
        throw;
      }
    }
  }
  return false;
}

// By what is sent, which the state does not know.
bool goes_by_load(storage::Transaction &transaction, storage::Port const &port) {
  auto const owner = storage::PropertyOwner::port(port.switch_key, port.number);
  return effective(transaction, teaming::policy, owner).loadBalance == TEAM_FRP_TYPE_LB_LBT &&
         !find_value(transaction, teaming::bound_uplink, owner);
}

}  // namespace

OpenVswitchPlane::OpenVswitchPlane(Plane &stored, std::filesystem::path file)
    : stored_(stored), file_(std::move(file)), asking_(file_) {}

bool OpenVswitchPlane::has_frames(storage::Transaction &transaction, Place const &place) const {
  if (!storage::frames_change(transaction)) {
    return false;
  }
  if (place.port) {
    auto const uplink = storage::uplink_at(transaction, *place.port);
    return uplink ? storage::carries_frames(transaction, *uplink)
                  : storage::device_of(transaction, *place.port).has_value();
  }
  return has_uplink_device(transaction, place.switch_key);
}

// What a switch itself counts, no frames do.
bool OpenVswitchPlane::counts_frames(storage::Transaction &transaction,
                                     CounterOwner const &owner) const {
  if (owner.session.empty()) {
    return owner.port &&
           has_frames(transaction, {.switch_key = owner.switch_key, .port = owner.port});
  }
  return storage::frames_change(transaction) && has_device(transaction, owner.switch_key);
}

bool OpenVswitchPlane::link_is_up(storage::Transaction &transaction, std::string_view uplink) {
  return stored_.link_is_up(transaction, uplink);
}

bool OpenVswitchPlane::lacp_is_up(storage::Transaction &transaction, std::string_view uplink) {
  return stored_.lacp_is_up(transaction, uplink);
}

std::string OpenVswitchPlane::team_uplink(storage::Transaction &transaction,
                                          storage::Port const &port) {
  auto known = stored_.team_uplink(transaction, port);
  Place const place{.switch_key = port.switch_key, .port = port.number};
  if (!goes_by_load(transaction, port) || !has_frames(transaction, place)) {
    return known;
  }
  auto const reply = asking_.reply_if_there(question_about("carrier", place));
  for (auto const &uplink : storage::uplinks_of(transaction, port.switch_key)) {
    auto const device = storage::device_of(transaction, uplink.name);
    if (reply && device && device->number == reply->at("device").get<std::uint32_t>()) {
      return uplink.name;
    }
  }
  return known;
}

std::vector<VSMACEntry> OpenVswitchPlane::addresses(storage::Transaction &transaction,
                                                    Place const &place, VSMACAddrType type) {
  auto entries = stored_.addresses(transaction, place, type);
  bool const asks_for_learned = type == VS_MAC_ADDR_TYPE_LEARNED || type == VS_MAC_ADDR_TYPE_ALL;
  if (asks_for_learned && has_frames(transaction, place)) {
    auto const reply = asking_.reply(question_about("addresses", place));
    // What was learned before a device came is none of what its bridge knows.
    std::erase_if(entries, [](VSMACEntry const &entry) {
      return entry.macAddrType == VS_MAC_ADDR_TYPE_LEARNED;
    });
    for (auto const &entry : learned_in(reply.at("addresses"))) {
      entries.push_back(entry);
    }
    std::ranges::sort(entries, comes_before);
  }
  return entries;
}

VSPMACLearningStats OpenVswitchPlane::learning_stats(storage::Transaction &transaction,
                                                     Place const &place) {
  auto stats = stored_.learning_stats(transaction, place);
  if (has_frames(transaction, place)) {
    auto const reply = asking_.reply(question_about("addresses", place));
    stats.numMACsLearned = static_cast<std::uint32_t>(reply.at("addresses").size());
    show(counters(transaction, {.switch_key = place.switch_key, .port = place.port}), stats);
  }
  return stats;
}

// What a client joined, and the addresses of Ethernet to which frames for it go.
std::map<AddressBytes, McastGroup> OpenVswitchPlane::joined(storage::Transaction &transaction,
                                                            storage::Port const &port) {
  std::map<AddressBytes, McastGroup> joined;
  auto const add_ethernet = [&](AddressBytes const &address, ClockTime updated) {
    joined.try_emplace(address, McastGroup{.address = address,
                                           .version = 0,
                                           .source_mode = VS_MCAST_SRC_IP_FILTER_MODE_NONE,
                                           .vni = 0,
                                           .updated = updated,
                                           .sources = {}});
  };
  auto const filter = effective(transaction, mac::ethernet_filter,
                                storage::PropertyOwner::port(port.switch_key, port.number));
  if ((filter.flags & (QEX_ETH_FILTER_MULTICAST | QEX_ETH_FILTER_USE_LADRF)) != 0) {
    for (std::size_t at = 0; at < filter.numMulticastAddrs; ++at) {
      add_ethernet(bytes_of(filter.multicastAddrs[at]), {});
    }
  }
  auto const mode = effective(transaction, multicast::filter_mode,
                              storage::PropertyOwner::global(port.switch_key));
  if (mode == VS_MCAST_FILTER_MODE_LEGACY) {
    return joined;
  }
  auto const reply =
      asking_.reply(question_about("groups", {.switch_key = port.switch_key, .port = port.number}));
  auto const now = clock_now(transaction);
  for (auto const &one : reply.at("groups")) {
    auto const group = group_in(one, now);
    add_ethernet(ethernet_of(group.address), group.updated);
    joined[group.address] = group;
  }
  return joined;
}

std::vector<AddressBytes> OpenVswitchPlane::groups(storage::Transaction &transaction,
                                                   storage::PortNumber port, std::size_t length) {
  auto const known = get_port(transaction, port);
  if (!has_frames(transaction, {.switch_key = known.switch_key, .port = port})) {
    return stored_.groups(transaction, port, length);
  }
  std::vector<AddressBytes> addresses;
  for (auto const &[address, group] : joined(transaction, known)) {
    if (address.size() == length) {
      addresses.push_back(address);
    }
  }
  return addresses;
}

std::optional<McastGroup> OpenVswitchPlane::group(storage::Transaction &transaction,
                                                  storage::PortNumber port,
                                                  AddressBytes const &address) {
  auto const known = get_port(transaction, port);
  if (!has_frames(transaction, {.switch_key = known.switch_key, .port = port})) {
    return stored_.group(transaction, port, address);
  }
  auto const all = joined(transaction, known);
  auto const found = all.find(address);
  return found == all.end() ? std::nullopt : std::optional(found->second);
}

int OpenVswitchPlane::multicast_mode(storage::Transaction &transaction, storage::SwitchKey key) {
  auto const wanted = stored_.multicast_mode(transaction, key);
  if (!storage::frames_change(transaction) || !has_device(transaction, key)) {
    return wanted;
  }
  auto const question = question_about("multicast mode", {.switch_key = key, .port = {}});
  return asking_.reply(question).value("mode", wanted);
}

// Without a daemon they are what they were when it counted last.
Counters OpenVswitchPlane::counters(storage::Transaction &transaction, CounterOwner const &owner) {
  if (!counts_frames(transaction, owner)) {
    return stored_.counters(transaction, owner);
  }
  auto question = question_about("counters", {.switch_key = owner.switch_key, .port = owner.port});
  question["session"] = owner.session;
  auto const reply = asking_.reply_if_there(question);
  return reply ? counters_in(reply->at("counters"), kind_of(owner))
               : stored_.counters(transaction, owner);
}

std::vector<std::string> OpenVswitchPlane::counting_sessions(storage::Transaction &transaction,
                                                             storage::SwitchKey key) {
  auto sessions = stored_.counting_sessions(transaction, key);
  if (counts_frames(transaction, {.switch_key = key, .session = "any"})) {
    auto const question = question_about("sessions", {.switch_key = key, .port = std::nullopt});
    if (auto const reply = asking_.reply_if_there(question)) {
      auto const more = reply->at("sessions").get<std::vector<std::string>>();
      sessions.insert(sessions.end(), more.begin(), more.end());
      std::ranges::sort(sessions);
      sessions.erase(std::unique(sessions.begin(), sessions.end()), sessions.end());
    }
  }
  return sessions;
}

void OpenVswitchPlane::set_admin_state(storage::ChangingTransaction &transaction,
                                       std::string_view uplink, bool up) {
  if (!storage::frames_change(transaction) || !storage::carries_frames(transaction, uplink)) {
    stored_.set_admin_state(transaction, uplink, up);
    return;
  }
  // Who is moved is announced where frames go.
  auto link = storage::find_link(transaction, uplink).value_or(Link{});
  link.admin = up;
  teaming::set_link(transaction, uplink, link);
}

void OpenVswitchPlane::put_address(storage::ChangingTransaction &transaction, Place const &place,
                                   VSMACEntry const &entry) {
  stored_.put_address(transaction, place, entry);
}

void OpenVswitchPlane::remove_address(storage::ChangingTransaction &transaction, Place const &place,
                                      VSMACEntry const &entry) {
  bool const may_be_learned =
      entry.macAddrType == VS_MAC_ADDR_TYPE_LEARNED || entry.macAddrType == VS_MAC_ADDR_TYPE_ALL;
  if (!may_be_learned || !has_frames(transaction, place)) {
    stored_.remove_address(transaction, place, entry);
  } else if (entry.macAddrType == VS_MAC_ADDR_TYPE_LEARNED ||
             !remove_fixed(stored_, transaction, place, entry)) {
    auto question = question_about("forget learned", place);
    question["mac"] = std::to_array(entry.macAddress);
    question["vlan"] = qex_uint16{entry.vid};
    // Frames are in no virtual network.
    if (entry.vni != 0 || !asking_.reply(question).at("learned").get<bool>()) {
      throw Refused(QEX_NOT_FOUND);
    }
  }
}

void OpenVswitchPlane::restart(storage::ChangingTransaction &transaction) {
  stored_.restart(transaction);
  storage::remove_remembered(transaction);
  storage::remove_chosen_shares(transaction);
}

void OpenVswitchPlane::check_device(storage::Transaction &transaction, std::string_view device) {
  if (!storage::frames_change(transaction)) {
    return;
  }
  try {
    auto const reply = asking_.said({{"ask", "device"}, {"name", device}});
    if (!reply.value("there", true)) {
      throw Refused(QEX_NOT_FOUND, fmt::format("simhostd sees no device {}", device));
    }
    if (!reply.value("ethernet", true)) {
      throw Refused(QEX_NOT_SUPPORTED,
                    fmt::format("the device {} carries no frames of Ethernet", device));
    }
    if (auto const at = reply.value("at", std::string()); !at.empty()) {
      throw Refused(QEX_BUSY, fmt::format("the device {} is at the bridge {}", device, at));
    }
  } catch (NoDaemon const &) {
    // It is looked for when a daemon is there.
  }
  packet_sizes_.add(device);
}

void OpenVswitchPlane::prepare(storage::ChangingTransaction &transaction) {
  prepared_.reset();
  if (!storage::frames_change(transaction)) {
    return;
  }
  check_switches(transaction, file_);
  check_packet_sizes(transaction);
  storage::advance_frames_change(transaction);
  prepared_ = storage::frames_change(transaction);
}

// Last, as devices are made to carry them.
void OpenVswitchPlane::check_packet_sizes(storage::Transaction &transaction) {
  auto const question = packet_sizes_.question(transaction);
  if (!question) {
    return;
  }
  if (auto const reply = asking_.reply_if_there(*question)) {
    if (auto const why = reply->value("why", std::string()); !why.empty()) {
      throw Refused(QEX_NOT_SUPPORTED, why);
    }
    packet_sizes_.agreed();
  }
}

void OpenVswitchPlane::committed() noexcept {
  if (!prepared_) {
    return;
  }
  try {
    asking_.said({{"ask", "in force"}, {"change", *prepared_}});
  } catch (std::exception const &) {
    // It is pending then, which those who ask are told.
  }
}

Wires *OpenVswitchPlane::find_wires() {
  return stored_.find_wires();
}

InForce OpenVswitchPlane::in_force(storage::Transaction &transaction) {
  InForce all{.wanted = storage::frames_change(transaction), .done = std::nullopt, .said = {}};
  if (all.wanted) {
    try {
      auto const reply = asking_.said({{"ask", "status"}});
      all.done = reply.at("change").get<std::uint64_t>();
      all.said = reply.at("said").get<std::string>();
    } catch (std::exception const &error) {
      all.said = error.what();
    }
  }
  return all;
}

}  // namespace simhost::openvswitch
