// Fields on the wire.
#pragma once

#include "planes/openvswitch/openflow/codec/wire.h"
#include "planes/openvswitch/openflow/field.h"
#include "planes/openvswitch/openflow/match.h"

namespace simhost::openflow {

/// Its number alone, where a part of it is meant. Throws std::invalid_argument for a field of an
/// experimenter, whose number has no room there.
void put_field_number(Writer &out, Field field);
/// Its number and its content, and the mask unless that is whole.
void put_field(Writer &out, Field field, Masked const &content);
/// Its number, and a mask in the place of the content.
void put_hashed_field(Writer &out, Field field, Value mask);
/// With its header, padded.
void put_match(Writer &out, Match const &match);

// These throw Malformed, and Foreign for what is not in the table of fields.

Field take_field_number(Reader &in);
struct FieldContent {
  Field field;
  Masked content;
};
/// `is_mask` says that the content is one.
FieldContent take_field(Reader &in, bool is_mask = false);

enum class Unknown : bool { refused, left_out };

/// With its header and its padding, all of which are taken even if Foreign is thrown.
Match take_match(Reader &in, Unknown unknown = Unknown::refused);

}  // namespace simhost::openflow
