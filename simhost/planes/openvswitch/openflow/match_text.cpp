// Matches as text: what frames are of by name, and the parts of a tag in one.
#include <fmt/format.h>

#include <array>
#include <optional>
#include <set>
#include <string_view>

#include "planes/openvswitch/openflow/field_text.h"
#include "planes/openvswitch/openflow/text.h"

namespace simhost::openflow {
namespace {

struct Protocol {
  std::string_view name;
  Value ether_type;
  std::optional<Value> ip_protocol;
};

// Those with two numbers before those with one.
constexpr std::array<Protocol, 14> kProtocols{{
    {"icmp", 0x0800, 1},
    {"tcp", 0x0800, 6},
    {"udp", 0x0800, 17},
    {"sctp", 0x0800, 132},
    {"tcp6", 0x86dd, 6},
    {"udp6", 0x86dd, 17},
    {"icmp6", 0x86dd, 58},
    {"sctp6", 0x86dd, 132},
    {"ip", 0x0800, std::nullopt},
    {"arp", 0x0806, std::nullopt},
    {"rarp", 0x8035, std::nullopt},
    {"ipv6", 0x86dd, std::nullopt},
    {"mpls", 0x8847, std::nullopt},
    {"mplsm", 0x8848, std::nullopt},
}};

/// Where the order of a text is another than that of Field: these come first.
constexpr std::array kFirst{
    Field::pkt_mark, Field::reg0,    Field::reg1,     Field::reg2,    Field::reg3,    Field::reg4,
    Field::reg5,     Field::reg6,    Field::reg7,     Field::reg8,    Field::reg9,    Field::reg10,
    Field::reg11,    Field::reg12,   Field::reg13,    Field::reg14,   Field::reg15,   Field::tun_id,
    Field::tun_src,  Field::tun_dst, Field::metadata, Field::in_port, Field::vlan_vid};

constexpr Value kPriorityShift = 13;
constexpr Value kPriorityBits = 0xe000;

class MatchText {
 public:
  explicit MatchText(Match const &match) : left_(match.fields().begin(), match.fields().end()) {}

  std::string whole() {
    add_protocol();
    for (auto const field : kFirst) {
      if (field == Field::vlan_vid) {
        add_tag();
      } else {
        add_field(field);
      }
    }
    while (!left_.empty()) {
      add_field(left_.begin()->first);
    }
    return text_;
  }

 private:
  /// The content of a field that matches as a whole.
  [[nodiscard]] std::optional<Value> exact(Field field) const {
    auto const found = left_.find(field);
    return found != left_.end() && found->second.mask == settable_bits(field)
               ? std::optional(found->second.value)
               : std::nullopt;
  }

  std::optional<Masked> take(Field field) {
    auto const found = left_.extract(field);
    return found ? std::optional(found.mapped()) : std::nullopt;
  }

  void add(std::string_view item) {
    text_ += text_.empty() ? "" : ",";
    text_ += item;
  }

  void add_protocol() {
    auto const ether_type = exact(Field::eth_type);
    auto const ip_protocol = exact(Field::ip_proto);
    for (auto const &protocol : kProtocols) {
      if (ether_type == protocol.ether_type &&
          (!protocol.ip_protocol || ip_protocol == protocol.ip_protocol)) {
        add(protocol.name);
        left_.erase(Field::eth_type);
        if (protocol.ip_protocol) {
          left_.erase(Field::ip_proto);
        }
        return;
      }
    }
  }

  void add_tag() {
    auto const vid = take(Field::vlan_vid);
    if (!vid) {
      return;
    }
    auto const priority = take(Field::vlan_pcp);
    bool const is_whole = vid->mask == settable_bits(Field::vlan_vid);
    bool const is_any = *vid == Masked{kVlanPresent, kVlanPresent};
    if ((vid->value & kVlanPresent) != 0 && (is_whole || (is_any && priority))) {
      if (is_whole) {
        add(fmt::format("dl_vlan={}", vid->value & ~kVlanPresent));
      }
      if (priority) {
        add(fmt::format("dl_vlan_pcp={}", priority->value));
      }
      return;
    }
    auto const shifted = priority ? priority->value << kPriorityShift : 0;
    add(fmt::format("vlan_tci={:#06x}/{:#06x}", vid->value | shifted,
                    vid->mask | (priority ? kPriorityBits : 0)));
  }

  void add_field(Field field) {
    auto const content = take(field);
    if (!content) {
      return;
    }
    bool const is_number = info(field).form == Form::decimal;
    auto const value =
        is_number && content->mask != settable_bits(field)
            ? fmt::format("{}/{}", hexadecimal(content->value), hexadecimal(content->mask))
        : field == Field::eth_type ? fmt::format("{:#06x}", content->value)
                                   : masked_text(field, *content);
    add(fmt::format("{}={}", info(field).match_name, value));
  }

  std::map<Field, Masked> left_;
  std::string text_;
};

}  // namespace

std::string to_text(Match const &match) {
  return MatchText(match).whole();
}

}  // namespace simhost::openflow
