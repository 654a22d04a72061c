#include "planes/openvswitch/openflow/codec/groups.h"

#include <algorithm>
#include <stdexcept>

#include "planes/openvswitch/openflow/codec/actions.h"
#include "planes/openvswitch/openflow/codec/foreign.h"
#include "planes/openvswitch/openflow/codec/oxm.h"

namespace simhost::openflow {
namespace {

enum class BucketProperty : std::uint16_t { weight = 0, watch_port = 1, watch_group = 2 };

constexpr std::uint16_t kExperimenterProperty = 0xffff;
constexpr std::uint32_t kSelectionExperimenter = 0x154d;
constexpr std::uint32_t kSelectionMethod = 1;
constexpr std::size_t kMethodSize = 16;
constexpr std::size_t kPropertyHeader = 4;

template <typename Payload>
void put_property(Writer &out, std::uint16_t type, Payload const &payload) {
  auto const start = out.size();
  out.u16(type);
  out.u16(0);
  payload();
  out.put_length(start + 2, start);
  out.pad(start);
}

void put_number(Writer &out, BucketProperty type, std::uint32_t number) {
  put_property(out, static_cast<std::uint16_t>(type), [&] { out.u32(number); });
}

void put_bucket(Writer &out, Bucket const &bucket, GroupType type) {
  auto const start = out.size();
  out.u16(0);
  out.u16(0);
  out.u32(bucket.id);
  auto const actions = out.size();
  put_actions(out, bucket.actions);
  out.put_length(start + 2, actions);
  if (type == GroupType::select) {
    put_property(out, static_cast<std::uint16_t>(BucketProperty::weight), [&] {
      out.u16(bucket.weight);
      out.zeros(2);
    });
  }
  if (bucket.watch_port != kAnyPort) {
    put_number(out, BucketProperty::watch_port, bucket.watch_port);
  }
  if (bucket.watch_group != kAnyGroup) {
    put_number(out, BucketProperty::watch_group, bucket.watch_group);
  }
  out.put_length(start, start);
}

void take_bucket_property(Reader &properties, Bucket &bucket) {
  auto property = take_item(properties, 2, kPropertyHeader, 8);
  auto const type = property.u16();
  property.skip(2);
  switch (static_cast<BucketProperty>(type)) {
    case BucketProperty::weight:
      bucket.weight = property.u16();
      return;
    case BucketProperty::watch_port:
      bucket.watch_port = property.u32();
      return;
    case BucketProperty::watch_group:
      bucket.watch_group = property.u32();
      return;
  }
  throw Foreign("property " + std::to_string(type) + " of a bucket");
}

Bucket take_bucket(Reader &in) {
  Bucket bucket;
  bucket.weight = 1;
  in.skip(2);
  auto const actions_size = in.u16();
  bucket.id = in.u32();
  Reader actions(in.take(actions_size));
  bucket.actions = take_actions(actions);
  while (!in.empty()) {
    take_bucket_property(in, bucket);
  }
  return bucket;
}

Selection take_selection(Reader &in) {
  Selection selection;
  auto const name = in.take(kMethodSize);
  selection.method.assign(name.begin(), std::find(name.begin(), name.end(), 0));
  selection.parameter = in.u64();
  while (!in.empty()) {
    auto const [field, content] = take_field(in, true);
    selection.fields[field] = content.mask;
  }
  return selection;
}

}  // namespace

void put_buckets(Writer &out, Group const &group) {
  for (auto const &bucket : group.buckets) {
    put_bucket(out, bucket, group.type);
  }
}

void put_selection(Writer &out, Selection const &selection) {
  if (selection.method.empty()) {
    return;
  }
  if (selection.method.size() >= kMethodSize) {
    throw std::invalid_argument("the name of a selection method has at most 15 characters");
  }
  put_property(out, kExperimenterProperty, [&] {
    out.u32(kSelectionExperimenter);
    out.u32(kSelectionMethod);
    out.zeros(4);
    for (auto const character : selection.method) {
      out.u8(static_cast<std::uint8_t>(character));
    }
    out.zeros(kMethodSize - selection.method.size());
    out.u64(selection.parameter);
    for (auto const &[field, mask] : selection.fields) {
      put_hashed_field(out, field, mask);
    }
  });
}

std::vector<Bucket> take_buckets(Reader &in) {
  constexpr std::size_t kBucketHeader = 8;
  std::vector<Bucket> buckets;
  while (!in.empty()) {
    auto item = take_item(in, 0, kBucketHeader);
    buckets.push_back(take_bucket(item));
  }
  return buckets;
}

Selection take_group_properties(Reader &in) {
  Selection selection;
  while (!in.empty()) {
    auto property = take_item(in, 2, kPropertyHeader, 8);
    auto const type = property.u16();
    property.skip(2);
    if (type != kExperimenterProperty || property.u32() != kSelectionExperimenter ||
        property.u32() != kSelectionMethod) {
      throw Foreign("property " + std::to_string(type) + " of a group");
    }
    property.skip(4);
    selection = take_selection(property);
  }
  return selection;
}

}  // namespace simhost::openflow
