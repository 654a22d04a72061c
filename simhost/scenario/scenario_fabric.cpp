// From documents to the host, and back.
#include "scenario/scenario_fabric.h"

#include <fmt/format.h>

#include <charconv>
#include <string>
#include <string_view>

#include "scenario/fabric_members.h"
#include "scenario/reading.h"

namespace simhost::scenario {
namespace {

bool is_none(Node const &node) {
  return node.is_object() && node.members().empty();
}

AddressBytes ip_from(std::string const &text, Node const &node) {
  auto const address = address_from(text);
  if (!address || address->size() == kMacBytes) {
    node.fail("must be an IPv4 or IPv6 address");
  }
  return *address;
}

// Such as 192.0.2.1/24.
void put_address(storage::Underlay &underlay, std::string const &text, Node const &node) {
  auto const slash = text.find('/');
  auto const address = address_from(text.substr(0, slash));
  unsigned bits = 0;
  bool is_one = slash != std::string::npos && address && address->size() != kMacBytes;
  if (is_one) {
    auto const digits = std::string_view(text).substr(slash + 1);
    auto const *const end = digits.data() + digits.size();
    auto const [stopped, error] = std::from_chars(digits.data(), end, bits);
    is_one = error == std::errc() && stopped == end && bits >= 1 && bits <= address->size() * 8;
  }
  if (!is_one) {
    node.fail("must be an address and the bits of its network, such as 192.0.2.1/24");
  }
  underlay.address = *address;
  underlay.prefix = static_cast<std::uint8_t>(bits);
}

}  // namespace

void apply_underlay(storage::ChangingTransaction &transaction, Node const &node) {
  if (is_none(node)) {
    storage::remove_underlay(transaction);
    return;
  }
  auto const said = read_object(kUnderlayMembers, node, UnderlayMembers());
  storage::Underlay underlay{.device = said.device, .address = {}};
  put_address(underlay, said.address, node.at(kAddress));
  if (!said.gateway.empty()) {
    underlay.gateway = ip_from(said.gateway, node.at(kGateway));
  }
  set_underlay(transaction, underlay);
}

void apply_fabric(storage::ChangingTransaction &transaction, storage::SwitchKey key,
                  Node const &node) {
  if (is_none(node)) {
    storage::remove_fabric(transaction, key);
    return;
  }
  set_fabric(transaction, key, read_object(kFabricMembers, node, FabricSpec()));
}

Json to_json(storage::Underlay const &underlay) {
  UnderlayMembers const members{
      .device = underlay.device,
      .address = fmt::format("{}/{}", address_text(underlay.address), underlay.prefix),
      .gateway = underlay.gateway.empty() ? "" : address_text(underlay.gateway)};
  Json said = Json::object();
  add_members(said, kUnderlayMembers, &members);
  return said;
}

Json to_json(storage::Fabric const &fabric) {
  FabricSpec members{.uplink = fabric.uplink,
                     .encapsulation = fabric.encapsulation,
                     .key = fabric.key,
                     .peers = fabric.peers};
  Json said = Json::object();
  add_members(said, kFabricMembers, &members);
  return said;
}

}  // namespace simhost::scenario
