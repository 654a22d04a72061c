// One row for each member.
#include "scenario/named_properties.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <string>

#include "model/properties/keys.h"
#include "model/properties/properties.h"
#include "qexapi/switch_properties.h"
#include "scenario/policy_documents.h"
#include "scenario/reading.h"
#include "vswitch/properties.h"

namespace simhost::scenario {
namespace {

template <auto kRead>
Bytes record_from(Node const &node) {
  return copied(bytes_of(kRead(node)));
}

template <typename Record>
Json record_to_json(BytesView value) {
  return described(record_of<Record>(value));
}

std::uint32_t mtu_from(Node const &node) {
  return static_cast<std::uint32_t>(node.integer(1280, 9190));
}

Json mtu_to_json(BytesView value) {
  return record_of<std::uint32_t>(value);
}

std::uint32_t filter_mode_from(Node const &node) {
  return node.choice(std::span(kFilterModes));
}

Json filter_mode_to_json(BytesView value) {
  return choice_to_json(record_of<std::uint32_t>(value), kFilterModes);
}

Bytes text_property_from(Node const &node) {
  return bytes_of_text(node.text());
}

Json text_to_json(BytesView value) {
  return text_of(value);
}

constexpr std::array kOfSwitch{
    NamedProperty{"mtu", VSPROP_MTU, record_from<mtu_from>, mtu_to_json},
    NamedProperty{"teaming", VSPROP_SWITCH_TEAMING, record_from<teaming_from>,
                  record_to_json<VSTeamPolicy>},
    NamedProperty{"mac_learning", VSPROP_SWITCH_MAC_LEARNING, record_from<switch_learning_from>,
                  record_to_json<VSMACLearning>},
    NamedProperty{"multicast", VSPROP_MULTICAST_FILTER, record_from<filter_mode_from>,
                  filter_mode_to_json},
};
constexpr std::array kOfPort{
    NamedProperty{"teaming", VSPROP_PORT_TEAMING_POLICY, record_from<teaming_from>,
                  record_to_json<VSTeamPolicy>},
    NamedProperty{"uplink", VSPROP_PORT_TEAMING_OVERRIDE, text_property_from, text_to_json},
    NamedProperty{"mac_learning", VSPROP_PORT_MAC_MANAGEMENT, record_from<port_learning_from>,
                  record_to_json<VSPMACManagement>},
    NamedProperty{"mirror_sessions", VSPROP_PORT_MIRROR_SESSIONS, mirror_sessions_from,
                  mirror_sessions_to_json},
};
constexpr std::array kOfUplinkPort{
    NamedProperty{"name", QEX_NEBPROP_PORT_ALIAS, text_property_from, text_to_json},
};

}  // namespace

NamedProperties named_of_switch() {
  return kOfSwitch;
}

NamedProperties named_of_port() {
  return kOfPort;
}

NamedProperties named_of_uplink_port() {
  return kOfUplinkPort;
}

NamedProperty const *find_named(NamedProperties named, std::string_view key) {
  auto const found = std::find_if(named.begin(), named.end(),
                                  [&](NamedProperty const &known) { return known.key == key; });
  return found == named.end() ? nullptr : &*found;
}

void apply_members(storage::Transaction &transaction, storage::PropertyOwner const &owner,
                   NamedProperties named, Node const &node) {
  for (auto const &property : named) {
    if_there(node, property.member, [&](Node const &member) {
      set_property(transaction, owner, property.key, property.value_from(member));
    });
  }
}

void describe_members(Json &described, storage::Transaction &transaction,
                      storage::PropertyOwner const &owner, NamedProperties named) {
  for (auto const &property : named) {
    if (auto const found = get_property(transaction, owner, property.key)) {
      described[std::string(property.member)] = property.described(found->value);
    }
  }
}

bool round_trips(Json const &described, NamedProperty const &named,
                 storage::Property const &property) {
  if (property.type != find_property_key(named.key)->type) {
    return false;
  }
  // As it will be read: texts that are no UTF-8 are lost on the way.
  auto const written =
      described.at(std::string(named.member)).dump(-1, ' ', false, Json::error_handler_t::replace);
  auto const read = Json::parse(written);
  Node const node(read);
  try {
    return do_at(node, [&] { return named.value_from(node); }) == property.value;
  } catch (DocumentError const &) {
    return false;
  }
}

}  // namespace simhost::scenario
