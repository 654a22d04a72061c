// One pair of functions per policy; what one of a pair writes, the other reads.
#include "scenario/policy_documents.h"

#include <array>
#include <cstring>

#include "scenario/texts.h"
#include "vswitch/mirror.h"

namespace simhost::scenario {
namespace {

constexpr std::int64_t k32Bits = 0xFFFFFFFF;

constexpr std::array<Choice<qex_uint32>, 6> kBalances{{{"none", TEAM_FRP_TYPE_NONE},
                                                       {"ip", TEAM_FRP_TYPE_LB_IP},
                                                       {"mac", TEAM_FRP_TYPE_LB_SRCMAC},
                                                       {"port", TEAM_FRP_TYPE_LB_SRCID},
                                                       {"explicit", TEAM_FRP_TYPE_FO_EXPLICIT},
                                                       {"load", TEAM_FRP_TYPE_LB_LBT}}};

constexpr std::array<Choice<qex_uint32>, 9> kCriteria{
    {{"speed", TEAM_FRP_CRIT_LINK_SPEED},
     {"speed_at_least", TEAM_FRP_CRIT_LINK_SPEED_GTE},
     {"duplex", TEAM_FRP_CRIT_LINK_DUPLEX},
     {"lacp", TEAM_FRP_CRIT_LACP_PORT_DOWN},
     {"beacon", TEAM_FRP_CRIT_BEACON_STATE},
     {"errors", TEAM_FRP_CRIT_LINK_ERR},
     {"link", TEAM_FRP_CRIT_LINK_STATE},
     {"blocked", TEAM_FRP_CRIT_PORT_BLOCKED},
     {"driver", TEAM_FRP_CRIT_DRV_PRESENT}}};

constexpr std::array<Choice<qex_uint32>, 9> kTeamFlags{
    {{"all_available", TEAM_FRP_FLAG_ALL_AVAILABLE},
     {"reverse", TEAM_FRP_FLAG_REVERSE},
     {"best_effort", TEAM_FRP_FLAG_BEST_EFFORT},
     {"rolling", TEAM_FRP_FLAG_ROLLING},
     {"shotgun", TEAM_FRP_FLAG_SHOTGUN},
     {"notify", TEAM_FRP_FLAG_NOTIFY_SWITCH},
     {"block_output", TEAM_FRP_FLAG_BLOCK_OUTPUT},
     {"lacp_client", TEAM_FRP_FLAG_LACP_CLIENT},
     {"lst", TEAM_FRP_FLAG_LST}}};

constexpr std::array<Choice<VSPortMACLearningLimitPolicy>, 2> kLimitPolicies{
    {{"allow", VSPORT_MAC_LEARNING_LIMIT_POLICY_ALLOW},
     {"drop", VSPORT_MAC_LEARNING_LIMIT_POLICY_DROP}}};

constexpr std::array<Choice<DVMirrorSessionType>, 5> kSessionTypes{
    {{"mixed", VS_DVMIRROR_SESSIONTYPE_MIXDST},
     {"port", VS_DVMIRROR_SESSIONTYPE_DVPORT},
     {"remote_source", VS_DVMIRROR_SESSIONTYPE_RMIRROR_SRC},
     {"remote_destination", VS_DVMIRROR_SESSIONTYPE_RMIRROR_DST},
     {"encapsulated", VS_DVMIRROR_SESSIONTYPE_ERMIRROR_SRC}}};

using Bits = std::span<Choice<qex_uint32> const>;

qex_uint32 bits_from(Node const &node, Bits choices) {
  qex_uint32 bits = 0;
  for (auto const &item : node.items()) {
    bits |= item.choice(choices);
  }
  return bits;
}

Json bits_to_json(qex_uint32 bits, Bits choices) {
  Json names = Json::array();
  for (auto const &choice : choices) {
    if ((bits & choice.value) != 0) {
      names.push_back(choice.text);
    }
  }
  return names;
}

template <typename Field>
void text_into(Node const &node, Field &field) {
  auto const text = node.text();
  if (text.size() >= sizeof field) {
    node.fail("has more than " + std::to_string(sizeof field - 1) + " bytes");
  }
  std::memset(field, 0, sizeof field);
  text.copy(field, sizeof field);
}

qex_uint32 append_names(VSTeamPolicy &policy, std::size_t first, Node const &node) {
  auto const items = node.items();
  if (first + items.size() > QEX_TEAM_MAX_UPLINKS) {
    node.fail("a team has " + std::to_string(QEX_TEAM_MAX_UPLINKS) + " uplinks at most");
  }
  for (auto const &item : items) {
    text_into(item, policy.uplinkPortName[first++]);
  }
  return static_cast<qex_uint32>(items.size());
}

Json names_to_json(VSTeamPolicy const &policy, std::size_t first, std::size_t count) {
  Json names = Json::array();
  for (auto const &name : std::span(policy.uplinkPortName).subspan(first, count)) {
    names.push_back(text_in(name));
  }
  return names;
}

DVMirrorEntity entity_from(Node const &node) {
  node.only({"port", "uplink", "vlan", "ip", "number"});
  auto const members = node.members();
  if (members.size() != 1) {
    node.fail("must have one of the keys port, uplink, vlan, ip, number");
  }
  auto const &kind = members.front().key;
  auto const &value = members.front().value;
  DVMirrorEntity entity{};
  if (kind == "port") {
    entity.type = MIRROR_ENTTYPE_DVPORT;
    text_into(value, entity.dvPortId);
  } else if (kind == "uplink") {
    entity.type = MIRROR_ENTTYPE_UPLINK;
    text_into(value, entity.uplink.string);
  } else if (kind == "vlan") {
    entity.type = MIRROR_ENTTYPE_VLAN;
    entity.vlan = static_cast<qex_uint16>(value.integer(0, 4094));
  } else if (kind == "number") {
    entity.type = MIRROR_ENTTYPE_PORT;
    entity.portId = static_cast<qex_uint32>(value.integer(1, k32Bits));
  } else {
    entity.type = MIRROR_ENTTYPE_IP;
    auto const address = address_from(value.text());
    if (!address || address->size() == 6) {
      value.fail("must be an IPv4 or IPv6 address");
    }
    entity.ip.isIPv6 = static_cast<qex_Bool>(address->size() == sizeof entity.ip.ipv6);
    std::memcpy(&entity.ip.ipv6, address->data(), address->size());
  }
  return entity;
}

Json entity_to_json(DVMirrorEntity const &entity) {
  switch (entity.type) {
    case MIRROR_ENTTYPE_DVPORT:
      return {{"port", text_in(entity.dvPortId)}};
    case MIRROR_ENTTYPE_UPLINK:
      return {{"uplink", text_in(entity.uplink.string)}};
    case MIRROR_ENTTYPE_VLAN:
      return {{"vlan", qex_uint16{entity.vlan}}};
    case MIRROR_ENTTYPE_PORT:
      return {{"number", qex_uint32{entity.portId}}};
    case MIRROR_ENTTYPE_IP: {
      std::array<std::byte, sizeof entity.ip.ipv6> address{};
      std::memcpy(address.data(), &entity.ip.ipv6, address.size());
      auto const length = entity.ip.isIPv6 != 0 ? address.size() : sizeof entity.ip.ipv4;
      return {{"ip", address_text(std::span(address).first(length))}};
    }
  }
  return Json::object();
}

DVMirrorSession session_from(Node const &node, std::vector<DVMirrorEntity> &entities) {
  node.only({"sid", "name", "type", "snap_length", "sampling_rate", "disabled", "promiscuous", "to",
             "received_by", "sent_by"});
  DVMirrorSession session{};
  text_into(node.at("sid"), session.sid);
  if (auto const name = node.find("name")) {
    text_into(*name, session.dname);
  }
  session.type = node.get("type", VS_DVMIRROR_SESSIONTYPE_DVPORT,
                          [](Node const &type) { return type.choice(std::span(kSessionTypes)); });
  auto const number = [](Node const &given) { return given.integer(0, k32Bits); };
  session.snapLen = node.get("snap_length", qex_uint32{0}, number);
  session.samplingRate = node.get("sampling_rate", qex_uint32{0}, number);
  if (node.get("disabled", false, &Node::flag_of)) {
    session.flags |= VS_DVMIRROR_FLAG_DISABLED;
  }
  if (node.get("promiscuous", false, &Node::flag_of)) {
    session.flags |= VS_DVMIRROR_FLAG_LEGACY;
  }
  session.startIdx = static_cast<qex_uint32>(entities.size());
  auto const append = [&](std::string_view key) {
    auto const before = entities.size();
    if (auto const list = node.find(key)) {
      for (auto const &item : list->items()) {
        entities.push_back(entity_from(item));
      }
    }
    return static_cast<qex_uint32>(entities.size() - before);
  };
  session.numDstEntities = append("to");
  session.numSrcInEntities = append("received_by");
  session.numSrcOutEntities = append("sent_by");
  return session;
}

}  // namespace

VSTeamPolicy teaming_from(Node const &node) {
  node.only({"balance", "criteria", "flags", "speed", "full_duplex", "error_percent", "active",
             "standby"});
  VSTeamPolicy policy{};
  policy.loadBalance = node.get("balance", qex_uint32{TEAM_FRP_TYPE_LB_SRCID},
                                [](Node const &given) { return given.choice(Bits(kBalances)); });
  policy.linkCriteria = node.get("criteria", qex_uint32{TEAM_FRP_CRIT_LINK_STATE},
                                 [](Node const &given) { return bits_from(given, kCriteria); });
  policy.flags = node.get("flags", qex_uint32{TEAM_FRP_FLAG_NOTIFY_SWITCH},
                          [](Node const &given) { return bits_from(given, kTeamFlags); });
  policy.speed =
      node.get("speed", qex_uint16{0}, [](Node const &given) { return given.integer(0, 0xFFFF); });
  policy.fullDuplex = node.get("full_duplex", qex_uint8{0}, &Node::flag_of);
  policy.percentError = node.get("error_percent", qex_uint8{0},
                                 [](Node const &given) { return given.integer(0, 100); });
  if (auto const active = node.find("active")) {
    policy.numActive = append_names(policy, 0, *active);
  }
  if (auto const standby = node.find("standby")) {
    policy.numStandby = append_names(policy, policy.numActive, *standby);
  }
  return policy;
}

Json described(VSTeamPolicy const &policy) {
  return {{"balance", choice_to_json(qex_uint32{policy.loadBalance}, kBalances)},
          {"criteria", bits_to_json(policy.linkCriteria, kCriteria)},
          {"flags", bits_to_json(policy.flags, kTeamFlags)},
          {"speed", qex_uint16{policy.speed}},
          {"full_duplex", policy.fullDuplex != 0},
          {"error_percent", policy.percentError},
          {"active", names_to_json(policy, 0, policy.numActive)},
          {"standby", names_to_json(policy, policy.numActive, policy.numStandby)}};
}

VSMACLearning switch_learning_from(Node const &node) {
  node.only({"aging_time", "limit", "learn_static"});
  VSMACLearning learning{};
  learning.agingTime = static_cast<qex_uint32>(
      node.get("aging_time", std::int64_t{VS_MAC_LEARNING_AGING_TIME_DEFAULT},
               [](Node const &given) { return given.integer(0, VS_MAC_LEARNING_AGING_TIME_MAX); }) &
      0xFFFFFF);
  learning.macLimit = node.get("limit", qex_uint32{VS_MAC_LEARNING_LIMIT_ENTRIES_DEFAULT},
                               [](Node const &given) { return given.integer(0, k32Bits); });
  learning.learnStatic = node.get("learn_static", false, &Node::flag_of) ? 1 : 0;
  return learning;
}

Json described(VSMACLearning const &learning) {
  return {{"aging_time", qex_uint32{learning.agingTime}},
          {"limit", qex_uint32{learning.macLimit}},
          {"learn_static", learning.learnStatic != 0}};
}

VSPMACManagement port_learning_from(Node const &node) {
  node.only({"learning", "flooding", "limit", "limit_policy", "mac_change"});
  VSPMACManagement management{};
  auto &learning = management.portMACLearning;
  learning.learning = node.get("learning", qex_Bool{1}, &Node::flag_of);
  learning.flooding = node.get("flooding", qex_Bool{0}, &Node::flag_of);
  learning.macLimit = node.get(
      "limit", qex_uint32{VSPORT_MAC_LEARNING_LIMIT_ENTRIES_DEFAULT},
      [](Node const &given) { return given.integer(0, VSPORT_MAC_LEARNING_LIMIT_ENTRIES_MAX); });
  learning.macLimitPolicy =
      node.get("limit_policy", VSPORT_MAC_LEARNING_LIMIT_POLICY_ALLOW,
               [](Node const &given) { return given.choice(std::span(kLimitPolicies)); });
  management.macChangeAllowed = node.get("mac_change", qex_Bool{0}, &Node::flag_of);
  return management;
}

Json described(VSPMACManagement const &management) {
  auto const &learning = management.portMACLearning;
  VSPortMACLearningLimitPolicy const limit_policy = learning.macLimitPolicy;
  return {{"learning", learning.learning != 0},
          {"flooding", learning.flooding != 0},
          {"limit", qex_uint32{learning.macLimit}},
          {"limit_policy", choice_to_json(limit_policy, kLimitPolicies)},
          {"mac_change", management.macChangeAllowed != 0}};
}

Bytes mirror_sessions_from(Node const &node) {
  std::vector<DVMirrorSession> sessions;
  std::vector<DVMirrorEntity> entities;
  for (auto const &item : node.items()) {
    sessions.push_back(session_from(item, entities));
  }
  DVMirrorSessionTable head{};
  head.magicNum = VS_DVMIRROR_MAGIC_NUM;
  head.version = VS_DVMIRROR_VERSION_V3;
  head.numSessions = static_cast<qex_uint32>(sessions.size());
  head.numEntities = static_cast<qex_uint32>(entities.size());
  Bytes table;
  auto const append = [&](BytesView bytes) {
    table.insert(table.end(), bytes.begin(), bytes.end());
  };
  append(bytes_of(head));
  append(std::as_bytes(std::span(sessions)));
  append(std::as_bytes(std::span(entities)));
  return table;
}

Json mirror_sessions_to_json(BytesView table) {
  auto const head = record_at<DVMirrorSessionTable>(table);
  auto const rest = table.subspan(sizeof head);
  auto const length = std::size_t{head.numSessions} * sizeof(DVMirrorSession);
  auto const entities = records_of<DVMirrorEntity>(rest.subspan(length));
  Json described = Json::array();
  for (auto const &session : records_of<DVMirrorSession>(rest.first(length))) {
    std::size_t at = session.startIdx;
    auto const take = [&](std::size_t count) {
      Json list = Json::array();
      for (; count > 0; --count) {
        list.push_back(entity_to_json(entities.at(at++)));
      }
      return list;
    };
    DVMirrorSessionType const type = session.type;
    described.push_back({{"sid", text_in(session.sid)},
                         {"name", text_in(session.dname)},
                         {"type", choice_to_json(type, kSessionTypes)},
                         {"snap_length", qex_uint32{session.snapLen}},
                         {"sampling_rate", qex_uint32{session.samplingRate}},
                         {"disabled", (session.flags & VS_DVMIRROR_FLAG_DISABLED) != 0},
                         {"promiscuous", (session.flags & VS_DVMIRROR_FLAG_LEGACY) != 0},
                         {"to", take(session.numDstEntities)},
                         {"received_by", take(session.numSrcInEntities)},
                         {"sent_by", take(session.numSrcOutEntities)}});
  }
  return described;
}

}  // namespace simhost::scenario
