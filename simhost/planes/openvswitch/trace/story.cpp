// The registers are followed as the pipeline writes them.
#include "planes/openvswitch/trace/story.h"

#include <fmt/format.h>

#include <array>
#include <charconv>
#include <map>
#include <optional>
#include <utility>

#include "planes/openvswitch/compile/network.h"
#include "planes/openvswitch/compile/pipeline.h"
#include "planes/openvswitch/trace/trace_text.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;
using Kind = StoryStep::Kind;
using LineKind = TraceLine::Kind;

constexpr std::size_t kTagBytes = 4;
constexpr std::size_t kAddresses = 12;
constexpr std::uint16_t kVlanMask = 0x0fff;
constexpr auto *kNoRoom = "is let through: there is no room for its source";

constexpr unsigned number_of(Field reg) {
  return static_cast<unsigned>(reg) - static_cast<unsigned>(Field::reg0);
}

std::optional<std::uint64_t> number_in(std::string_view text) {
  int const base = text.starts_with("0x") ? 16 : 10;
  text.remove_prefix(base == 16 ? 2 : 0);
  std::uint64_t number = 0;
  auto const read = std::from_chars(text.data(), text.data() + text.size(), number, base);
  return read.ec == std::errc{} ? std::optional(number) : std::nullopt;
}

std::optional<std::uint64_t> number_after(std::string_view text, std::string_view before) {
  auto const at = text.find(before);
  return at == std::string_view::npos ? std::nullopt : number_in(text.substr(at + before.size()));
}

// What an action writes into a register: "set_field:0x7->reg2", "load:0x2->NXM_NX_REG6[0..15]", and
// the remark "-> NXM_NX_REG2[0..11] is now 0x7".
std::optional<std::pair<unsigned, std::uint64_t>> written(std::string_view text) {
  struct Form {
    std::string_view begins;
    std::string_view value;
    std::string_view reg;
  };
  constexpr std::array kForms{Form{"set_field:", "set_field:", "->reg"},
                              Form{"load:", "load:", "->NXM_NX_REG"},
                              Form{"-> NXM_NX_REG", "is now ", "-> NXM_NX_REG"}};
  for (auto const &form : kForms) {
    auto const number = number_after(text, form.reg);
    auto const value = number_after(text, form.value);
    if (text.starts_with(form.begins) && number && value) {
      return std::pair(static_cast<unsigned>(*number), *value);
    }
  }
  return std::nullopt;
}

std::vector<std::uint16_t> tags_of(std::vector<std::uint8_t> const &frame) {
  std::vector<std::uint16_t> vlans;
  auto const pair = [&](std::size_t at) {
    return static_cast<std::uint16_t>(frame[at] << 8U | frame[at + 1]);
  };
  for (auto at = kAddresses; at + kTagBytes <= frame.size(); at += kTagBytes) {
    auto const type = pair(at);
    if (type != 0x8100 && type != 0x88a8) {
      break;
    }
    vlans.push_back(pair(at + 2) & kVlanMask);
  }
  return vlans;
}

std::string tags_in_words(std::vector<std::uint16_t> const &vlans) {
  if (vlans.empty()) {
    return "without a tag";
  }
  return fmt::format("with the tag{} of VLAN {}", vlans.size() > 1 ? "s" : "",
                     fmt::join(vlans, " and "));
}

std::string in_words(Station const &station) {
  return (station.is_uplink ? "uplink " : "port ") + station.name;
}

class Story {
 public:
  Story(std::vector<std::uint8_t> const &frame, Entry const &entry, Names const &names)
      : entry_(entry),
        names_(names),
        vlans_(tags_of(frame)),
        bytes_(frame.size()),
        is_for_many_(!frame.empty() && (frame[0] & 1U) != 0) {
    say(Kind::passes,
        fmt::format("comes in at {}, {}", in_words(entry.station), tags_in_words(vlans_)));
  }

  std::vector<StoryStep> tell(std::vector<TraceLine> const &lines) {
    for (auto const &line : lines) {
      if (dropped_) {
        break;
      }
      if (!is_passed_over(line)) {
        tell(line);
      }
    }
    if (!dropped_ && !left_) {
      drop_for_nobody();
    }
    return std::move(steps_);
  }

