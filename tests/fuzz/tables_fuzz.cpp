// Records with a count and trailing entries, as the host allocates them, through every method that
// reaches an entry by its index.
//
// Not tried, because nothing checks it: counts that say more than there is, indexes out of range
// where no check is promised, negative indexes of a team policy.

#include <array>
#include <string>

#include "helpers/policies.h"
#include "helpers/tables.h"
#include "helpers/uplinks.h"
#include "tests/fuzz/python.h"

namespace {

constexpr std::size_t kMostEntries = 6;

/// A record and its entries in a block of exactly their size, all of it from the input.
template <typename Record>
Block consume_table(Input &input, std::size_t count, std::size_t entry_size) {
  auto block = Block(sizeof(Record) + count * entry_size);
  input.ConsumeData(block.chars(), block.size());
  return block;
}

std::string slot(char const *text, std::size_t size) {
  return {text, strnlen(text, size)};
}

/// Texts by index: those of indexes below the count, and no others, are there.
template <typename Record>
struct TextTable {
  qex_uint32 Record::*count;
  std::size_t entry_size;
  std::size_t text_size;
  char const *(*at)(Record *, int);
  void (*set)(Record *, int, char const *);

  void fuzz(Input &input) const {
    auto const entries = input.ConsumeIntegralInRange<std::size_t>(0, kMostEntries);
    auto const block = consume_table<Record>(input, entries, entry_size);
    auto *const record = block.template as<Record>();
    record->*count = static_cast<qex_uint32>(entries);
    while (input.remaining_bytes() > 0) {
      auto const index = consume_index(input, static_cast<int>(entries));
      auto const before = block.text();
      auto const text = consume_text(input, text_size + 2);
      bool const is_there = 0 <= index && index < static_cast<int>(entries);
      set(record, index, text.c_str());
      require((at(record, index) != nullptr) == is_there, "an index below the count has an entry");
      require(is_there || block.text() == before, "no other entry changes anything");
      require(!is_there || slot(at(record, index), text_size) == text.substr(0, text_size),
              "an entry is its text, cut at its size");
    }
  }
};

constexpr TextTable<VSUplinks> kUplinks{&VSUplinks::numEntries, sizeof(VSUplinks_entries),
                                        sizeof(qex_Name), uplinks_name_at, uplinks_set_name_at};
constexpr TextTable<VSUplinkPorts> kPorts{&VSUplinkPorts::nUplinkPorts, QEX_NEB_NAME_MAX_LEN,
                                          QEX_NEB_NAME_MAX_LEN, uplink_ports_name_at,
                                          uplink_ports_set_name_at};
constexpr TextTable<VSUplinkPortIds> kPortIds{&VSUplinkPortIds::nUplinkPorts,
                                              QEX_NEB_PORT_ID_MAX_LEN, QEX_NEB_PORT_ID_MAX_LEN,
                                              uplink_port_ids_id_at, uplink_port_ids_set_id_at};

/// Sized constructors: room for all entries, of which any may be filled.
void sized_records(Input &input) {
  auto const count = input.ConsumeIntegralInRange(-1, 40);
  auto const text = consume_text(input, 100);
  Made<VSUplinkPorts> const ports(uplink_ports_new(count));
  Made<VSUplinkPortIds> const ids(uplink_port_ids_new(count));
  require((ports == nullptr) == (count < 0) && (ids == nullptr) == (count < 0),
          "a negative count has no memory");
  for (int index = 0; index < count; ++index) {
    uplink_ports_set_name_at(ports.get(), index, text.c_str());
    uplink_port_ids_set_id_at(ids.get(), index, text.c_str());
  }
}

void team_policy(Input &input) {
  auto const block = consume_table<VSTeamPolicy>(input, 0, 0);
  auto *const policy = block.as<VSTeamPolicy>();
  auto const index = std::max(0, consume_index(input, QEX_TEAM_MAX_UPLINKS));
  auto const before = block.text();
  auto const name = consume_text(input, QEX_NEB_NAME_MAX_LEN + 2);
  team_policy_set_name_at(policy, index, name.c_str());
  auto const *const found = team_policy_name_at(policy, index);
  require((found != nullptr) == (index < QEX_TEAM_MAX_UPLINKS), "there are 32 slots");
  require(found != nullptr || block.text() == before, "no other slot changes anything");
  require(
      found == nullptr || slot(found, QEX_NEB_NAME_MAX_LEN) == name.substr(0, QEX_NEB_NAME_MAX_LEN),
      "a slot is its name, cut at its size");
}

void mirror_session_ids(Input &input) {
  auto const count = input.ConsumeIntegralInRange<std::size_t>(0, kMostEntries);
  auto const block = consume_table<VSDVMirrorSessionIDs>(input, count, sizeof(DVMirrorSID));
  auto *const ids = block.as<VSDVMirrorSessionIDs>();
  ids->numEntries = static_cast<qex_uint32>(count);
  auto const index = consume_index(input, static_cast<int>(count));
  Object const id(mirror_session_ids_at(ids, index));
  require((id != nullptr) == (0 <= index && index < static_cast<int>(count)),
          "an index below the count has an identifier");
  require(id == nullptr || std::memcmp(PyBytes_AsString(id.get()), ids->entries[index],
                                       sizeof(DVMirrorSID)) == 0,
          "an identifier is its 32 bytes");
}

void promiscuous_destinations(Input &input) {
  auto const count = input.ConsumeIntegralInRange<std::size_t>(0, kMostEntries);
  auto const block =
      consume_table<VSPromiscSessionActiveDsts>(input, count, sizeof(qex_SwitchPortID));
  auto *const table = block.as<VSPromiscSessionActiveDsts>();
  table->numEntries = static_cast<qex_uint32>(count);
  auto const index = consume_index(input, static_cast<int>(count));
  auto const before = block.text();
  auto const port = input.ConsumeIntegral<qex_SwitchPortID>();
  promisc_set_destination_at(table, index, &port);
  auto const *const found = promisc_destination_at(table, index);
  require((found != nullptr) == (0 <= index && index < static_cast<int>(count)),
          "an index below the count has a destination");
  require(found != nullptr ? std::memcmp(found, &port, sizeof port) == 0 : block.text() == before,
          "a destination is the port that was set");
}

/// Entries that are not checked: each one that is there.
template <typename Record>
void texts_of_all(Input &input, std::size_t entry_size, PyObject *(*at)(Record *, int)) {
  auto const count = input.ConsumeIntegralInRange<std::size_t>(0, kMostEntries);
  auto const block = consume_table<Record>(input, count, entry_size);
  for (std::size_t index = 0; index < count; ++index) {
    require(!text_of(at(block.template as<Record>(), static_cast<int>(index))).empty(),
            "an address has a text");
  }
}

void multicast_filters(Input &input) {
  texts_of_all<VSMcastFilters>(input, 6, mcast_filters_mac_at);
  texts_of_all<VSMcastFilters>(input, 4, mcast_filters_ipv4_at);
  texts_of_all<VSMcastFilters>(input, 16, mcast_filters_ipv6_at);
  texts_of_all<VSMcastFilterStats>(input, 4, mcast_filter_stats_ipv4_at);
  texts_of_all<VSMcastFilterStats>(input, 16, mcast_filter_stats_ipv6_at);
}

template <typename Entry, typename First>
void copies_of_all(Input &input, std::size_t in_front, Entry (*at)(First *, int)) {
  auto const count = input.ConsumeIntegralInRange<std::size_t>(0, kMostEntries);
  Block const block(in_front + count * sizeof(Entry));
  input.ConsumeData(block.chars(), block.size());
  for (std::size_t index = 0; index < count; ++index) {
    auto const copy = at(block.template as<First>(), static_cast<int>(index));
    require(std::memcmp(&copy, block.chars() + in_front + index * sizeof copy, sizeof copy) == 0,
            "a copy is the entry");
  }
}

void copied_entries(Input &input) {
  copies_of_all(input, 0, pvlan_entry_at);
  copies_of_all(input, sizeof(VSPortVlanPolicy), vlan_policy_range_at);
  copies_of_all(input, 0, mac_entry_at);
  Block const entry(sizeof(VSMACEntry));
  auto const address = input.ConsumeBytes<unsigned char>(6);
  if (address.size() == 6) {
    mac_entry_set_address(entry.as<VSMACEntry>(), Block::of(address).as<unsigned char>());
    text_of(mac_text(entry.as<unsigned char>()));
  }
}

constexpr std::array<void (*)(Input &), 9> kParts{
    [](Input &input) { kUplinks.fuzz(input); },
    [](Input &input) { kPorts.fuzz(input); },
    [](Input &input) { kPortIds.fuzz(input); },
    sized_records,
    team_policy,
    mirror_session_ids,
    promiscuous_destinations,
    multicast_filters,
    copied_entries,
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  Input input(data, size);
  kParts[input.ConsumeIntegralInRange<std::size_t>(0, kParts.size() - 1)](input);
  return 0;
}
