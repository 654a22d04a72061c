#include "planes/openvswitch/openflow/match.h"

#include <stdexcept>
#include <string>

namespace simhost::openflow {

Match &Match::with(Field field, Value value) {
  return with(field, value, settable_bits(field));
}

Match &Match::with(Field field, Value value, Value mask) {
  auto const all = settable_bits(field);
  if (((value | mask) & ~all) != 0) {
    throw std::invalid_argument(std::string(info(field).name) + " has no such bits");
  }
  if (mask == 0) {
    fields_.erase(field);
    return *this;
  }
  if (mask != all && !info(field).is_maskable) {
    throw std::invalid_argument(std::string(info(field).name) + " matches only as a whole");
  }
  fields_[field] = {value & mask, mask};
  return *this;
}

}  // namespace simhost::openflow
