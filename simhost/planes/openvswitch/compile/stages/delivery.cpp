// Out to a port: whether the frame's VLAN is one of the port's, and with which tag.
#include <optional>
#include <utility>

#include "planes/openvswitch/compile/stages/mirrors.h"
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;

openflow::Value number_of(PrivateKind kind) {
  return static_cast<openflow::Value>(kind);
}

class Delivery {
 public:
  Delivery(PortPlan const &plan, Program &program)
      : common_(plan.common),
        program_(program),
        port_(plan.port),
        copies_(copies(common_.mirrors, &Mirror::received, &MirrorSources::ports, port_.port,
                       Copied::leaving)),
        out_(plan.among_others.counts_sent ? Actions{go_to(table::kSending)}
                                           : Actions{openflow::Output{.port = port_.port}}) {}

  void compile() {
    keep_own_frames();
    if (port_.vlan.carried) {
      compile_trunk();
    } else {
      compile_access();
    }
  }

 private:
  void keep_own_frames() {
    // The switch sends nothing back to where it came from, but would mirror it.
    if (!copies_.empty()) {
      add(400, to_port().with(Field::in_port, port_.port), {});
    }
    if (port_.transmits_by_uplink) {
      add(400, to_port().with(field::kSender, port_.port), {});
    }
    if (port_.transmits_by_uplink && port_.address) {
      add(400,
          to_port()
              .with(field::kOrigin, kFromUplink)
              .with(Field::eth_src, openflow::to_value(*port_.address)),
          {});
    }
  }

  void compile_access() {
    auto const vlan = port_.vlan.vlan;
    auto const &[domain, kind] = common_.kind_of(vlan);
    if (kind == PrivateKind::promiscuous) {
      deliver(100, to_vlan_port().with(field::kDomain, domain), out_);
      return;
    }
    if (kind != PrivateKind::isolated) {
      deliver(100, to_vlan_port().with(field::kVlan, vlan), out_);
    }
    if (kind != PrivateKind::none) {
      deliver(100,
              to_vlan_port()
                  .with(field::kDomain, domain)
                  .with(field::kPrivateKind, number_of(PrivateKind::promiscuous)),
              out_);
    }
  }

  void compile_trunk() {
    auto const carried = carried_by(port_.vlan);
    auto const masks = masks_of(carried.tagged);
    if (!common_.private_vlans().empty()) {
      // What is isolated is not even for ports that carry its VLAN; the primary one stands for it.
      in_domain(300, PrivateKind::isolated, carried.untagged, masks);
      add(250, to_port().with(field::kPrivateKind, number_of(PrivateKind::isolated)), {});
    }
    if (carried.untagged) {
      without_tag(200, to_vlan_port().with(field::kVlan, *carried.untagged));
    }
    if (carried.untagged != 0) {
      add(190, to_port().with(field::kVlan, 0), {});
    }
    for (auto const &mask : masks) {
      deliver(100, to_vlan_port().with(field::kVlan, mask.vlan, mask.mask),
              with_tag(field::kVlan, out_));
    }
    if (!common_.private_vlans().empty()) {
      in_domain(50, PrivateKind::community, carried.untagged, masks);
    }
  }

  // Frames of a kind, as frames of their primary VLAN.
  void in_domain(std::uint16_t priority, PrivateKind kind, std::optional<std::uint16_t> untagged,
                 std::vector<VlanMask> const &masks) {
    auto const of_kind = to_vlan_port().with(field::kPrivateKind, number_of(kind));
    if (untagged) {
      without_tag(static_cast<std::uint16_t>(priority + 10),
                  Match(of_kind).with(field::kDomain, *untagged));
    }
    for (auto const &mask : masks) {
      deliver(priority, Match(of_kind).with(field::kDomain, mask.vlan, mask.mask),
              with_tag(field::kDomain, out_));
    }
  }

  void without_tag(std::uint16_t priority, Match const &match) {
    deliver(static_cast<std::uint16_t>(priority + 1), Match(match).with(field::kPriority, 0), out_);
    deliver(priority, match, with_priority_tag(out_));
  }

  [[nodiscard]] Match to_port() const { return Match().with(field::kReceiver, port_.port); }
  // Likewise of frames with no more tags than the port's may have.
  [[nodiscard]] Match to_vlan_port() const {
    auto match = to_port();
    return port_.vlan.nested ? match : match.untagged();
  }
  void deliver(std::uint16_t priority, Match match, Actions const &out) {
    auto actions = copies_;
    add(priority, std::move(match), append(actions, out));
  }
  void add(std::uint16_t priority, Match match, Actions actions) {
    program_.add(table::kDelivery, {.priority = priority,
                                    .match = std::move(match),
                                    .actions = std::move(actions),
                                    .cookie = cookie(Counted::port, port_.number)});
  }

  Common const &common_;
  Program &program_;
  Port const &port_;
  Actions const copies_;  ///< of the frame as it is inside
  Actions const out_;
};

}  // namespace

void compile_delivery(PortPlan const &plan, Program &program) {
  if (takes_frames(plan.common, plan.port)) {
    Delivery(plan, program).compile();
  }
}

}  // namespace simhost::openvswitch
