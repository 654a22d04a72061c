// The places of the pipeline: its tables, its registers, what they hold, and the cookies by which
// what a flow counted is known. README.md has the picture.
#pragma once

#include <array>
#include <cstdint>

#include "planes/openvswitch/openflow/field.h"
#include "planes/openvswitch/openflow/port.h"

namespace simhost::openvswitch {

namespace table {

/// What may come in at all; writes kOrigin.
inline constexpr std::uint8_t kAdmission = 0;
/// Whose addresses a port may send from; asks kFirstAddresses for the next one.
inline constexpr std::uint8_t kSources = 1;
/// Whether a client whose address is not known sends from its first one; reads kDestination and
/// kHasFirst, writes kVerdict.
inline constexpr std::uint8_t kFirstAddress = 2;
/// From tags to kVlan and kPriority; the tag goes.
inline constexpr std::uint8_t kTags = 3;
/// Whether what follows the tag that a client's frame keeps as its second one is a tag as well;
/// reads kClientTag.
inline constexpr std::uint8_t kClientTags = 18;
/// Who may have a second tag; reads kVlan, writes kTooLarge.
inline constexpr std::uint8_t kNestedTags = 4;
/// From kVlan to kPrivateKind and kDomain, for what is not too large.
inline constexpr std::uint8_t kPrivateVlans = 5;
/// Frames of this switch that come back over an uplink; asks kRecentSources.
inline constexpr std::uint8_t kOwnFrames = 6;
/// Copies that come in over an uplink: counts them, and asks at which uplink they are taken; reads
/// kVlan, writes kWay.
inline constexpr std::uint8_t kRemoteMirrors = 29;
/// Asks the sessions; a frame that has come this far is one of the switch's.
inline constexpr std::uint8_t kMirroring = 7;
/// Sources that an uplink should not have for a while; fills kRecentSources.
inline constexpr std::uint8_t kRemembering = 25;
/// Whether the source is learned: asks kLearnedAddresses, which writes kDestination.
inline constexpr std::uint8_t kLearning = 8;
/// What becomes of frames from addresses past the limit of their port; reads kVerdict.
inline constexpr std::uint8_t kLimits = 9;
/// Likewise past that of the switch.
inline constexpr std::uint8_t kSwitchLimit = 19;
/// Counts what was let in; asks the three tables of addresses, which write kDestination.
inline constexpr std::uint8_t kLookup = 10;
/// Which ports an uplink's frames are for; writes kWay.
inline constexpr std::uint8_t kReceiving = 11;
/// Whether the frame came in at the slot that its group elected; reads kElected.
inline constexpr std::uint8_t kElection = 12;
/// To a port, to a list of ports, to the uplinks; reads kDestination and kWay, writes kList.
inline constexpr std::uint8_t kDispatch = 13;
/// Lists of ports by kList, kDomain and kWay, in pieces by kPiece.
inline constexpr std::uint8_t kLists = 14;
/// Frames of groups that not everybody gets: to those who want them.
inline constexpr std::uint8_t kGroups = 26;
/// Up to the daemon: what clients say of groups, by the meter of their port.
inline constexpr std::uint8_t kHearing = 28;
/// Out to the port in kReceiver, if its VLANs allow it.
inline constexpr std::uint8_t kDelivery = 15;
/// Which uplink carries it: the group of the port's team.
inline constexpr std::uint8_t kTeams = 16;
/// Likewise where uplinks are tunnels: the one that kDestination is, or all of them.
inline constexpr std::uint8_t kMesh = 27;
/// Out to the uplink in kWire, with its tag.
inline constexpr std::uint8_t kWires = 17;

/// Out to the device of the port or uplink in kReceiver; counts it.
inline constexpr std::uint8_t kSending = 23;
/// Where frames end that are not let in; counts them by where they came in.
inline constexpr std::uint8_t kDropped = 24;

/// Sessions by the port that a frame came in at, and by its VLAN.
inline constexpr std::uint8_t kMirrorsOfPorts = 20;
inline constexpr std::uint8_t kMirrorsOfVlans = 21;
/// The copies of the session in kSession; counts them.
inline constexpr std::uint8_t kMirrors = 22;

/// Addresses, by destination and by kDomain unless their client tags, that are configured,
inline constexpr std::uint8_t kFixedAddresses = 30;
/// that clients without a known one sent from first,
inline constexpr std::uint8_t kFirstAddresses = 31;
/// and that are learned. These two the switch fills by itself.
inline constexpr std::uint8_t kLearnedAddresses = 32;
/// Sources that ports sent from in the last second or two; filled by the switch itself.
inline constexpr std::uint8_t kRecentSources = 33;
/// Sources that are learned, as many as the switch may have; filled by the switch itself. Asked by
/// kLimits, so that the time since a source was seen last is known; writes kIsCounted.
inline constexpr std::uint8_t kCountedSources = 34;

/// Sources that a port had no room for; filled by the switch itself.
inline constexpr std::uint8_t kRefusedSources = 35;
/// Sources that moved in the last seconds; filled by the switch itself.
inline constexpr std::uint8_t kMovedSources = 36;

/// Of frames whose source is not known where they come in: whether Open vSwitch only adds them up,
/// and what became of them then. One of its flows is all that a Learn into it may add; writes
/// kVerdict.
inline constexpr std::uint8_t kAddingUp = 37;
/// Whether a source is known where its frame comes in; reads kDestination, writes kVerdict.
inline constexpr std::uint8_t kSourcePlaces = 38;
/// Learns where a source is, unless it kStays elsewhere; writes kVerdict.
inline constexpr std::uint8_t kTeaching = 39;
/// Gives a source its room of the switch; writes kVerdict.
inline constexpr std::uint8_t kTakingRoom = 40;
/// Of clients whose address is not known: whether a source is the first one; reads kVerdict.
inline constexpr std::uint8_t kFirstOrForged = 41;

/// Ports whose client has a first address; filled by the switch itself. Writes kHasFirst.
inline constexpr std::uint8_t kPortsWithFirst = 42;

/// Whether the switch fills the table by itself.
constexpr bool is_learned(std::uint8_t table) {
  return (table >= kFirstAddresses && table <= kMovedSources) || table == kPortsWithFirst;
}

/// Reached by no frame: the cookie of its one flow is the number of the change that is in force.
inline constexpr std::uint8_t kGeneration = 250;

}  // namespace table

/// The last table that frames reach.
inline constexpr std::uint8_t kLastReached = table::kPortsWithFirst;

namespace field {

/// 0 for a frame from a client, 1 for one from an uplink.
inline constexpr auto kOrigin = openflow::Field::reg0;
/// Bits of their own.
inline constexpr auto kFacts = openflow::Field::reg1;
/// The packet is larger than the MTU.
inline constexpr openflow::SubField kTooLarge{kFacts, 0, 1};
/// There was room for the source.
inline constexpr openflow::SubField kVerdict{kFacts, 1, 1};
/// A Recent: whether the source sent from a port of this switch just before.
inline constexpr openflow::SubField kRecent{kFacts, 2, 2};
/// The frame is on its way out of the switch; known to sessions that tell it.
inline constexpr openflow::SubField kLeaves{kFacts, 4, 1};
/// Open vSwitch adds up what frames did: a Learn says then that it found room, whether it did or
/// not.
inline constexpr openflow::SubField kAddsUp{kFacts, 5, 1};
/// The source has its room of the switch.
inline constexpr openflow::SubField kIsCounted{kFacts, 6, 1};
/// The source moved just before: what adds up came before that.
inline constexpr openflow::SubField kStays{kFacts, 7, 1};
/// Likewise, and nothing of that has been added up yet.
inline constexpr openflow::SubField kJustMoved{kFacts, 8, 1};
/// The client has a first address, be it this one or another.
inline constexpr openflow::SubField kHasFirst{kFacts, 9, 1};
/// The frame's own VLAN, 0 for none.
inline constexpr auto kVlan = openflow::Field::reg2;
/// A PrivateKind.
inline constexpr auto kPrivateKind = openflow::Field::reg3;
/// The VLAN under which addresses are known: the primary one of a private VLAN, else its own.
inline constexpr auto kDomain = openflow::Field::reg4;
inline constexpr auto kPriority = openflow::Field::reg5;
/// The OpenFlow port of a client; 0 while the address is not known; kBeyond, kNowhere.
inline constexpr auto kDestination = openflow::Field::reg6;
/// The number of the way over which an uplink's frame comes; 0 for frames of clients.
inline constexpr auto kWay = openflow::Field::reg7;
/// A List.
inline constexpr auto kList = openflow::Field::reg8;
inline constexpr auto kPiece = openflow::Field::reg9;
/// The first uplink of the slot at which frames of a way are to come in.
inline constexpr auto kElected = openflow::Field::reg10;
/// The OpenFlow port of an uplink.
inline constexpr auto kWire = openflow::Field::reg11;
/// The number of a mirror session.
inline constexpr auto kSession = openflow::Field::reg12;
/// A tag, as it was in the frame.
inline constexpr auto kClientTag = openflow::Field::reg13;
/// The OpenFlow port of a client or an uplink that is to get the frame; a list has many.
inline constexpr auto kReceiver = openflow::Field::reg14;
/// The OpenFlow port of a client whose frame went over an uplink and may have come back.
inline constexpr auto kSender = openflow::Field::reg15;

}  // namespace field

/// The number of bits that a VLAN has in registers.
inline constexpr unsigned kVlanBits = 12;

inline constexpr std::uint64_t kFromClient = 0;
inline constexpr std::uint64_t kFromUplink = 1;
/// In kDestination: no port has this number.
inline constexpr openflow::Port kBeyond = 0xffff;
/// Likewise: at a port without a device.
inline constexpr openflow::Port kNowhere = 0xff00;
/// The last that Open vSwitch gives a device.
inline constexpr openflow::Port kGreatestPort = 0xfeff;
/// In kDestination: beyond a tunnel, of which there may be no more.
inline constexpr openflow::Port kFirstTunnel = 0xfec0;
inline constexpr unsigned kTunnelBits = 6;
static_assert(kFirstTunnel + (1U << kTunnelBits) - 1 == kGreatestPort);

constexpr bool is_tunnel(openflow::Port port) {
  return port >= kFirstTunnel && port <= kGreatestPort;
}

/// Where copies leave for collectors, of either family: a host has an underlay of one. No device
/// has these numbers.
inline constexpr openflow::Port kGrePort = 0xfebe;
inline constexpr openflow::Port kErspanPort = 0xfebf;

/// In kRecent.
enum class Recent : std::uint8_t {
  drops = 1,      ///< the frame is one of this switch's that came back
  is_on_way = 2,  ///< it may be one that had to go over an uplink: it passes, and teaches nothing
};

/// In kList.
enum class List : std::uint8_t {
  all = 1,          ///< every port
  unknown = 2,      ///< those that get frames for unknown addresses
  promiscuous = 3,  ///< those that get every frame
  unasked = 4,      ///< those that do not say which groups they ask for
  // In a VLAN, for each family; only those are members of no group.
  ipv4_takers = 5,     ///< those that get all groups
  ipv4_strangers = 6,  ///< those that get groups without members
  ipv4_routers = 7,
  ipv6_takers = 8,
  ipv6_strangers = 9,
  ipv6_routers = 10,
};

/// What a flow counts: the kind is the cookie's first byte, the number of a port or of a mirror
/// session its last four.
enum class Counted : std::uint8_t {
  nothing = 0,
  disabled = 1,         ///< dropped: the switch is disabled
  reserved = 2,         ///< dropped: for the link's other end only, or malformed
  blocked = 3,          ///< dropped: the port is blocked, or sends nothing
  too_large = 4,        ///< dropped: larger than the MTU
  forged = 5,           ///< dropped: from an address that is not the client's
  address_changed = 6,  ///< dropped: the client changed its address and may not
  wrong_tag = 7,        ///< dropped: of a VLAN that the port has not
  nested_tag = 8,       ///< dropped: a second tag where none may be
  own_frame = 9,        ///< dropped: came back over an uplink
  limit_allowed = 10,   ///< let through although there was no room for its source
  limit_dropped = 11,   ///< dropped because there was no room
  learned = 12,         ///< an address that was learned at a port; at the uplinks it has number 0
  first_address = 13,   ///< the address that a client sent from first
  recent_source = 14,   ///< what kRecentSources holds
  counted_source = 15,  ///< what kCountedSources holds
  mirrored = 16,        ///< copies of a mirror session
  port = 17,            ///< of a port, for nothing that is counted
  in_unicast = 18,      ///< let in at a port, of an uplink as well
  in_multicast = 19,
  in_broadcast = 20,
  out_unicast = 21,  ///< sent out at one
  out_multicast = 22,
  out_broadcast = 23,
  dropped = 24,   ///< not let in, for whichever reason
  out_lost = 25,  ///< by the device itself, like the next ones
  in_damaged = 26,
  out_damaged = 27,
  unwanted_copy = 28,    ///< dropped: a copy of a mirror session, which none here takes
  adding_up = 29,        ///< what kAddingUp holds
  refused_source = 30,   ///< what kRefusedSources holds
  moved_source = 31,     ///< what kMovedSources holds
  port_with_first = 32,  ///< what kPortsWithFirst holds
};

constexpr std::uint64_t cookie(Counted counted, std::uint32_t number = 0) {
  return static_cast<std::uint64_t>(counted) << 56U | number;
}

constexpr Counted kind_of(std::uint64_t cookie) {
  return static_cast<Counted>(cookie >> 56U);
}

constexpr std::uint32_t number_of(std::uint64_t cookie) {
  return static_cast<std::uint32_t>(cookie);
}

/// The tables whose flows count what callers are told of: by ports and sessions, in their cookies.
inline constexpr std::array kCountingTables{
    table::kLimits,        table::kLookup,  table::kSwitchLimit, table::kMirrors,
    table::kRemoteMirrors, table::kSending, table::kDropped};

/// In the mark of a packet: it is none, but a question what would become of it, and teaches
/// nothing.
inline constexpr std::uint32_t kQuestion = 0x51dea500;
inline constexpr std::uint32_t kQuestionBits = 0xffffff00;
/// Likewise what the one who asks knows of the source: there is no room for it where it comes in,
inline constexpr std::uint32_t kHasNoRoom = 1;
/// or it is not the address that the client sent from first.
inline constexpr std::uint32_t kIsNotFirst = 2;

/// Groups of a slot, which come before the groups that lead to them: the low bits are the number of
/// its first uplink and, above, of the slot among those with that one.
inline constexpr openflow::GroupId kSpreadingGroups = 0x08000000;
/// Groups of a way: the low bits are its number.
inline constexpr openflow::GroupId kSendingGroups = 0x10000000;
inline constexpr openflow::GroupId kReceivingGroups = 0x20000000;
/// For frames to one known receiver, where each has an uplink of its own.
inline constexpr openflow::GroupId kReceivingByAddress = 0x30000000;

}  // namespace simhost::openvswitch
