#include "planes/openvswitch/openflow/codec/oxm.h"

#include <fmt/format.h>

#include <stdexcept>

#include "planes/openvswitch/openflow/codec/foreign.h"
#include "planes/openvswitch/openflow/codec/numbers.h"

namespace simhost::openflow {
namespace {

// Open vSwitch tells registers in pairs, of which the first is the upper half.
constexpr std::uint16_t kPairClass = 0x8001;
constexpr unsigned kPairs = 8;
constexpr std::size_t kPairBytes = 8;
constexpr std::uint16_t kOxmMatch = 1;
constexpr std::size_t kMatchHeader = 4;

struct OxmHeader {
  FieldId id;
  bool has_mask;
  std::uint8_t length;
};

OxmHeader take_oxm_header(Reader &in) {
  auto const oxm_class = in.u16();
  auto const number = in.u8();
  return {{oxm_class, static_cast<std::uint8_t>(number >> 1U)}, (number & 1U) != 0, in.u8()};
}

void put_header(Writer &out, Field field, bool has_mask, unsigned length) {
  auto const &id = info(field).oxm;
  out.u16(id.oxm_class);
  out.u8(static_cast<std::uint8_t>(id.number << 1U | (has_mask ? 1U : 0U)));
  bool const is_experimenters = id.oxm_class == kExperimenterClass;
  out.u8(static_cast<std::uint8_t>(length + (is_experimenters ? sizeof kOpenVswitch : 0)));
  if (is_experimenters) {
    out.u32(kOpenVswitch);
  }
}

[[noreturn]] void throw_foreign(FieldId id) {
  throw Foreign(fmt::format("field {} of class {:#x}", id.number, id.oxm_class));
}

Field get_field(FieldId id) {
  auto const field = find_field(id);
  if (!field) {
    throw_foreign(id);
  }
  return *field;
}

Masked take_content(Reader &in, std::size_t bytes, bool has_mask, Value whole) {
  auto const value = in.value(bytes);
  if (!has_mask) {
    return {value, whole};
  }
  auto const mask = in.value(bytes);
  return {value & mask, mask & whole};
}

// What follows a header.
Reader take_payload(Reader &in, OxmHeader const &header) {
  Reader payload(in.take(header.length));
  if (header.id.oxm_class == kExperimenterClass && payload.u32() != kOpenVswitch) {
    throw_foreign(header.id);
  }
  return payload;
}

void require_size(Reader const &payload, std::size_t bytes, bool has_mask) {
  if (payload.size() != bytes * (has_mask ? 2U : 1U)) {
    throw Malformed("a field has another length than its kind");
  }
}

void add_pair(Match &match, OxmHeader const &header, Reader &payload) {
  require_size(payload, kPairBytes, header.has_mask);
  auto const [value, mask] = take_content(payload, kPairBytes, header.has_mask, ones(64));
  auto const half = ones(32);
  match.with(reg(2 * header.id.number), value >> 32U, mask >> 32U);
  match.with(reg(2 * header.id.number + 1), value & half, mask & half);
}

Masked checked_content(Field field, OxmHeader const &header, Reader &payload) {
  auto const &[bytes, whole] = std::pair(info(field).bytes, settable_bits(field));
  require_size(payload, bytes, header.has_mask);
  auto const content = take_content(payload, bytes, header.has_mask, whole);
  bool const fits = (content.value & ~whole) == 0;
  if (!fits || (content.mask != whole && !info(field).is_maskable)) {
    throw Foreign(fmt::format("a content that {} cannot have", info(field).name));
  }
  return content;
}

void take_next(Reader &fields, Match &match) {
  auto const header = take_oxm_header(fields);
  auto payload = take_payload(fields, header);
  if (header.id.oxm_class == kPairClass && header.id.number < kPairs) {
    add_pair(match, header, payload);
    return;
  }
  auto const field = get_field(header.id);
  auto const content = checked_content(field, header, payload);
  match.with(field, content.value, content.mask);
}

}  // namespace

void put_field_number(Writer &out, Field field) {
  auto const &id = info(field).oxm;
  if (id.oxm_class == kExperimenterClass) {
    throw std::invalid_argument(std::string(info(field).name) + " is only set as a whole");
  }
  put_header(out, field, false, info(field).bytes);
}

void put_field(Writer &out, Field field, Masked const &content) {
  unsigned const bytes = info(field).bytes;
  bool const has_mask = content.mask != settable_bits(field);
  put_header(out, field, has_mask, bytes * (has_mask ? 2 : 1));
  out.value(content.value, bytes);
  if (has_mask) {
    out.value(content.mask, bytes);
  }
}

void put_hashed_field(Writer &out, Field field, Value mask) {
  put_header(out, field, false, info(field).bytes);
  // All of a field is all of its bytes.
  out.value(mask == settable_bits(field) ? ~Value{0} : mask, info(field).bytes);
}

void put_match(Writer &out, Match const &match) {
  auto const start = out.size();
  out.u16(kOxmMatch);
  out.u16(0);
  for (auto const &[field, content] : match.fields()) {
    put_field(out, field, content);
  }
  out.put_length(start + 2, start);
  out.pad(start);
}

Field take_field_number(Reader &in) {
  auto const header = take_oxm_header(in);
  auto const field = get_field(header.id);
  if (header.has_mask || header.length != info(field).bytes) {
    throw Malformed("a field has another length than its kind");
  }
  return field;
}

FieldContent take_field(Reader &in, bool is_mask) {
  auto const header = take_oxm_header(in);
  auto payload = take_payload(in, header);
  auto const field = get_field(header.id);
  if (is_mask) {
    require_size(payload, info(field).bytes, header.has_mask);
    return {field, {0, payload.value(info(field).bytes) & settable_bits(field)}};
  }
  return {field, checked_content(field, header, payload)};
}

Match take_match(Reader &in, Unknown unknown) {
  Reader fields = take_item(in, 2, kMatchHeader, 8);
  if (fields.u16() != kOxmMatch) {
    throw Malformed("a match is of another kind than OXM");
  }
  fields.skip(2);
  Match match;
  while (!fields.empty()) {
    try {
      take_next(fields, match);
    } catch (Foreign const &) {
      if (unknown == Unknown::refused) {
        throw;
      }
    }
  }
  return match;
}

}  // namespace simhost::openflow
