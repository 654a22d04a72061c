// Text forms of network addresses; see addresses.h.

#include "helpers/addresses.h"

#include <arpa/inet.h>

#include <array>
#include <cstring>

PyObject *mac_address_text(void const *bytes) {
  auto const *const b = static_cast<unsigned char const *>(bytes);
  std::array<char, 32> text;
  PyOS_snprintf(text.data(), text.size(), "%02x:%02x:%02x:%02x:%02x:%02x", b[0], b[1], b[2], b[3],
                b[4], b[5]);
  return PyUnicode_FromString(text.data());
}

PyObject *ipv4_address_text(void const *bytes) {
  in_addr address;
  std::memcpy(&address, bytes, sizeof address);
  return PyUnicode_FromString(inet_ntoa(address));
}

PyObject *ipv6_address_text(void const *bytes) {
  std::array<char, INET6_ADDRSTRLEN> text;
  in6_addr address;
  std::memcpy(&address, bytes, sizeof address);
  return PyUnicode_FromString(inet_ntop(AF_INET6, &address, text.data(), text.size()));
}
