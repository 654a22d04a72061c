// Properties through the raw door: each is set as it is or refused, and the host still describes
// itself, writes its state, and answers for its ports.

#include <string>

#include "core/known.h"
#include "core/properties.h"
#include "core/state_images.h"
#include "dataplane/teaming.h"
#include "tests/fuzz/host.h"
#include "tests/fuzz/properties.h"

namespace {

using simhost::store::PropertyOwner;
using simhost::store::Transaction;

PropertyOwner consume_owner(Input &input, Transaction &work) {
  auto const key = simhost::known_switch(work, "s-id", simhost::store::SwitchName::identifier).key;
  switch (input.ConsumeIntegralInRange(0, 3)) {
    case 0:
      return PropertyOwner::global(key);
    case 1:
      return PropertyOwner::host(key);
    case 2:
      return simhost::owner_of(simhost::known_port(work, key, "p1"));
    default:
      return simhost::owner_of(simhost::known_port(work, key, "p2"));
  }
}

/// What callers set elsewhere too, such as the names of uplink ports, the host keeps as what it
/// means: what stands behind the NUL of a name is lost.
bool is_kept_as_bytes(std::string const &key) {
  auto const *const known = simhost::find_property_key(key);
  return known == nullptr || known->read == nullptr;
}

void set_and_get(Input &input, Transaction &work) {
  auto const owner = consume_owner(input, work);
  auto const key = consume_key(input);
  auto const set = [&](simhost::BytesView value) {
    return is_accepted([&] {
      simhost::set_property(work, owner, key, value, simhost::store::PropertyType::runtime);
    });
  };
  auto const value = consume_value(input);
  if (set(value)) {
    auto const found = simhost::get_property(work, owner, key);
    require(found.has_value(), "what is set is there");
    require(!is_kept_as_bytes(key) || found->value == value, "what is set is read byte for byte");
    require(set(found->value), "what is read can be set");
    require(simhost::get_property(work, owner, key)->value == found->value,
            "what was read and is set is read byte for byte");
  }
  if (input.ConsumeBool()) {
    is_accepted([&] { simhost::clear_property(work, owner, key); });
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  Input input(data, size);
  Transaction work(shared_host(), simhost::store::Access::write);
  for (int calls = 0; calls < 12 && input.remaining_bytes() > 0; ++calls) {
    set_and_get(input, work);
  }
  simhost::control::description(work);
  auto const image = simhost::state_image(work, simhost::Extent::whole);
  require(is_accepted([&] { simhost::load_state(work, image, simhost::Extent::whole); }),
          "the host reads its own image");
  return 0;
}
