// Addresses as people write them, and bytes as RFCs print them.
#pragma once

#include <arpa/inet.h>

#include <cstdint>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "planes/openvswitch/multicast/address.h"

namespace simhost::multicast {

inline Address address(std::string const &text) {
  Address address{.family = text.find(':') == std::string::npos ? Family::ipv4 : Family::ipv6};
  auto const family = address.family == Family::ipv4 ? AF_INET : AF_INET6;
  if (inet_pton(family, text.c_str(), address.bytes.data()) != 1) {
    throw std::invalid_argument(text);
  }
  return address;
}

/// Of two digits each; blanks are for the eye.
inline std::vector<std::uint8_t> bytes(std::string_view digits) {
  std::vector<std::uint8_t> all;
  std::string pair;
  for (auto const digit : digits) {
    if (digit != ' ') {
      pair += digit;
    }
    if (pair.size() == 2) {
      all.push_back(static_cast<std::uint8_t>(std::stoul(pair, nullptr, 16)));
      pair.clear();
    }
  }
  return all;
}

}  // namespace simhost::multicast
