#include "planes/openvswitch/openflow/field_text.h"

#include <arpa/inet.h>
#include <fmt/format.h>

#include <array>
#include <optional>
#include <string_view>
#include <utility>

namespace simhost::openflow {
namespace {

constexpr std::array<std::pair<Port, std::string_view>, 8> kNames{{
    {kInPort, "IN_PORT"},
    {kTable, "TABLE"},
    {kNormal, "NORMAL"},
    {kFlood, "FLOOD"},
    {kAllPorts, "ALL"},
    {kController, "CONTROLLER"},
    {kLocal, "LOCAL"},
    {kAnyPort, "ANY"},
}};

template <std::size_t Size>
std::string address_text(int family, Value value) {
  auto const bytes = to_address<Size>(value);
  std::array<char, INET6_ADDRSTRLEN> text{};
  ::inet_ntop(family, bytes.data(), text.data(), text.size());
  return text.data();
}

/// How many ones the mask begins with, unless there are others.
std::optional<unsigned> prefix_length(Value mask, unsigned bits) {
  unsigned length = 0;
  while (length < bits && (mask >> (bits - 1 - length) & 1U) != 0) {
    ++length;
  }
  return mask == (ones(bits) ^ ones(bits - length)) ? std::optional(length) : std::nullopt;
}

std::string mask_text(Field field, Value mask) {
  auto const &[form, bits] = std::pair(info(field).form, info(field).bits);
  if (form == Form::ipv4 || form == Form::ipv6) {
    auto const length = prefix_length(mask, bits);
    return length ? std::to_string(*length) : content_text(field, mask);
  }
  return form == Form::decimal ? hexadecimal(mask) : content_text(field, mask);
}

}  // namespace

std::string port_text(Port port) {
  for (auto const &[number, name] : kNames) {
    // Of 16 bits they have the lower half.
    if (port == number || port == (number & 0xffffU)) {
      return std::string(name);
    }
  }
  return std::to_string(port);
}

std::string hexadecimal(Value value) {
  return value == 0 ? "0" : fmt::format("{:#x}", value);
}

std::string content_text(Field field, Value value) {
  switch (info(field).form) {
    case Form::decimal:
      return fmt::format("{}", value);
    case Form::hexadecimal:
      return hexadecimal(value);
    case Form::port:
      return port_text(static_cast<Port>(value));
    case Form::ethernet:
      return fmt::format("{:02x}", fmt::join(to_address<6>(value), ":"));
    case Form::ipv4:
      return address_text<4>(AF_INET, value);
    case Form::ipv6:
      return address_text<16>(AF_INET6, value);
  }
  return {};
}

std::string masked_text(Field field, Masked const &content) {
  auto text = content_text(field, content.value);
  return content.mask == settable_bits(field) ? text : text + '/' + mask_text(field, content.mask);
}

std::string part_text(SubField const &part) {
  auto const &field = info(part.field);
  if (part.bits == field.bits) {
    return fmt::format("{}[]", field.part_name);
  }
  if (part.bits == 1) {
    return fmt::format("{}[{}]", field.part_name, part.first);
  }
  return fmt::format("{}[{}..{}]", field.part_name, part.first, part.first + part.bits - 1);
}

}  // namespace simhost::openflow
