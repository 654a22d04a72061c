// Members of the objects of documents that are no settings: their names, bounds and words, for what
// reads documents, describes a host and tells of documents alike.
#pragma once

#include <array>
#include <cstdint>
#include <cstring>
#include <string>
#include <string_view>
#include <vector>

#include "clock/clock.h"
#include "model/plane.h"
#include "model/properties/form.h"
#include "model/switches/switches.h"
#include "model/vlans/properties.h"
#include "scenario/texts.h"
#include "vswitch/lags.h"
#include "vswitch/mac_tables.h"
#include "vswitch/mcast_filters.h"

namespace simhost::scenario {

inline constexpr std::int64_t k32Bits = 0xFFFFFFFF;
/// Of a text or a list that has no bound of its own.
inline constexpr std::size_t kUnbounded = SIZE_MAX;

/// Of an uplink.
inline constexpr std::string_view kName = "name";

/// A text in a field.
template <auto kField>
constexpr auto text_member(std::size_t most = kUnbounded) {
  using Object = typename form::ClassOf<decltype(kField)>::Object;
  FormOf<Object> made;
  made.kind = FormKind::text;
  made.text = [](void const *object) { return static_cast<Object const *>(object)->*kField; };
  made.put_text = [](void *object, std::string_view text) {
    static_cast<Object *>(object)->*kField = text;
  };
  made.most = most;
  return made;
}

struct ClockMembers {
  bool stopped;
  std::int64_t now;
};
inline ClockMembers clock_members(storage::Transaction &transaction) {
  return {.stopped = clock_is_stopped(transaction), .now = clock_now(transaction).count()};
}
inline constexpr std::string_view kNow = "now";
inline constexpr std::array kClockMembers{
    form::member("stopped", form::boolean<&ClockMembers::stopped>(), "whether the clock stands"),
    form::member(kNow, form::seconds<form::NumberField<&ClockMembers::now>>(),
                 "what it shows, since the beginning of 1970"),
};

inline constexpr std::array<Word, 2> kUpDown{{{"up", 1}, {"down", 0}}};
inline constexpr std::array<Word, 2> kDuplex{{{"full", 1}, {"half", 0}}};
inline constexpr std::array kLinkMembers{
    form::member("link", form::choice<&Link::carrier>(kUpDown), "the cable"),
    form::member("admin", form::choice<&Link::admin>(kUpDown), "the host's own switch"),
    form::member("lacp", form::choice<&Link::partner>(kUpDown),
                 "whether the other end takes part in link aggregation"),
    form::member("speed", form::number<&Link::speed>(1, 1'000'000), "Mbit/s"),
    form::member("duplex", form::choice<&Link::full_duplex>(kDuplex),
                 "whether both ends send at once"),
    form::member("beacons", form::choice<&Link::beacons>(kUpDown),
                 "whether the beacons that the team's other uplinks send arrive"),
    form::member("error_percent", form::number<&Link::error_percent>(0, 100),
                 "how many of 100 frames are damaged"),
    form::member("driver", form::boolean<&Link::driver>(),
                 "whether the driver of the card is loaded"),
};

inline constexpr std::string_view kId = "id";

/// A switch by itself. All of it but whether it runs is fixed once it exists.
inline constexpr std::string_view kAlias = "alias";
inline constexpr std::string_view kRunning = "running";
inline constexpr std::array kSwitchMembers{
    form::required_member(kAlias, text_member<&storage::Switch::alias>(), "its name"),
    form::sparse(kId, text_member<&storage::Switch::identifier>(),
                 "its identifier, chosen by the host unless given"),
    form::sparse("portset", text_member<&storage::Switch::portset>(),
                 "the name of its ports, chosen by the host unless given"),
    form::member("max_ports",
                 form::number<&storage::Switch::max_ports>(1, storage::kGreatestMaxPorts),
                 "how many ports it may have, uplink ports not counted"),
    form::member("persistent", form::boolean<&storage::Switch::persistent>(),
                 "whether it outlasts a restart"),
    form::member("version", form::number<&storage::Switch::version>(0, k32Bits),
                 "its version, the host's usual one for 0"),
    form::member(kRunning, form::boolean<&storage::Switch::associated>(),
                 "whether it runs on this host"),
};
inline storage::Switch new_switch() {
  return {.alias = {},
          .identifier = {},
          .portset = {},
          .max_ports = kDefaultMaxPorts,
          .version = kDefaultVersion,
          .persistent = true};
}

struct PortMembers {
  std::string id = {};
  std::string external_id = {};
};
inline constexpr std::string_view kExternalId = "external_id";
inline constexpr std::array kPortMembers{
    form::required_member(kId, text_member<&PortMembers::id>(), "its identifier"),
    form::sparse(kExternalId, text_member<&PortMembers::external_id>(),
                 "what another system calls it"),
};

/// The network device of a port; an uplink's has no more than its name.
struct DeviceMembers {
  std::string name = {};
  std::string mac = {};
};
inline constexpr std::string_view kMac = "mac";
inline constexpr std::array kDeviceMembers{
    form::sparse(kName, text_member<&DeviceMembers::name>(), "as Linux calls it; none if empty"),
    form::sparse(kMac, text_member<&DeviceMembers::mac>(), "the address of its client"),
};
inline constexpr auto kPortDevice = form::record_or_first<DeviceMembers>(kDeviceMembers);

struct UplinkPortMembers {
  std::string id = {};
  std::string uplink = {};
};
inline constexpr std::string_view kUplink = "uplink";
inline constexpr std::array kUplinkPortMembers{
    form::required_member(kId, text_member<&UplinkPortMembers::id>(), "its identifier"),
    form::sparse(kUplink, text_member<&UplinkPortMembers::uplink>(),
                 "the uplink of the host that it is to have"),
};

struct LagMembers {
  std::string name;
  std::vector<std::string> uplinks;
  std::uint8_t is_fast = 0;
};
inline constexpr std::array<Word, 2> kRates{{{"slow", 0}, {"fast", 1}}};
inline constexpr auto kLagUplink = form::whole_text<std::string>(kUnbounded);
inline constexpr std::array kLagMembers{
    form::required_member("name", text_member<&LagMembers::name>(VS_LACP_LAG_NAME_LENGTH - 1),
                          "by which policies call it"),
    form::required_member(
        "uplinks",
        form::list<form::VectorField<&LagMembers::uplinks>>(kLagUplink, VS_MAX_UPLINKS_IN_LAG),
        "uplinks of the switch"),
    form::sparse("rate", form::choice<&LagMembers::is_fast>(kRates),
                 "`fast`: the partner is to tell of itself each second, not each 30"),
};

struct AddressOfEntry {
  using Object = VSMACEntry;
  static Bytes bytes(VSMACEntry const &entry) {
    return copied(std::as_bytes(std::span(entry.macAddress)));
  }
  static void put(VSMACEntry &entry, BytesView bytes) {
    std::memcpy(entry.macAddress, bytes.data(), sizeof entry.macAddress);
  }
};
/// Learned addresses age unless they are said not to, and no others do.
struct TypeOfEntry {
  using Object = VSMACEntry;
  static std::int64_t load(VSMACEntry const &entry) { return entry.macAddrType; }
  static void store(VSMACEntry &entry, std::int64_t type) {
    entry.macAddrType = static_cast<VSMACAddrType>(type);
    entry.aging = type == VS_MAC_ADDR_TYPE_LEARNED ? 1 : 0;
  }
};
inline constexpr std::array<Word, 3> kAddressTypes{{{"static", VS_MAC_ADDR_TYPE_STATIC},
                                                    {"user", VS_MAC_ADDR_TYPE_USER},
                                                    {"learned", VS_MAC_ADDR_TYPE_LEARNED}}};
/// In the order in which they are read: the type before what follows from it.
inline constexpr std::array kAddressMembers{
    form::required_member("mac", form::address<AddressOfEntry>(FormKind::mac), "the address"),
    form::member("vlan", form::number<&VSMACEntry::vid>(0, vlans::kGreatest), "its VLAN"),
    form::member("vni", form::number<&VSMACEntry::vni>(0, QEX_VIRTUAL_NETWORK_ID_MAX),
                 "its virtual network"),
    form::member("type", form::choice<TypeOfEntry>(kAddressTypes), "how it came into the table"),
    form::member("ages", form::boolean<&VSMACEntry::aging>(),
                 "whether it goes when it is not seen"),
    form::member("age", form::number<&VSMACEntry::elapsed>(0, k32Bits),
                 "seconds since it was seen last"),
};
inline VSMACEntry new_address() {
  VSMACEntry entry{};
  TypeOfEntry::store(entry, VS_MAC_ADDR_TYPE_LEARNED);
  return entry;
}

struct AddressOfGroup {
  using Object = McastGroup;
  static Bytes bytes(McastGroup const &group) { return group.address; }
  static void put(McastGroup &group, BytesView bytes) { group.address = copied(bytes); }
};
struct WholeAddress {
  using Object = AddressBytes;
  static Bytes bytes(AddressBytes const &address) { return address; }
  static void put(AddressBytes &address, BytesView bytes) { address = copied(bytes); }
};
inline constexpr std::array<Word, 3> kSourceModes{
    {{"none", VS_MCAST_SRC_IP_FILTER_MODE_NONE},
     {"include", VS_MCAST_SRC_IP_FILTER_MODE_INCLUDE},
     {"exclude", VS_MCAST_SRC_IP_FILTER_MODE_EXCLUDE}}};
inline constexpr auto kSource = form::address<WholeAddress>(FormKind::address);
inline constexpr std::array kGroupMembers{
    form::required_member("address", form::address<AddressOfGroup>(FormKind::address),
                          "the group's"),
    form::member("version", form::number<&McastGroup::version>(0, k32Bits), "of the protocol"),
    form::member("source_mode", form::choice<&McastGroup::source_mode>(kSourceModes),
                 "what its sources are"),
    form::member("sources",
                 form::list<form::VectorField<&McastGroup::sources>>(kSource, kUnbounded),
                 "addresses that send to it"),
    form::member("vni", form::number<&McastGroup::vni>(0, k32Bits), "its virtual network"),
};

/// A fault as documents say it: calls counted from the first, a status by its name.
struct FaultMembers {
  std::string call = {};
  std::int64_t nth = 1;
  std::int64_t times = 1;  ///< 0 for all that follow
  std::string status = {};
  std::string exception = {};
  std::string message = {};
  std::int64_t delay = 0;
};
inline constexpr std::string_view kStatus = "status";
inline constexpr std::array kFaultMembers{
    form::required_member("call", text_member<&FaultMembers::call>(), "a call of the host"),
    form::member("nth", form::number<&FaultMembers::nth>(1, k32Bits),
                 "the first call that is hit, counted from the next one"),
    form::member("times", form::number<&FaultMembers::times>(0, k32Bits),
                 "how many are hit; 0 for all that follow"),
    form::sparse(kStatus, text_member<&FaultMembers::status>(),
                 "the name of the status that they return"),
    form::sparse("exception", text_member<&FaultMembers::exception>(),
                 "what the call trap raises instead"),
    form::sparse("message", text_member<&FaultMembers::message>(), "of the exception"),
    form::sparse("delay", form::seconds<form::NumberField<&FaultMembers::delay>>(),
                 "seconds of real time that they wait first"),
};

}  // namespace simhost::scenario
