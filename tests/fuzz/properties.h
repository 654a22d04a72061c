// Properties as callers may set them: keys with a meaning or without, bytes that are nearly right.
#ifndef TESTS_FUZZ_PROPERTIES_H
#define TESTS_FUZZ_PROPERTIES_H

#include <array>
#include <string>

#include "base/bytes.h"
#include "model/properties/registry.h"
#include "scenario/document.h"
#include "tests/fuzz/harness.h"
#include "vswitch/mac_learning.h"
#include "vswitch/mac_tables.h"
#include "vswitch/mirror.h"
#include "vswitch/port_mac_policies.h"
#include "vswitch/port_policies.h"
#include "vswitch/private_vlans.h"
#include "vswitch/teaming.h"
#include "vswitch/uplinks.h"

inline std::string consume_key(Input &input) {
  auto const known = simhost::descriptors();
  auto const index = input.ConsumeIntegralInRange<std::size_t>(0, known.size());
  return index < known.size() ? std::string(known[index]->key) : consume_text(input, 260);
}

template <typename Record>
simhost::Bytes consume_record_bytes(Input &input) {
  return simhost::copied(simhost::bytes_of(consume_record<Record>(input)));
}

inline simhost::Bytes consume_any_bytes(Input &input) {
  auto const bytes = input.ConsumeRandomLengthString(200);
  return simhost::copied(std::as_bytes(std::span(bytes)));
}

inline simhost::Bytes consume_text_bytes(Input &input) {
  return simhost::bytes_of_text(consume_text(input, 90));
}

inline void append(simhost::Bytes &all, simhost::Bytes const &more) {
  all.insert(all.end(), more.begin(), more.end());
}

/// A record that counts the ones after it.
template <typename Record, typename Entry, typename Count>
simhost::Bytes consume_counted(Input &input, Count Record::*count) {
  auto record = consume_record<Record>(input);
  auto const entries = input.ConsumeIntegralInRange<Count>(0, 4);
  record.*count = entries;
  auto bytes = simhost::copied(simhost::bytes_of(record));
  for (Count index = 0; index < entries; ++index) {
    append(bytes, consume_record_bytes<Entry>(input));
  }
  return bytes;
}

using UplinkName = std::array<char, QEX_NEB_NAME_MAX_LEN>;
using UplinkId = std::array<char, QEX_NEB_PORT_ID_MAX_LEN>;

/// A table whose counts are right, with sessions and entities of any content.
inline simhost::Bytes consume_mirror_table(Input &input) {
  DVMirrorSessionTable header{};
  header.magicNum = VS_DVMIRROR_MAGIC_NUM;
  header.version = VS_DVMIRROR_VERSION_V3;
  header.numSessions = input.ConsumeIntegralInRange<qex_uint32>(0, 3);
  header.numEntities = input.ConsumeIntegralInRange<qex_uint32>(0, 3);
  auto bytes = simhost::copied(simhost::bytes_of(header));
  for (qex_uint32 index = 0; index < header.numSessions; ++index) {
    append(bytes, consume_record_bytes<DVMirrorSession>(input));
  }
  for (qex_uint32 index = 0; index < header.numEntities; ++index) {
    append(bytes, consume_record_bytes<DVMirrorEntity>(input));
  }
  return bytes;
}

/// A value as documents say one of the form: within its bounds and of its words, mostly.
inline simhost::scenario::Json consume_said(Input &input, simhost::Form const &form) {
  using simhost::FormKind;
  using simhost::scenario::Json;
  switch (form.kind) {
    case FormKind::none:
      return nullptr;
    case FormKind::number:
      return input.ConsumeIntegralInRange<std::int64_t>(form.least - 1, form.greatest + 1);
    case FormKind::seconds:
      return input.ConsumeIntegralInRange<std::int64_t>(-1, 4'000'000) / 1000.0;
    case FormKind::boolean:
      return input.ConsumeBool();
    case FormKind::choice:
      return form.words[input.ConsumeIntegralInRange<std::size_t>(0, form.words.size() - 1)].text;
    case FormKind::bits: {
      auto words = Json::array();
      for (auto const &word : form.words) {
        if (input.ConsumeBool()) {
          words.push_back(word.text);
        }
      }
      return words;
    }
    case FormKind::text:
      return consume_text(input, form.most + 1);
    case FormKind::range: {
      auto const first = input.ConsumeIntegralInRange<std::int64_t>(form.least, form.greatest);
      auto const last = input.ConsumeIntegralInRange<std::int64_t>(form.least, form.greatest);
      return input.ConsumeBool() ? Json(first)
                                 : Json(std::to_string(first) + "-" + std::to_string(last));
    }
    case FormKind::address:
    case FormKind::mac:
      return input.ConsumeBool() ? "01:00:5e:00:00:01" : "02:00:00:00:00:01";
    case FormKind::ip:
      return input.ConsumeBool() ? "192.0.2.1" : "fe80::1";
    case FormKind::record: {
      auto said = Json::object();
      for (auto const &member : form.members) {
        if (member.presence == simhost::Presence::required || input.ConsumeBool()) {
          said[std::string(member.name)] = consume_said(input, member.form);
        }
      }
      return said;
    }
    case FormKind::one_of: {
      auto const index = input.ConsumeIntegralInRange<std::size_t>(0, form.members.size() - 1);
      auto const &member = form.members[index];
      return {{std::string(member.name), consume_said(input, member.form)}};
    }
    case FormKind::list: {
      auto list = Json::array();
      for (auto left = input.ConsumeIntegralInRange(0, 3); left > 0; --left) {
        list.push_back(consume_said(input, *form.element));
      }
      return list;
    }
  }
  return nullptr;
}

/// Bytes of one of the forms that properties have.
inline simhost::Bytes consume_value(Input &input) {
  static constexpr std::array kForms{
      consume_any_bytes,
      consume_text_bytes,
      consume_mirror_table,
      consume_record_bytes<qex_uint8>,
      consume_record_bytes<qex_uint16>,
      consume_record_bytes<qex_uint32>,
      consume_record_bytes<VSTeamPolicy>,
      consume_record_bytes<VSMACLearning>,
      consume_record_bytes<VSPropSecurity>,
      consume_record_bytes<VSExtraEthFilter>,
      consume_record_bytes<VSPMACManagement>,
      consume_record_bytes<VSPMACLearningStats>,
      consume_record_bytes<VSPvlanMapEntry>,
      consume_record_bytes<std::array<VSPvlanMapEntry, 2>>,
  };
  constexpr auto kCounted = kForms.size() + 3;
  switch (auto const form = input.ConsumeIntegralInRange<std::size_t>(0, kCounted - 1)) {
    case kForms.size():
      return consume_counted<VSPortVlanPolicy, qex_NEBPortVIDRange>(input,
                                                                    &VSPortVlanPolicy::numRanges);
    case kForms.size() + 1:
      return consume_counted<VSUplinkPorts, UplinkName>(input, &VSUplinkPorts::nUplinkPorts);
    case kForms.size() + 2:
      return consume_counted<VSUplinkPortIds, UplinkId>(input, &VSUplinkPortIds::nUplinkPorts);
    default:
      return kForms[form](input);
  }
}

#endif
