// A header of Ethernet, the key, the switch and the link; after it as many zeros as a frame needs.
#include "planes/openvswitch/beacons/frame.h"

#include <algorithm>
#include <iterator>

namespace simhost::beacons {
namespace {

using openflow::EthernetAddress;
using Frame = std::vector<std::uint8_t>;

// Without their checksum.
constexpr std::size_t kShortestFrame = 60;
constexpr unsigned kByte = 8;

template <typename Number>
void append_number(Frame &frame, Number number) {
  for (auto shift = sizeof number * kByte; shift > 0; shift -= kByte) {
    frame.push_back(static_cast<std::uint8_t>(number >> (shift - kByte)));
  }
}

void append_bytes(Frame &frame, std::span<std::uint8_t const> bytes) {
  frame.insert(frame.end(), bytes.begin(), bytes.end());
}

template <typename Number>
Number take(std::span<std::uint8_t const> &bytes) {
  Number number = 0;
  for (auto const byte : bytes.first(sizeof number)) {
    number = static_cast<Number>(number << kByte | byte);
  }
  bytes = bytes.subspan(sizeof number);
  return number;
}

// All frames with this key have it, and nobody else's.
Frame header_of(Key const &key, std::uint16_t port) {
  Frame header;
  append_bytes(header, group_of(key));
  EthernetAddress source{0x02, key[3], key[4], key[5]};
  append_bytes(header, std::span(source).first(4));
  append_number(header, port);
  append_number(header, kEthernetType);
  append_bytes(header, key);
  return header;
}

}  // namespace

EthernetAddress group_of(Key const &key) {
  auto group = kGroups;
  std::copy_n(key.begin(), 3, group.begin() + 3);
  return group;
}

std::vector<std::uint8_t> to_frame(Key const &key, Beacon const &beacon, std::uint16_t port) {
  auto frame = header_of(key, port);
  append_number(frame, beacon.of_switch);
  append_number(frame, beacon.link);
  frame.resize(kShortestFrame);
  return frame;
}

std::optional<Beacon> find_beacon(Key const &key, std::span<std::uint8_t const> frame) {
  if (frame.size() < kShortestFrame) {
    return std::nullopt;
  }
  constexpr std::size_t kSource = 6;
  constexpr std::size_t kType = 12;
  auto const header = header_of(key, 0);
  auto const is_same = [&](std::size_t from, std::size_t to) {
    return std::equal(header.begin() + static_cast<std::ptrdiff_t>(from),
                      header.begin() + static_cast<std::ptrdiff_t>(to),
                      frame.begin() + static_cast<std::ptrdiff_t>(from));
  };
  if (!is_same(0, kSource) || !is_same(kType, header.size())) {
    return std::nullopt;
  }
  auto rest = frame.subspan(header.size());
  Beacon beacon;
  beacon.of_switch = take<std::uint64_t>(rest);
  beacon.link = take<Link>(rest);
  return beacon;
}

}  // namespace simhost::beacons
