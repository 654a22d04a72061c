// The rules of the keys that have a meaning to the host.
#include "core/properties.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstring>

#include "core/giving_up.h"
#include "vswitch/properties.h"

namespace simhost {
namespace {

constexpr std::uint32_t kLeastMtu = 1280;
constexpr std::uint32_t kGreatestMtu = 9190;

struct Rule {
  std::string_view key;
  bool (*accepts)(std::span<std::byte const> value);
};

// 4 bytes, host byte order.
bool is_mtu(std::span<std::byte const> value) {
  std::uint32_t mtu = 0;
  if (value.size() != sizeof mtu) {
    return false;
  }
  std::memcpy(&mtu, value.data(), sizeof mtu);
  return mtu >= kLeastMtu && mtu <= kGreatestMtu;
}

constexpr std::array kRules{Rule{.key = VSPROP_MTU, .accepts = is_mtu}};

}  // namespace

void set_property(store::Transaction &transaction, store::PropertyOwner const &owner,
                  std::string_view key, std::span<std::byte const> value,
                  store::PropertyType type) {
  auto const rule =
      std::find_if(kRules.begin(), kRules.end(), [&](Rule const &r) { return r.key == key; });
  if (rule != kRules.end() && !rule->accepts(value)) {
    throw Refused(QEX_BAD_PARAM);
  }
  store::put_property(transaction, owner, key, value, type);
}

}  // namespace simhost
