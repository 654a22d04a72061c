#include "planes/openvswitch/openflow/match.h"

#include <algorithm>
#include <stdexcept>
#include <string>

namespace simhost::openflow {
namespace {

// As many as most matches have.
constexpr std::size_t kUsual = 2;

}  // namespace

MaskedFields::const_iterator MaskedFields::find(Field field) const {
  return std::ranges::find(all_, field, &value_type::first);
}

void MaskedFields::put(Field field, Masked const &content) {
  auto const at = std::ranges::lower_bound(all_, field, {}, &value_type::first);
  if (at != all_.end() && at->first == field) {
    at->second = content;
    return;
  }
  auto const place = at - all_.begin();
  if (all_.empty()) {
    all_.reserve(kUsual);
  }
  all_.emplace(all_.begin() + place, field, content);
}

void MaskedFields::erase(Field field) {
  std::erase_if(all_, [&](value_type const &one) { return one.first == field; });
}

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
  fields_.put(field, {.value = value & mask, .mask = mask});
  return *this;
}

}  // namespace simhost::openflow
