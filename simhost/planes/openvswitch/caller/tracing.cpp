// What becomes of a frame: ovs-vswitchd is asked, and the state has the names.
#include <fmt/format.h>

#include <algorithm>
#include <chrono>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

#include "base/bytes.h"
#include "base/ip_text.h"
#include "base/outcomes.h"
#include "model/mac/learning.h"
#include "model/mac/properties.h"
#include "model/mirror/properties.h"
#include "model/ports/properties.h"
#include "model/properties/properties.h"
#include "model/security/properties.h"
#include "model/teaming/properties.h"
#include "planes/openvswitch/caller/openvswitch_plane.h"
#include "planes/openvswitch/caller/patience.h"
#include "planes/openvswitch/compile/pipeline.h"
#include "planes/openvswitch/line/line.h"
#include "planes/openvswitch/reading/read_mirrors.h"
#include "planes/openvswitch/trace/control.h"
#include "storage/running/devices.h"
#include "storage/running/frames.h"
#include "storage/tunnels/fabrics.h"

namespace simhost::openvswitch {
namespace {

constexpr std::string_view kLearning = "mac_learning";

openflow::EthernetAddress source_of(std::vector<std::uint8_t> const &frame) {
  openflow::EthernetAddress source{};
  std::copy_n(frame.begin() + source.size(), source.size(), source.begin());
  return source;
}

class Stations {
 public:
  Stations(storage::Transaction &transaction, storage::SwitchKey key)
      : transaction_(transaction), key_(key) {
    for (auto const &[number, device] : storage::port_devices(transaction, key)) {
      auto const port = storage::get_port_row(transaction, number);
      add(device.number, {.name = port.identifier, .is_uplink = false}, number);
    }
    for (auto const &uplink : storage::uplinks_of(transaction, key)) {
      if (auto const device = storage::device_of(transaction, uplink.name)) {
        add(device->number, {.name = uplink.name, .is_uplink = true}, uplink.port);
      }
      if (auto const fabric = storage::fabric_of(transaction, uplink.name)) {
        for (auto const &tunnel : fabric->tunnels) {
          auto const name = fmt::format("{} to {}", uplink.name, ip_text(tunnel.peer));
          add(tunnel.number, {.name = name, .is_uplink = true}, uplink.port);
        }
      }
    }
  }

  struct Found {
    openflow::Port device;
    Station station;
    storage::PortNumber port;
  };

  [[nodiscard]] Found const *find(std::string_view name) const {
    for (auto const &known : all_) {
      if (known.station.name == name) {
        return &known;
      }
    }
    return nullptr;
  }
  [[nodiscard]] Station named(openflow::Port device) const {
    for (auto const &known : all_) {
      if (known.device == device) {
        return known.station;
      }
    }
    return {.name = fmt::format("with the number {}", device), .is_uplink = false};
  }

  [[nodiscard]] Session session(std::uint32_t id) const {
    auto const at = session_at(id);
    auto const owner = at.port ? storage::PropertyOwner::port(key_, *at.port)
                               : storage::PropertyOwner::global(key_);
    auto const table =
        effective(transaction_, at.port ? mirror::sessions : mirror::uplink_sessions, owner);
    auto const name = at.index < table.sessions.size()
                          ? std::string(text_in(table.sessions[at.index].record.sid))
                          : std::string();
    if (!at.port) {
      return {.name = name, .setting = {.port = {}, .name = "uplink_mirror_sessions"}};
    }
    return {.name = name,
            .setting = {.port = storage::get_port_row(transaction_, *at.port).identifier,
                        .name = "mirror_sessions"}};
  }

  [[nodiscard]] Entry entry(Found const &at) const {
    auto const of_port = [&](std::string_view name) {
      return SettingOf{at.station.name, std::string(name)};
    };
    auto const owner = storage::PropertyOwner::port(key_, at.port);
    bool const is_blocked = effective(transaction_, ports::blocked, owner) != 0;
    Entry entry{.station = at.station,
                .teaming = {.port = {}, .name = "teaming"},
                .blocked = is_blocked ? of_port("blocked") : SettingOf{}};
    if (at.station.is_uplink) {
      return entry;
    }
    bool const is_forbidden = (effective(transaction_, security::forbids, owner).flags &
                               VSPORT_SECURITY_DISALLOW_MAC_CHANGE) != 0;
    entry.change = of_port(is_forbidden ? "forbids" : kLearning);
    entry.limit = of_port(kLearning);
    if (find_bytes(transaction_, teaming::bound_uplink, owner)) {
      entry.teaming = of_port("uplink");
    } else if (find_bytes(transaction_, teaming::policy, owner)) {
      entry.teaming = of_port("teaming");
    }
    return entry;
  }

