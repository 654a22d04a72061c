// The contents of fields as text.
#pragma once

#include <string>

#include "planes/openvswitch/openflow/field.h"
#include "planes/openvswitch/openflow/match.h"
#include "planes/openvswitch/openflow/port.h"

namespace simhost::openflow {

/// "7", "LOCAL"
std::string port_text(Port port);
/// "0" or "0x5"
std::string hexadecimal(Value value);
/// In the form of the field: "5", "0x5", "00:00:00:00:00:01", "10.0.0.1", "fe80::1"
std::string content_text(Field field, Value value);
/// What follows in a list for a hash or a SetField: "5/0xff", "10.0.0.0/8"
std::string masked_text(Field field, Masked const &content);
/// "NXM_NX_REG0[0..15]"
std::string part_text(SubField const &part);

}  // namespace simhost::openflow
