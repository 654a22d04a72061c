// From texts and back.
#include "scenario/texts.h"

#include <arpa/inet.h>
#include <fmt/format.h>

#include <algorithm>
#include <charconv>
#include <iterator>

#include "base/ip_text.h"

namespace simhost::scenario {
namespace {

struct Status {
  QEX_ReturnStatus status;
  std::string_view name;
  std::string_view text;
};

// Not an std::array, whose length compilers would have to deduce from that many arguments.
constexpr Status kStatuses[] = {
#define STATUS_TEXT(status, text) Status{status, #status, text},
#include "status_texts.inc"
#undef STATUS_TEXT
};

Status const *find_status(QEX_ReturnStatus status) {
  auto const *const found = std::find_if(std::begin(kStatuses), std::end(kStatuses),
                                         [&](Status const &s) { return s.status == status; });
  return found == std::end(kStatuses) ? nullptr : found;
}

std::optional<std::byte> byte_from(std::string_view digits) {
  unsigned value = 0;
  auto const end = digits.data() + digits.size();
  auto const [stopped, error] = std::from_chars(digits.data(), end, value, 16);
  if (digits.size() != 2 || error != std::errc() || stopped != end) {
    return std::nullopt;
  }
  return std::byte(value);
}

template <int kFamily, std::size_t kLength>
std::optional<std::vector<std::byte>> ip_from(std::string const &text) {
  std::vector<std::byte> address(kLength);
  if (inet_pton(kFamily, text.c_str(), address.data()) != 1) {
    return std::nullopt;
  }
  return address;
}

}  // namespace

std::optional<std::array<std::byte, kMacBytes>> mac_from(std::string_view text) {
  std::array<std::byte, kMacBytes> mac{};
  if (text.size() != 17) {
    return std::nullopt;
  }
  for (std::size_t at = 0; at < mac.size(); ++at) {
    auto const byte = byte_from(text.substr(3 * at, 2));
    if (!byte || (at > 0 && text[(3 * at) - 1] != ':')) {
      return std::nullopt;
    }
    mac[at] = *byte;
  }
  return mac;
}

std::string mac_text(std::span<std::byte const, kMacBytes> mac) {
  return fmt::format("{:02x}:{:02x}:{:02x}:{:02x}:{:02x}:{:02x}", mac[0], mac[1], mac[2], mac[3],
                     mac[4], mac[5]);
}

std::optional<std::vector<std::byte>> address_from(std::string const &text) {
  if (auto const mac = mac_from(text)) {
    return std::vector(mac->begin(), mac->end());
  }
  if (auto address = ip_from<AF_INET, sizeof(in_addr)>(text)) {
    return address;
  }
  return ip_from<AF_INET6, sizeof(in6_addr)>(text);
}

std::string address_text(std::span<std::byte const> address) {
  if (address.size() == kMacBytes) {
    return mac_text(address.first<kMacBytes>());
  }
  return ip_text(address);
}

std::optional<std::vector<std::byte>> bytes_from_hex(std::string_view text) {
  if (text.size() % 2 != 0) {
    return std::nullopt;
  }
  std::vector<std::byte> bytes;
  for (std::size_t at = 0; at < text.size(); at += 2) {
    auto const byte = byte_from(text.substr(at, 2));
    if (!byte) {
      return std::nullopt;
    }
    bytes.push_back(*byte);
  }
  return bytes;
}

std::string hex_text(std::span<std::byte const> bytes) {
  std::string text;
  for (auto const byte : bytes) {
    text += fmt::format("{:02x}", byte);
  }
  return text;
}

std::optional<QEX_ReturnStatus> status_named(std::string_view name) {
  auto const *const found = std::find_if(std::begin(kStatuses), std::end(kStatuses),
                                         [&](Status const &s) { return s.name == name; });
  return found == std::end(kStatuses) ? std::nullopt : std::optional(found->status);
}

std::string status_name(QEX_ReturnStatus status) {
  auto const *const found = find_status(status);
  return found != nullptr ? std::string(found->name)
                          : fmt::format("0x{:08x}", static_cast<unsigned>(status));
}

std::string refusal_text(Refused const &refused) {
  auto const *const found = find_status(refused.status());
  if (found == nullptr && !refused.has_reason()) {
    return status_name(refused.status());
  }
  return fmt::format("{} ({})", refused.has_reason() ? refused.what() : found->text,
                     status_name(refused.status()));
}

}  // namespace simhost::scenario