 private:
  void add(std::uint16_t device, Station station, storage::PortNumber port) {
    all_.push_back({.device = device, .station = std::move(station), .port = port});
  }

  storage::Transaction &transaction_;
  storage::SwitchKey key_;
  std::vector<Found> all_;
};

// Which limit keeps a source that is not learned yet from being learned, if one does.
std::optional<SettingOf> full_limit(storage::Transaction &transaction, storage::SwitchKey key,
                                    Stations::Found const &at, Json const &known) {
  auto const at_port = known.at("at port").get<std::uint64_t>();
  if (at.station.is_uplink && at_port >= TEAM_MAC_LEARNING_LIMIT_ENTRIES_DEFAULT) {
    return SettingOf{};
  }
  auto const of_port =
      effective(transaction, mac::management, storage::PropertyOwner::port(key, at.port));
  if (!at.station.is_uplink && at_port >= of_port.portMACLearning.macLimit) {
    return SettingOf{at.station.name, std::string(kLearning)};
  }
  bool const is_full_switch =
      known.at("on switch").get<std::uint64_t>() >= mac::learning_of(transaction, key).macLimit;
  return is_full_switch ? std::optional(SettingOf{{}, std::string(kLearning)}) : std::nullopt;
}

bool is_learned(std::string const &traced, Json const &known) {
  auto const domain = learning_domain(traced);
  auto const learned = known.at("learned").get<std::vector<std::uint16_t>>();
  return domain && std::ranges::find(learned, *domain) != learned.end();
}

std::string hexadecimal(std::vector<std::uint8_t> const &bytes) {
  return fmt::format("{:02x}", fmt::join(bytes, ""));
}

}  // namespace

std::vector<StoryStep> OpenVswitchPlane::trace(storage::Transaction &transaction,
                                               storage::FoundSwitch const &of_switch,
                                               std::string const &station,
                                               std::vector<std::uint8_t> const &frame) {
  if (!storage::frames_change(transaction)) {
    throw Refused(QEX_NOT_SUPPORTED, "no frames move: no simhostd ever took this host");
  }
  Stations const stations(transaction, of_switch.key);
  auto const *at = stations.find(station);
  if (at == nullptr) {
    throw Refused(QEX_IS_DISCONNECTED,
                  "no frames come in at '" + station + "': it is no port or uplink with a device");
  }
  try {
    auto const bridge =
        ask(file_, {{"ask", "bridge"}, {"switch", of_switch.row.identifier}}, kPatience);
    auto const known =
        ask(file_,
            {{"ask", "source"},
             {"switch", static_cast<std::int64_t>(of_switch.key)},
             {"port", at->station.is_uplink ? 0 : static_cast<std::uint32_t>(at->port)},
             {"address", source_of(frame)}},
            kPatience);
    auto const folder = bridge.at("folder").get<std::vector<std::uint8_t>>();
    auto const traced = [&](std::uint32_t mark) {
      return ask_control(
          find_control_socket(std::string(folder.begin(), folder.end())),
          {.name = "ofproto/trace",
           .words = {bridge.at("name").get<std::string>(),
                     fmt::format("in_port={},pkt_mark={}", at->device, mark), hexadecimal(frame)}},
          Deadline::clock::now() + kPatience);
    };
    auto const mark = kQuestion | (known.at("not first").get<bool>() ? kIsNotFirst : 0U);
    auto text = traced(mark);
    auto entry = stations.entry(*at);
    auto const limit = full_limit(transaction, of_switch.key, *at, known);
    // In which VLAN the frame is, the bridge knows.
    if (limit && !is_learned(text, known)) {
      entry.limit = *limit;
      entry.has_no_room = at->station.is_uplink;
      text = traced(mark | kHasNoRoom);
    }
    return tell(text, frame, entry,
                {.station = [&](openflow::Port device) { return stations.named(device); },
                 .session = [&](std::uint32_t id) { return stations.session(id); }});
  } catch (NoDaemon const &none) {
    throw Refused(QEX_TIMEOUT, none.what());
  } catch (std::runtime_error const &error) {
    throw Refused(QEX_IO_ERROR, error.what());
  }
}

}  // namespace simhost::openvswitch
