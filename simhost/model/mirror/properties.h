// Settings of mirror sessions: the tables of ports and of the switch's uplinks.
#pragma once

#include <array>
#include <string_view>
#include <vector>

#include "model/properties/descriptor.h"
#include "model/vlans/properties.h"
#include "vswitch/mirror.h"
#include "vswitch/properties.h"

namespace simhost::mirror {

/// More than any port has; what a count in a caller's table may claim without having it.
inline constexpr qex_uint32 kMostSessions = 1024;
inline constexpr qex_uint32 kMostEntities = 65536;

inline constexpr std::array<Word, 5> kTypes{
    {{"mixed", VS_DVMIRROR_SESSIONTYPE_MIXDST},
     {"port", VS_DVMIRROR_SESSIONTYPE_DVPORT},
     {"remote_source", VS_DVMIRROR_SESSIONTYPE_RMIRROR_SRC},
     {"remote_destination", VS_DVMIRROR_SESSIONTYPE_RMIRROR_DST},
     {"encapsulated", VS_DVMIRROR_SESSIONTYPE_ERMIRROR_SRC}}};
inline constexpr std::array<Word, 3> kEncapsulations{{{"gre", DVMIRROR_ENCAP_GRE},
                                                      {"erspan2", DVMIRROR_ENCAP_ERSPAN2},
                                                      {"erspan3", DVMIRROR_ENCAP_ERSPAN3}}};
inline constexpr std::array<Word, 6> kUplinkFilters{
    {{"none", MIRROR_UPLINK_FILTER_NONE},
     {"normal", MIRROR_UPLINK_FILTER_NORMAL},
     {"stt", MIRROR_UPLINK_FILTER_STT},
     {"vxlan", MIRROR_UPLINK_FILTER_VXLAN},
     {"geneve", MIRROR_UPLINK_FILTER_GENEVE},
     {"encapsulated", MIRROR_UPLINK_FILTER_ALL_ENCAP}}};
inline constexpr std::array<Word, 5> kWildcards{{{"vmm", VS_DVMIRROR_WILDCARD_VMM},
                                                 {"uplinks", VS_DVMIRROR_WILDCARD_PNIC},
                                                 {"cos", VS_DVMIRROR_WILDCARD_COS},
                                                 {"tcpip", VS_DVMIRROR_WILDCARD_TCPIP},
                                                 {"test", VS_DVMIRROR_WILDCARD_TEST}}};

/// What an entity names; the names are in the order of the types.
struct UplinkName {
  using Object = DVMirrorEntity;
  using Characters = decltype(qex_Name::string);
  static Characters const &in(DVMirrorEntity const &entity) { return entity.uplink.string; }
  static Characters &in(DVMirrorEntity &entity) { return entity.uplink.string; }
};
struct Address {
  using Object = DVMirrorEntity;
  static Bytes bytes(DVMirrorEntity const &entity) {
    auto const all = copied(bytes_of(entity.ip.ipv6));
    auto const length = entity.ip.isIPv6 != 0 ? all.size() : sizeof entity.ip.ipv4;
    return copied(BytesView(all).first(length));
  }
  static void put(DVMirrorEntity &entity, BytesView address) {
    entity.ip.isIPv6 = static_cast<qex_Bool>(address.size() == sizeof entity.ip.ipv6);
    std::memcpy(&entity.ip.ipv6, address.data(), address.size());
  }
};
inline constexpr std::array kEntityMembers{
    form::member("port", form::text<form::TextField<&DVMirrorEntity::dvPortId>>(),
                 "a port, by its identifier"),
    form::member("uplink", form::of_uplinks(form::text<UplinkName>()), "an uplink, by its name"),
    form::member("vlan", form::number<&DVMirrorEntity::vlan>(0, vlans::kGreatest), "a VLAN"),
    form::member("ip", form::address<Address>(FormKind::ip), "an IPv4 or IPv6 address"),
    form::member("number", form::number<&DVMirrorEntity::portId>(1, UINT32_MAX),
                 "a port, by its number"),
};
inline constexpr auto kEntity = form::one_of<&DVMirrorEntity::type>(kEntityMembers);

/// A session of a table and its entities.
struct Session {
  DVMirrorSession record = fresh_record();
  std::vector<DVMirrorEntity> to = {};
  std::vector<DVMirrorEntity> received_by = {};
  std::vector<DVMirrorEntity> sent_by = {};

