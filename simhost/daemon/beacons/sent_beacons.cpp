// A round after the other, while any switch asks for them.
#include "daemon/beacons/sent_beacons.h"

#include <algorithm>
#include <random>
#include <utility>

#include "planes/openvswitch/openflow/action.h"

namespace simhost::daemon {
namespace {

using namespace std::chrono_literals;

constexpr auto kBetweenRounds = 500ms;

// Past the numbers of ports.
constexpr beacons::Link kFirstLag = 0x10000;
// It takes two others that hear each other.
constexpr std::size_t kFewest = 3;

beacons::Key random_key() {
  std::random_device random;
  beacons::Key key{};
  std::generate(key.begin(), key.end(), [&] { return static_cast<std::uint8_t>(random()); });
  return key;
}

beacons::Link link_of(openvswitch::Uplink const &uplink) {
  return uplink.has_partner ? kFirstLag + uplink.lag : uplink.port;
}

std::optional<openflow::Port> port_of(openflow::PacketIn const &packet) {
  auto const &fields = packet.metadata.fields();
  auto const found = fields.find(openflow::Field::in_port);
  return found == fields.end() ? std::nullopt
                               : std::optional(static_cast<openflow::Port>(found->second.value));
}

}  // namespace

SentBeacons::SentBeacons(events::Loop &loop, Told told)
    : loop_(loop), told_(std::move(told)), key_(random_key()) {}

void SentBeacons::follow(storage::SwitchKey key, openvswitch::Network &network) {
  auto &known = switches_[key];
  known.asks = network.asks_for_beacons;
  known.uplinks.clear();
  known.links.clear();
  if (known.asks) {
    network.beacons = beacons::group_of(key_);
    for (auto const &uplink : network.uplinks) {
      if (!uplink.blocked) {
        known.uplinks.emplace(uplink.port, link_of(uplink));
        known.links.insert(link_of(uplink));
      }
    }
  }
  known.hearing.follow(known.links);
  note_verdicts(known);
  wait();
}

void SentBeacons::keep(std::set<storage::SwitchKey> const &keys) {
  std::erase_if(switches_, [&](auto const &known) { return !keys.contains(known.first); });
}

bool SentBeacons::receive(storage::SwitchKey key, openflow::PacketIn const &packet) {
  auto const beacon = beacons::find_beacon(key_, packet.frame);
  if (!beacon) {
    return false;
  }
  auto const known = switches_.find(key);
  auto const port = port_of(packet);
  if (known != switches_.end() && port && beacon->of_switch == static_cast<std::uint64_t>(key)) {
    auto const at = known->second.uplinks.find(*port);
    if (at != known->second.uplinks.end()) {
      known->second.hearing.hear(at->second, beacon->link);
    }
  }
  return true;
}

std::optional<bool> SentBeacons::arrive_at(storage::SwitchKey key, openflow::Port port) const {
  auto const known = switches_.find(key);
  if (known == switches_.end()) {
    return std::nullopt;
  }
  auto const uplink = known->second.uplinks.find(port);
  if (uplink == known->second.uplinks.end()) {
    return true;
  }
  auto const is_cut_off = known->second.hearing.is_cut_off(uplink->second);
  return is_cut_off ? std::optional(!*is_cut_off) : std::nullopt;
}

bool SentBeacons::has_too_few(storage::SwitchKey key) const {
  auto const known = switches_.find(key);
  return known != switches_.end() && known->second.asks && known->second.links.size() < kFewest;
}

void SentBeacons::begin_round() {
  bool has_changed = false;
  for (auto &[key, known] : switches_) {
    if (known.asks) {
      has_changed = note_verdicts(known) || has_changed;
      known.hearing.begin_round();
      send(key, known);
    }
  }
  if (has_changed) {
    told_.changed();
  }
}

void SentBeacons::send(storage::SwitchKey key, Switch const &of_switch) const {
  std::vector<openflow::PacketOut> frames;
  for (auto const &[port, link] : of_switch.uplinks) {
    beacons::Beacon const beacon{.of_switch = static_cast<std::uint64_t>(key), .link = link};
    frames.push_back({.actions = {openflow::Output{.port = port}},
                      .frame = beacons::to_frame(key_, beacon, static_cast<std::uint16_t>(port))});
  }
  told_.send(key, frames);
}

bool SentBeacons::note_verdicts(Switch &of_switch) {
  std::map<beacons::Link, std::optional<bool>> verdicts;
  for (auto const link : of_switch.links) {
    verdicts.emplace(link, of_switch.hearing.is_cut_off(link));
  }
  return std::exchange(of_switch.told, verdicts) != verdicts;
}

// From the end of a round, however late it was, so that there is time to hear it.
void SentBeacons::wait() {
  bool const is_asked_for =
      std::ranges::any_of(switches_, [](auto const &known) { return known.second.asks; });
  if (!is_asked_for) {
    next_.end();
  } else if (!next_) {
    next_ = loop_.after(kBetweenRounds, [this] {
      begin_round();
      wait();
    });
  }
}

}  // namespace simhost::daemon
