// From bytes to texts.
#include "base/ip_text.h"

#include <arpa/inet.h>

#include <array>

namespace simhost {

std::string ip_text(std::span<std::byte const> address) {
  std::array<char, INET6_ADDRSTRLEN> text{};
  inet_ntop(address.size() == sizeof(in_addr) ? AF_INET : AF_INET6, address.data(), text.data(),
            text.size());
  return text.data();
}

}  // namespace simhost
