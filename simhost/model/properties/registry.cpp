// The list of the settings, one row for each domain, and what holds for the whole of it: every key
// of the headers has a setting, and every setting a key.
#include "model/properties/registry.h"

#include <algorithm>
#include <array>

#include "model/mac/properties.h"
#include "model/mirror/properties.h"
#include "model/multicast/properties.h"
#include "model/ports/properties.h"
#include "model/security/properties.h"
#include "model/switches/properties.h"
#include "model/teaming/properties.h"
#include "model/uplinks/properties.h"
#include "model/vlans/properties.h"
#include "qexapi/switch_properties.h"
#include "vswitch/properties.h"

namespace simhost {
namespace {

template <std::size_t... kCounts>
constexpr auto joined(std::array<Descriptor const *, kCounts> const &...domains) {
  std::array<Descriptor const *, (kCounts + ...)> all{};
  auto *end = all.data();
  ((end = std::copy(domains.begin(), domains.end(), end)), ...);
  return all;
}

constexpr auto kDescriptors =
    joined(switches::kProperties, uplinks::kProperties, teaming::kProperties, vlans::kProperties,
           security::kProperties, mac::kProperties, multicast::kProperties, mirror::kProperties,
           ports::kProperties);

// The texts of these headers that are no keys.
constexpr std::array<std::string_view, 2> kNoKeys{PS_CLASS_NAME, SWNAME};

constexpr KeyConstant kConstants[] = {
#define PROPERTY_CONSTANT(family, name) {#name, name, KeyFamily::family},
#include "property_constants.inc"
#undef PROPERTY_CONSTANT
};

constexpr Descriptor const *descriptor_with(std::string_view key) {
  auto const *const at =
      std::find_if(kDescriptors.begin(), kDescriptors.end(),
                   [&](Descriptor const *descriptor) { return descriptor->key == key; });
  return at == kDescriptors.end() ? nullptr : *at;
}

constexpr KeyConstant const *constant(std::string_view key) {
  auto const *const at = std::find_if(std::begin(kConstants), std::end(kConstants),
                                      [&](KeyConstant const &known) { return known.key == key; });
  return at == std::end(kConstants) ? nullptr : at;
}

// Whether there is one is asked without its address, which is no constant where sanitizers look
// after it.
constexpr bool has_descriptor(std::string_view key) {
  return std::any_of(kDescriptors.begin(), kDescriptors.end(),
                     [&](Descriptor const *descriptor) { return descriptor->key == key; });
}

constexpr bool is_constant(std::string_view key) {
  return std::any_of(std::begin(kConstants), std::end(kConstants),
                     [&](KeyConstant const &known) { return known.key == key; });
}

constexpr bool needs_descriptor(std::string_view text) {
  return std::find(kNoKeys.begin(), kNoKeys.end(), text) == kNoKeys.end();
}

#define PROPERTY_CONSTANT(family, name)                                \
  static_assert(!needs_descriptor(name) || has_descriptor(name), #name \
                " has no descriptor: declare one in the folder "       \
                "of its domain and list it there");
#include "property_constants.inc"
#undef PROPERTY_CONSTANT

template <typename Holds>
constexpr bool each(Holds const &holds) {
  return std::all_of(kDescriptors.begin(), kDescriptors.end(), holds);
}

static_assert(each([](auto const *one) { return is_constant(one->key); }),
              "a descriptor's key is no constant of the headers");
static_assert(each([](auto const *one) {
                return std::count_if(kDescriptors.begin(), kDescriptors.end(),
                                     [&](auto const *other) { return one->key == other->key; }) ==
                       1;
              }),
              "two descriptors have one key");
static_assert(each([](auto const *one) { return !one->words.empty(); }),
              "a descriptor does not say what it means");
static_assert(each([](auto const *one) {
                return one->bytes != BytesName<Bytes>::kName || one->is_any_bytes;
              }),
              "a descriptor neither says what its bytes are nor why they are any");
static_assert(each([](auto const *one) {
                return one->name.empty() || each([&](auto const *other) {
                         return one->key == other->key || one->scope != other->scope ||
                                one->name != other->name;
                       });
              }),
              "two settings of one owner have one name");

}  // namespace

std::span<Descriptor const *const> descriptors() {
  return kDescriptors;
}

Descriptor const *find_descriptor(std::string_view key) {
  return descriptor_with(key);
}

KeyConstant const &constant_of(Descriptor const &descriptor) {
  return *constant(descriptor.key);
}

KeyFamily family_of(std::string_view key) {
  return descriptor_with(key) == nullptr ? KeyFamily::extra : constant(key)->family;
}

}  // namespace simhost
