// Values of a trace read back: whatever was written comes out the same, and what does not fit the
// tables is refused, with its place.

#include "recordings/core/decoded.h"

#include <gtest/gtest.h>
#include <sys/mman.h>

#include <algorithm>
#include <cstring>
#include <random>
#include <string>
#include <vector>

#include "recordings/core/values.h"

namespace recordings {
namespace {

constexpr std::int64_t forms[] = {no_form, 0, 2, 3};

Record const &record_named(std::string_view name) {
  auto const found = std::ranges::find(records, name, [](auto *one) { return one->name; });
  EXPECT_NE(found, records.end()) << name;
  return **found;
}

Call const &call_named(std::string_view name) {
  auto const found = std::ranges::find(calls, name, &Call::name);
  EXPECT_NE(found, calls.end()) << name;
  return *found;
}

std::string encoded(Record const &record, void const *at, std::int64_t form) {
  Line line;
  write_record(line, record, reinterpret_cast<std::uint64_t>(at), form);
  return std::string(line.text());
}

/// Memory that ends where it ends, with lengths in it that are often short enough to be followed.
class MadeUp {
 public:
  MadeUp()
      : all_(static_cast<char *>(mmap(nullptr, size + page, PROT_READ | PROT_WRITE,
                                      MAP_PRIVATE | MAP_ANONYMOUS, -1, 0))) {
    mprotect(all_ + size, page, PROT_NONE);
  }
  MadeUp(MadeUp const &) = delete;
  MadeUp &operator=(MadeUp const &) = delete;
  ~MadeUp() { munmap(all_, size + page); }

  [[nodiscard]] char const *filled(std::mt19937_64 &chance) {
    for (std::size_t at = 0; at < size; at += sizeof(std::uint32_t)) {
      auto const kind = chance() % 4;
      auto const word = static_cast<std::uint32_t>(kind == 0   ? chance()
                                                   : kind == 1 ? chance() % 4
                                                               : 0);
      std::memcpy(all_ + at, &word, sizeof word);
    }
    return all_;
  }

 private:
  static constexpr std::size_t page = 4096;
  static constexpr std::size_t size = 4 * page;

