#include "planes/openvswitch/openflow/action.h"

#include <stdexcept>
#include <string>

namespace simhost::openflow {
namespace {

SetField set_bits(Field field, Value value, Value mask) {
  if ((value & ~mask) != 0) {
    throw std::invalid_argument(std::string(info(field).name) + " has no such bits");
  }
  return {field, value, mask};
}

}  // namespace

SetField set(Field field, Value value) {
  return set_bits(field, value, settable_bits(field));
}

SetField load(SubField destination, Value value) {
  if ((value & ~ones(destination.bits)) != 0) {
    throw std::invalid_argument(std::string(info(destination.field).name) + " has no such bits");
  }
  auto const mask = ones(destination.bits) << destination.first;
  return set_bits(destination.field, value << destination.first, mask);
}

bool operator==(Clone const &one, Clone const &other) {
  return one.actions == other.actions;
}

std::strong_ordering operator<=>(Clone const &one, Clone const &other) {
  return one.actions <=> other.actions;
}

}  // namespace simhost::openflow