 private:
  // ovs-vswitchd shows first what becomes of larger frames, and then what of others.
  bool is_passed_over(TraceLine const &line) {
    if (line.kind == LineKind::visit) {
      bool const is_large = kind_of(line.cookie) == Counted::too_large && !is_too_large_;
      if (is_large) {
        passed_over_ = line.depth;
      } else if (passed_over_ && line.depth < *passed_over_) {
        passed_over_.reset();
      }
    }
    return passed_over_.has_value();
  }

  void tell(TraceLine const &line) {
    if (line.kind == LineKind::visit) {
      tell_visit(line);
    } else {
      follow(line);
    }
  }

  void tell_visit(TraceLine const &visit) {
    if (visit.table == table::kOwnFrames) {
      tell_vlan();
    }
    tell_dropped(visit);
    switch (visit.table) {
      case table::kRemoteMirrors:
        tell_copy();
        break;
      case table::kDispatch:
        if (!is_copy_) {
          tell_destination();
        }
        break;
      case table::kGroups:
        tell_group();
        break;
      case table::kElection:
        is_for_another_uplink_ = is_for_another_uplink_ || visit.missed;
        break;
      case table::kWires:
        say(Kind::passes, "goes over " + in_words(names_.station(reg_of(field::kWire))),
            entry_.teaming);
        break;
      default:
        break;
    }
  }

  void tell_dropped(TraceLine const &visit) {
    auto const port = entry_.station.name;
    auto const of_port = [&](char const *name) { return SettingOf{port, name}; };
    auto const of_switch = [](char const *name) { return SettingOf{{}, name}; };
    switch (kind_of(visit.cookie)) {
      case Counted::disabled:
        return drop("the switch is disabled", of_switch("disabled"));
      case Counted::reserved:
        return drop("it is malformed, or for the other end of its link only");
      case Counted::blocked:
        return drop(in_words(entry_.station) + " sends nothing", entry_.blocked);
      case Counted::too_large:
        return drop("it is larger than the MTU", of_switch("mtu"));
      case Counted::forged:
        return drop("its source is not the client's address", of_port("forbids"));
      case Counted::address_changed:
        return drop("the client has changed its address", entry_.change);
      case Counted::wrong_tag:
        return drop("the port has no such VLAN", of_port("vlan"));
      case Counted::nested_tag:
        // Of an uplink no setting decides it by itself.
        return entry_.station.is_uplink ? drop("it has a second tag")
                                        : drop("it has a second tag", of_port("nested_tag"));
      case Counted::own_frame:
        return drop("the switch sent it itself, and it came back");
      case Counted::unwanted_copy:
        return drop("it is a copy of a mirror session, and no session here takes those");
      case Counted::limit_dropped:
        return drop("there is no room for its source", entry_.limit);
      case Counted::limit_allowed:
        return say(Kind::passes, kNoRoom, entry_.limit);
      case Counted::first_address:
        return tell_first_address(visit);
      case Counted::learned:
        return tell_learning(visit);
      default:
        return;
    }
  }

  void tell_vlan() {
    auto const vlan = reg(field::kVlan);
    auto const decides =
        entry_.station.is_uplink ? SettingOf{} : SettingOf{entry_.station.name, "vlan"};
    say(Kind::passes, vlan == 0 ? "is in no VLAN" : fmt::format("is in VLAN {}", vlan), decides);
    constexpr std::array kKinds{"", "promiscuous", "isolated", "a community"};
    auto const kind = reg(field::kPrivateKind);
    if (kind > 0 && kind < kKinds.size()) {
      say(Kind::passes,
          fmt::format("which is {} in the private VLAN {}", kKinds.at(kind), reg(field::kDomain)),
          {{}, "private_vlans"});
    }
  }

  void tell_copy() {
    is_copy_ = true;
    if (!dropped_) {
      say(Kind::passes, fmt::format("is a copy of a mirror session in VLAN {}", reg(field::kVlan)));
    }
  }

