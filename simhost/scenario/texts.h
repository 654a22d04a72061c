// Addresses and statuses as people write them.
#pragma once

#include <array>
#include <cstddef>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "base/outcomes.h"
#include "qexapi/status.h"

namespace simhost::scenario {

/// Bytes of an address of Ethernet.
inline constexpr std::size_t kMacBytes = 6;

/// Six bytes in hexadecimal with colons between them.
std::optional<std::array<std::byte, kMacBytes>> mac_from(std::string_view text);
std::string mac_text(std::span<std::byte const, kMacBytes> mac);

/// An address of Ethernet, IPv4 or IPv6, told apart by its form and its length in bytes.
std::optional<std::vector<std::byte>> address_from(std::string const &text);
std::string address_text(std::span<std::byte const> address);

/// Bytes in hexadecimal, two digits each.
std::optional<std::vector<std::byte>> bytes_from_hex(std::string_view text);
std::string hex_text(std::span<std::byte const> bytes);

/// The status of a name such as "QEX_BUSY".
std::optional<QEX_ReturnStatus> status_named(std::string_view name);
/// The name of a status; its number for one without.
std::string status_name(QEX_ReturnStatus status);
/// Why the host refuses something: the reason, or else what the status means, and its name.
std::string refusal_text(Refused const &refused);

}  // namespace simhost::scenario