  static constexpr DVMirrorSession fresh_record() {
    DVMirrorSession fresh{};
    fresh.type = VS_DVMIRROR_SESSIONTYPE_DVPORT;
    return fresh;
  }
};

template <auto kField>
using Field = form::In<&Session::record, form::NumberField<kField>>;
template <auto kField>
using TextField = form::TextIn<&Session::record, form::TextField<kField>>;
template <std::int64_t kFlag>
using Flag = form::Bit<Field<&DVMirrorSession::flags>, kFlag>;

inline constexpr std::array kEncapsulationMembers{
    form::sparse("type", form::choice<Field<&DVMirrorSession::encapType>>(kEncapsulations),
                 "how the frames are wrapped", DVMIRROR_ENCAP_GRE),
    form::sparse("key", form::number<Field<&DVMirrorSession::greKey>>(0, UINT32_MAX),
                 "the key of GRE"),
    form::sparse("vlan", form::number<Field<&DVMirrorSession::encapVlan>>(0, vlans::kGreatest),
                 "the VLAN that they are wrapped in"),
    form::sparse("id", form::number<Field<&DVMirrorSession::erspanID>>(0, UINT16_MAX),
                 "the session of ERSPAN"),
    form::sparse("cos", form::number<Field<&DVMirrorSession::erspanCOS>>(0, UINT8_MAX),
                 "its class of service"),
    form::sparse("granularity", form::number<Field<&DVMirrorSession::erspanGra>>(0, UINT8_MAX),
                 "of its times"),
};

inline constexpr std::array kSessionMembers{
    form::required_member("sid", form::text<TextField<&DVMirrorSession::sid>>(), "its identifier"),
    form::member("name", form::text<TextField<&DVMirrorSession::dname>>(), "its name"),
    form::member("type", form::choice<Field<&DVMirrorSession::type>>(kTypes), "what kind it is"),
    form::member("snap_length", form::number<Field<&DVMirrorSession::snapLen>>(0, UINT32_MAX),
                 "bytes of a frame; 0 for all"),
    form::member("sampling_rate",
                 form::number<Field<&DVMirrorSession::samplingRate>>(0, UINT32_MAX),
                 "one frame in so many; 0 for all"),
    form::member("disabled", form::boolean<Flag<VS_DVMIRROR_FLAG_DISABLED>>(),
                 "whether it does not run"),
    form::member("promiscuous", form::boolean<Flag<VS_DVMIRROR_FLAG_LEGACY>>(),
                 "whether it stands for a port in promiscuous mode"),
    form::member("to", form::list<form::VectorField<&Session::to>>(kEntity, kMostEntities),
                 "where it mirrors to"),
    form::member("received_by",
                 form::list<form::VectorField<&Session::received_by>>(kEntity, kMostEntities),
                 "whose received frames it mirrors"),
    form::member("sent_by",
                 form::list<form::VectorField<&Session::sent_by>>(kEntity, kMostEntities),
                 "whose sent frames it mirrors"),
    form::sparse("encapsulation", form::record<Session>(kEncapsulationMembers),
                 "how mirrored frames are wrapped"),
    form::sparse("encapsulates", form::boolean<Flag<VS_DVMIRROR_FLAG_DST_ENCAP>>(),
                 "whether mirrored frames are wrapped"),
    form::sparse("keeps_vlan", form::boolean<Flag<VS_DVMIRROR_FLAG_DST_ORIG_VLAN>>(),
                 "whether mirrored frames keep their VLAN"),
    form::sparse("no_output", form::boolean<Flag<VS_DVMIRROR_FLAG_DST_NO_OUTPUT>>(),
                 "whether destinations get nothing else"),
    form::sparse("no_input", form::boolean<Flag<VS_DVMIRROR_FLAG_DST_NO_INPUT>>(),
                 "whether what destinations send is dropped"),
    form::sparse("mirrors_uplinks", form::boolean<Flag<VS_DVMIRROR_FLAG_SRC_UPLINK_MIRROR>>(),
                 "whether frames of uplinks are mirrored"),
    form::sparse("uplink_filter",
                 form::choice<Field<&DVMirrorSession::uplinkFilter>>(kUplinkFilters),
                 "which of them"),
    form::sparse("received_from", form::bits<Field<&DVMirrorSession::wildIn>>(kWildcards),
                 "further sources of received frames"),
    form::sparse("sent_from", form::bits<Field<&DVMirrorSession::wildOut>>(kWildcards),
                 "further sources of sent frames"),
    form::sparse("stack", form::boolean<Field<&DVMirrorSession::stack>>(),
                 "whether it mirrors on the side of the stack"),
};

/// All sessions of a port or of a switch's uplinks.
struct SIMHOST_API Table {
  static constexpr std::string_view kBytes = "DVMirrorSessionTable, whole";

  DVMirrorVersion version = VS_DVMIRROR_VERSION_V3;
  std::vector<Session> sessions = {};

  [[nodiscard]] Bytes to_bytes() const;
  /// Refuses a wrong magic number, another size than the counts make, unknown values and bits,
  /// entities that are not in the table, no session identifier (QEX_BAD_PARAM), an unknown version
  /// (QEX_VERSION_MISMATCH_MAJOR), VLANs past the greatest (QEX_BAD_VLANID), texts that do not end
  /// (QEX_NAME_TOO_LONG), an identifier twice (QEX_EXISTS), more sessions or entities than above
  /// (QEX_LIMIT_EXCEEDED).
  static Table from(BytesView bytes);
};

inline constexpr auto kSession = form::record<Session>(kSessionMembers);
inline constexpr auto kTable =
    form::list<form::VectorField<&Table::sessions>>(kSession, kMostSessions);

/// What of a table no frame can obey.
inline constexpr std::string_view kBeyondFrames =
    "`sampling_rate`: Open vSwitch mirrors every frame; `cos` and `granularity`: its ERSPAN says "
    "neither";

inline constexpr auto sessions = property<Table>(VSPROP_PORT_MIRROR_SESSIONS)
                                     .of_port()
                                     .typed()
                                     .json("mirror_sessions", kTable)
                                     .frames_obey()
                                     .frames_cannot(kBeyondFrames)
                                     .says("the mirror sessions of the port, all of them");

inline constexpr auto uplink_sessions =
    property<Table>(VSPROP_SWITCH_UPLINK_MIRROR_SESSIONS)
        .of_switch()
        .json("uplink_mirror_sessions", kTable)
        .frames_obey()
        .frames_cannot(kBeyondFrames)
        .says(
            "the mirror sessions of the switch's uplinks, all of them; without effect where no "
            "frames move");

inline constexpr std::array<Descriptor const *, 2> kProperties{&sessions, &uplink_sessions};

}  // namespace simhost::mirror