  void tell_destination() {
    auto const destination = reg(field::kDestination);
    if (is_for_many_) {
      say(Kind::passes, "is for all ports of its VLAN");
    } else if (destination == 0) {
      say(Kind::passes, "is for an address that nobody knows");
    } else if (destination == kBeyond) {
      say(Kind::passes, "is for an address beyond the uplinks");
    } else {
      say(Kind::passes,
          "is for an address at " + in_words(names_.station(reg_of(field::kDestination))));
    }
  }

  void tell_group() {
    if (!std::exchange(told_group_, true)) {
      say(Kind::passes, "is of a group, for ports that want it", {{}, "multicast"});
    }
  }

  void refuse_receiver() {
    auto const receiver = names_.station(reg_of(field::kReceiver));
    if (receiver.name == entry_.station.name) {
      return;
    }
    bool const is_private = reg(field::kPrivateKind) != 0;
    say(Kind::passes, "is not for " + in_words(receiver) + ", which has no such VLAN",
        is_private ? SettingOf{{}, "private_vlans"} : SettingOf{receiver.name, "vlan"});
    refused_ = true;
  }

  void drop_for_nobody() {
    if (is_for_another_uplink_) {
      drop("it is taken where it comes in at another uplink", entry_.teaming);
    } else if (!refused_ && !is_for_many_ && reg(field::kDestination) == 0) {
      drop("no port takes frames for addresses that nobody knows");
    } else {
      drop("nobody is there who may get it");
    }
  }

  void follow(TraceLine const &line) {
    std::string_view const text = line.text;
    if (auto const value = written(text)) {
      registers_[value->first] = value->second;
    } else if (text.starts_with("check_pkt_larger(")) {
      auto const most = number_after(text, "(").value_or(UINT64_MAX);
      is_too_large_ = bytes_ > most;
    } else if (text.starts_with("push_vlan")) {
      vlans_.insert(vlans_.begin(), 0);
      bytes_ += kTagBytes;
    } else if (text.starts_with("pop_vlan")) {
      if (!vlans_.empty()) {
        vlans_.erase(vlans_.begin());
        bytes_ -= kTagBytes;
      }
    } else if (auto const vlan = vlan_written(text); vlan && !vlans_.empty()) {
      vlans_.front() = *vlan;
    } else if (text.starts_with("set_field:") && text.find("->tun_") != std::string_view::npos) {
      wrapped_.insert_or_assign(std::string(text.substr(text.find("->tun_") + 2)),
                                std::string(text.substr(10, text.find("->") - 10)));
    } else if (text.starts_with("output:")) {
      tell_output(line, number_after(text, "output:").value_or(0));
    } else if (text.starts_with("output(port=")) {
      // Of which not more than so many bytes go.
      auto const number = text.substr(0, text.find(','));
      tell_output(line, number_after(number, "port=").value_or(0));
    } else if (text == "drop" && line.table == table::kDelivery) {
      refuse_receiver();
    } else if (text.find("skipping output to input port") != std::string_view::npos) {
      left_ = left_before_;
      steps_.resize(steps_before_output_);
    }
  }

  static std::optional<std::uint16_t> vlan_written(std::string_view text) {
    auto value = number_after(text, "OXM_OF_VLAN_VID[] is now ");
    if (!value && text.find("->vlan_vid") != std::string_view::npos) {
      value = number_after(text, "set_field:");
    }
    return value ? std::optional(static_cast<std::uint16_t>(*value & kVlanMask)) : std::nullopt;
  }

  void tell_output(TraceLine const &line, std::uint64_t port) {
    steps_before_output_ = steps_.size();
    left_before_ = left_;
    bool const is_wrapped = port == kGrePort || port == kErspanPort;
    auto const to = is_wrapped ? Station{.name = collector(), .is_uplink = false}
                               : names_.station(static_cast<openflow::Port>(port));
    auto const tags = tags_in_words(vlans_);
    if (kind_of(line.cookie) == Counted::mirrored) {
      auto const session = names_.session(static_cast<std::uint32_t>(line.cookie));
      auto const where = is_wrapped
                             ? fmt::format("the collector {}, {}", to.name, in_wrapping(port))
                             : in_words(to);
      say(Kind::copied,
          fmt::format("is copied by the mirror session {} to {}, {}", session.name, where, tags),
          session.setting);
      left_ = left_ || is_copy_;
    } else {
      say(Kind::delivered, fmt::format("goes out at {}, {}", in_words(to), tags),
          to.is_uplink ? SettingOf{} : SettingOf{to.name, "vlan"});
      left_ = true;
    }
    steps_.back().to = to.name;
    steps_.back().vlans = vlans_;
  }