  char *all_;
};

TEST(Decoded, EveryRecordComesOutAsItWasWritten) {
  std::mt19937_64 chance(16);
  std::vector<int> read(records.size());
  MadeUp memory;
  for (int round = 0; round < 60; ++round) {
    auto const *const held = memory.filled(chance);
    for (std::size_t number = 0; number < records.size(); ++number) {
      Record const &record = *records[number];
      for (auto const form : forms) {
        auto const written = encoded(record, held, form);
        if (written.find("unread") != std::string::npos || record.packed_size >= 0) {
          continue;
        }
        auto const bytes = decode_record(record, Json::parse(written), form);
        ASSERT_EQ(encoded(record, bytes.data(), form), written) << record.name;
        ASSERT_GE(bytes.size(), record.size);
        ++read[number];
      }
    }
  }
  for (std::size_t number = 0; number < records.size(); ++number) {
    EXPECT_TRUE(read[number] > 20 || records[number]->packed_size >= 0) << records[number]->name;
  }
}

TEST(Decoded, APackedListComesOutAsItWasWritten) {
  std::mt19937_64 chance(17);
  Record const &record = record_named("VSRuntimeOptions");
  for (int round = 0; round < 1000; ++round) {
    Json list = Json::array();
    std::size_t whole = record.size;
    for (auto count = chance() % 5; count > 0; --count) {
      auto const size = chance() % 9;
      std::string digits;
      for (std::size_t at = 0; at < 2 * size; ++at) {
        digits += "0123456789abcdef"[chance() % 16];
      }
      list.push_back({{"type", chance() % 65536},
                      {"length", size + record.followed_by->size},
                      {"data", digits}});
      whole += size + record.followed_by->size;
    }
    Json const given{{"totalLength", whole}, {"VSRuntimeOptionHeader", list}};
    auto const bytes = decode_record(record, given, no_form);
    EXPECT_EQ(bytes.size(), whole);
    EXPECT_EQ(Json::parse(encoded(record, bytes.data(), no_form)), given);
  }
}

struct Refused {
  char const *name;  ///< of the record, or of the call
  char const *given;
  char const *said;
};

template <typename Decode>
void expect_refused(char const *given, char const *said, Decode decode) {
  try {
    decode(Json::parse(given));
    ADD_FAILURE() << "nobody refused " << given;
  } catch (Misfit const &misfit) {
    EXPECT_STREQ(misfit.what(), said);
  }
}

TEST(Decoded, WhatDoesNotFitARecordIsRefused) {
  std::vector<Refused> const all{
      {"qex_NEBPortVIDRange", R"(7)", "qex_NEBPortVIDRange: is no object: 7"},
      {"qex_NEBPortVIDRange", R"({"minVID": 1})", "qex_NEBPortVIDRange: lacks maxVID"},
      {"qex_NEBPortVIDRange", R"({"minVID": 1, "maxVID": 2, "x": 3})",
       R"(qex_NEBPortVIDRange: there is no "x")"},
      {"qex_NEBPortVIDRange", R"({"minVID": 65536, "maxVID": 2})",
       "qex_NEBPortVIDRange.minVID: 65536 is not from 0 to 65535"},
      {"qex_NEBPortVIDRange", R"({"minVID": -1, "maxVID": 2})",
       "qex_NEBPortVIDRange.minVID: -1 is not from 0 to 65535"},
      {"qex_NEBPortVIDRange", R"({"minVID": 1.0, "maxVID": 2})",
       "qex_NEBPortVIDRange.minVID: is no whole number: 1.0"},
      {"qex_NEBPortVIDRange", R"({"minVID": true, "maxVID": 2})",
       "qex_NEBPortVIDRange.minVID: is no whole number: true"},
      {"qex_NEBPortVIDRange", R"({"unread": "no memory of the process is there"})",
       "qex_NEBPortVIDRange: was not recorded: no memory of the process is there"},
      {"VSPMACLearning", R"({"learning": 128, "flooding": 0, "macLimit": 0, "macLimitPolicy": 0})",
       "VSPMACLearning.learning: 128 is not from -128 to 127"},
      {"VSMACLearning", R"({"agingTime": 0, "learnStatic": 2, "reserved": 0, "macLimit": 0})",
       "VSMACLearning.learnStatic: 2 does not fit into its bits"},
      {"qex_Name", R"({"string": "0123456789012345678901234567890123"})",
       "qex_Name.string: has 34 bytes, and there is room for 32"},
      {"qex_Name", R"({"string": 7})", "qex_Name.string: is no object: 7"},
      {"qex_Name", R"({"string": "a\u0000b"})", "qex_Name.string: is a text with a NUL in it"},
      {"qex_Name", R"({"string": {"hex": "abc"}})",
       "qex_Name.string.hex: has an odd number of digits"},
      {"qex_Name", R"({"string": {"hex": "0G"}})",
       "qex_Name.string.hex: has a character that is no hexadecimal digit"},
      {"qex_Name", R"({"string": {"hex": 5}})", "qex_Name.string.hex: is no text of digits: 5"},
      {"VSUplinkPorts", R"({"nUplinkPorts": 2, "uplinkPortName": ["a"]})",
       "VSUplinkPorts.uplinkPortName: has 1 elements, and not 2"},
      {"VSUplinkPorts", R"({"nUplinkPorts": 4294967295, "uplinkPortName": []})",
       "VSUplinkPorts.uplinkPortName: has 0 elements, and not 4294967295"},
      {"VSUplinkPorts", R"({"nUplinkPorts": 1, "uplinkPortName": "a"})",
       R"(VSUplinkPorts.uplinkPortName: is no list: "a")"},
      {"VSUplinkPorts", R"({"nUplinkPorts": 2, "uplinkPortName": ["a", null]})",
       "VSUplinkPorts.uplinkPortName[1]: is no object: null"},
      {"DVMirrorEntity", R"({"type": 0, "dvPortId": "x", "vlan": 7})",
       R"(DVMirrorEntity: there is no "vlan")"},
      {"VSMACEntry",
       R"({"macAddress": "0200", "macAddrType": 0, "aging": 0, "vid": 0, "vni": 0, "elapsed": 0})",
       "VSMACEntry.macAddress: has 2 bytes, and not 6"},
      {"VSLAGTable", R"({"numLAGs": 1, "VSLAGStatus": []})",
       "VSLAGTable.VSLAGStatus: has 0 elements, and not 1"},
      {"VSRuntimeOptions", R"({"totalLength": 4, "VSRuntimeOptionHeader": 4})",
       "VSRuntimeOptions.VSRuntimeOptionHeader: is no list: 4"},
      {"VSRuntimeOptions",
       R"({"totalLength": 8, "VSRuntimeOptionHeader": [{"type": 1, "length": 0, "data": ""}]})",
       "VSRuntimeOptions.VSRuntimeOptionHeader[0]: is longer than the 0 bytes that it says"},
      {"VSRuntimeOptions",
       R"({"totalLength": 9, "VSRuntimeOptionHeader": [{"type": 1, "length": 4, "data": ""}]})",
       "VSRuntimeOptions.VSRuntimeOptionHeader: ends after 8 bytes, and not 9"},
      {"VSRuntimeOptions",
       R"({"totalLength": 9, "VSRuntimeOptionHeader": [{"type": 1, "length": 5, "data": ""}]})",
       "VSRuntimeOptions.VSRuntimeOptionHeader[0].data: has 0 bytes, and not 1"},
  };
  for (Refused const &one : all) {
    expect_refused(one.given, one.said, [&](Json const &given) {
      decode_record(record_named(one.name), given, no_form);
    });
  }
}

TEST(Decoded, InputsAreWhatTheCallerGave) {
  auto const given =
      decode_inputs(call_named("VSQEX_GetMcastFilterStats"),
                    Json::parse(R"({"switchName": "lab", "port": 4294967295, "mode": 2,
                      "group": {"bytes": "ef010203"}, "stats": null})"));
  EXPECT_EQ(std::string(given[0].bytes.data()), "lab");
  EXPECT_EQ(given[1].word, 4294967295U);
  EXPECT_EQ(given[3].bytes.size(), 4U);
  EXPECT_TRUE(given[4].is_null);
  auto const negative =
      decode_inputs(call_named("VSDVS_SetPrivateVLANMap"),
                    Json::parse(R"({"switchName": null, "entries": null, "count": -1})"));
  EXPECT_TRUE(negative[0].is_null && negative[1].is_null);
  EXPECT_EQ(static_cast<std::int64_t>(negative[2].word), -1);
}

TEST(Decoded, WhatDoesNotFitTheInputsIsRefused) {
  std::vector<Refused> const all{
      {"VSDVS_SetMTU", R"([])", "in: is no object: []"},
      {"VSDVS_SetMTU", R"({"switchName": "lab"})", "in: lacks mtu"},
      {"VSQEX_GetRuntimeOptions", R"({"ids": {"unread": "it is longer"}, "count": 3})",
       "in.ids: was not recorded: it is longer"},
      {"VSDVS_SetMTU", R"({"switchName": "lab", "mtu": 1, "x": 1})", R"(in: there is no "x")"},
      {"VSDVS_SetMTU", R"({"switchName": {"begins": "lab", "unread": "it is longer"}, "mtu": 1})",
       "in.switchName: was not recorded: it is longer"},
      {"VSDVS_SetMTU", R"({"switchName": {"hex": "6100"}, "mtu": 1})",
       "in.switchName: is a text with a NUL in it"},
      {"VSDVS_GetMTU", R"({"switchName": "lab", "mtu": 1500})", "in: mtu is an output, and given"},
      {"DVS_PortId", R"({"handle": 7})", "in.handle: is no object: 7"},
      {"DVS_PortId", R"({"handle": {"at": -1}})",
       "in.handle.at: -1 is not from 0 to 18446744073709551615"},
      {"VSQEX_GetRuntimeOptions", R"({"ids": [1, 2], "count": 3})",
       "in.ids: has 2 elements, and not 3"},
      {"VSQEX_GetRuntimeOptions", R"({"ids": [70000], "count": 1})",
       "in.ids[0]: 70000 is not from 0 to 65535"},
      {"VSDVS_SetPrivateVLANMap", R"({"switchName": "lab", "entries": [], "count": -1})",
       "in.entries: has a length that is negative: -1"},
      {"VSQEX_GetMcastFilterStats",
       R"({"switchName": "lab", "port": 1, "mode": 3, "group": {"bytes": "ef010203"}})",
       "in.group.bytes: has 4 bytes, and not 16"},
  };
  for (Refused const &one : all) {
    expect_refused(one.given, one.said,
                   [&](Json const &given) { decode_inputs(call_named(one.name), given); });
  }
}

TEST(Decoded, OutputsAreWhatTheCallLeft) {
  auto const left = decode_outputs(
      call_named("DVSQEX_GlobalPropGet"), Json::parse(R"({"switchId": "a", "key": "b"})"),
      Json::parse(R"({"data": {"at": 7, "bytes": "28230000"}, "length": 4})"), Json());
  EXPECT_EQ(left[2].word, 7U);
  EXPECT_EQ(left[2].bytes.size(), 4U);
  EXPECT_EQ(left[3].bytes.size(), 4U);
  auto const no_place =
      decode_outputs(call_named("DVSQEX_GlobalPropGet"),
                     Json::parse(R"({"switchId": "a", "key": "b", "length": null})"),
                     Json::parse(R"({"data": {"at": 7, "bytes": ""}})"), Json());
  EXPECT_TRUE(no_place[3].is_null);
  auto const counted =
      decode_outputs(call_named("DVSData_Data"), Json::parse(R"({"item": null})"),
                     Json::parse(R"({"data": {"at": 1, "bytes": "0a0b"}})"), Json::parse("2"));
  EXPECT_EQ(counted[1].bytes, (Bytes{'\x0a', '\x0b'}));
}

TEST(Decoded, WhatDoesNotFitTheOutputsIsRefused) {
  Call const &call = call_named("DVSQEX_GlobalPropGet");
  auto const in = Json::parse(R"({"switchId": "a", "key": "b"})");
  std::vector<std::pair<char const *, char const *>> const all{
      {R"({"data": {"at": 7, "bytes": "2823"}, "length": 4})",
       "out.data.bytes: has 2 bytes, and not 4"},
      {R"({"data": {"at": 7, "bytes": "2823"}})", "out: lacks length"},
      {R"({"data": {"at": 7}, "length": 4})", "out.data: lacks bytes"},
      {R"({"data": {"at": 7, "unread": "it is longer"}, "length": 4})",
       "out.data: was not recorded: it is longer"},
      {R"({"data": null, "length": 4294967296})",
       "out.length: 4294967296 is not from -2147483648 to 2147483647"},
      {R"({"data": null, "length": 4, "switchId": "a"})", R"(out: there is no "switchId")"},
  };
  for (auto const &[given, said] : all) {
    expect_refused(given, said, [&](Json const &out) { decode_outputs(call, in, out, Json()); });
  }
}

TEST(Decoded, ResultsAreWhatTheCallReturned) {
  auto const text = decode_result(call_named("DVS_SwitchId"), Json("lab-1"));
  EXPECT_EQ(std::string(text.bytes.data()), "lab-1");
  EXPECT_TRUE(decode_result(call_named("DVS_SwitchId"), Json()).is_null);
  EXPECT_EQ(decode_result(call_named("DVS_PortId"), Json("7")).bytes.size(), 2U);
  EXPECT_THROW(decode_result(call_named("DVS_SwitchId"), Json(7)), Misfit);
}

}  // namespace
}  // namespace recordings