  void tell_first_address(TraceLine const &visit) {
    if (visit.table == table::kSources) {
      say(Kind::passes, "makes its source the client's address, if that has none");
    }
  }

  // Of a flow where a question is told from a frame; others with such cookies are what was learned.
  void tell_learning(TraceLine const &visit) {
    if (visit.table != table::kLearning) {
      return;
    }
    if (entry_.has_no_room) {
      say(Kind::passes, kNoRoom, entry_.limit);
    } else if (entry_.station.is_uplink) {
      say(Kind::passes, "has its source learned beyond the uplinks", {{}, "mac_learning"});
    } else {
      say(Kind::passes, "has its source learned at " + in_words(entry_.station),
          {entry_.station.name, "mac_learning"});
    }
  }

  // Of one family, as all of a host are.
  [[nodiscard]] std::string collector() {
    auto const of_ipv6 = wrapped_.find("tun_ipv6_dst");
    return of_ipv6 == wrapped_.end() ? wrapped_["tun_dst"] : of_ipv6->second;
  }

  // What was said of the copy before it went to the port that wraps it.
  [[nodiscard]] std::string in_wrapping(std::uint64_t port) {
    auto const key = number_in(wrapped_["tun_id"]).value_or(0);
    if (port == kGrePort) {
      return fmt::format("in GRE with the key {}", key);
    }
    bool const is_third = number_in(wrapped_["tun_erspan_ver"]) == 2;
    return fmt::format("in ERSPAN {} with the id {}", is_third ? "III" : "II", key);
  }

  void say(Kind kind, std::string text, SettingOf setting = {}) {
    steps_.push_back({.kind = kind, .text = std::move(text), .setting = std::move(setting)});
  }
  void drop(std::string const &why, SettingOf setting = {}) {
    say(Kind::dropped, "is dropped: " + why, std::move(setting));
    dropped_ = true;
  }
  [[nodiscard]] std::uint64_t reg(Field field) const {
    auto const found = registers_.find(number_of(field));
    return found == registers_.end() ? 0 : found->second;
  }
  [[nodiscard]] openflow::Port reg_of(Field field) const {
    return static_cast<openflow::Port>(reg(field));
  }

  Entry const &entry_;
  Names const &names_;
  std::vector<StoryStep> steps_;
  std::map<unsigned, std::uint64_t> registers_;
  std::map<std::string, std::string> wrapped_;  // what is said of a wrapped copy, by its fields
  std::vector<std::uint16_t> vlans_;            // of the tags that it has, the outermost first
  std::size_t bytes_;
  bool is_for_many_;
  bool is_too_large_ = false;
  std::optional<std::size_t> passed_over_;  // the depth of what is
  bool dropped_ = false;
  bool refused_ = false;  // to somebody
  bool told_group_ = false;
  bool is_copy_ = false;  // that another switch made
  bool is_for_another_uplink_ = false;
  bool left_ = false;  // at some port
  bool left_before_ = false;
  std::size_t steps_before_output_ = 0;
};

}  // namespace

std::optional<std::uint16_t> learning_domain(std::string_view text) {
  std::uint64_t domain = 0;
  for (auto const &line : read_trace(text)) {
    if (line.kind == LineKind::visit && line.table == table::kLearning) {
      return static_cast<std::uint16_t>(domain);
    }
    auto const value = line.kind == LineKind::visit ? std::nullopt : written(line.text);
    if (value && value->first == number_of(field::kDomain)) {
      domain = value->second;
    }
  }
  return std::nullopt;
}

std::vector<StoryStep> tell(std::string_view text, std::vector<std::uint8_t> const &frame,
                            Entry const &entry, Names const &names) {
  return Story(frame, entry, names).tell(read_trace(text));
}

}  // namespace simhost::openvswitch
