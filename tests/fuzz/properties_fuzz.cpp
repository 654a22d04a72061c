// Properties by the raw calls: each is set as it is or refused, and the host still describes
// itself, writes its state, and returns what its ports have.

#include <string>

#include "model/lookup.h"
#include "model/plane.h"
#include "model/properties/properties.h"
#include "model/state/images.h"
#include "tests/fuzz/host.h"
#include "tests/fuzz/properties.h"

namespace {

using simhost::storage::PropertyOwner;
using simhost::storage::Transaction;

PropertyOwner consume_owner(Input &input, Transaction &transaction) {
  auto const key =
      simhost::get_switch(transaction, "s-id", simhost::storage::SwitchName::identifier).key;
  switch (input.ConsumeIntegralInRange(0, 3)) {
    case 0:
      return PropertyOwner::global(key);
    case 1:
      return PropertyOwner::host(key);
    case 2:
      return simhost::owner_of(simhost::get_port(transaction, key, "p1"));
    default:
      return simhost::owner_of(simhost::get_port(transaction, key, "p2"));
  }
}

/// What callers set elsewhere too, such as the names of uplink ports, the host keeps as what it
/// means: what stands after the NUL of a name is lost.
bool is_kept_as_bytes(std::string const &key) {
  auto const *const known = simhost::find_descriptor(key);
  return known == nullptr || !known->is_computed();
}

void set_and_get(Input &input, Transaction &transaction) {
  auto const owner = consume_owner(input, transaction);
  auto const key = consume_key(input);
  auto const set = [&](simhost::BytesView value) {
    return is_accepted([&] {
      simhost::set_property(transaction, owner, key, value,
                            simhost::storage::PropertyType::runtime);
    });
  };
  auto const value = consume_value(input);
  if (set(value)) {
    auto const found = simhost::get_property(transaction, owner, key);
    require(found.has_value(), "what is set is there");
    require(!is_kept_as_bytes(key) || found->value == value, "what is set is read byte for byte");
    require(set(found->value), "what is read can be set");
    require(simhost::get_property(transaction, owner, key)->value == found->value,
            "what was read and is set is read byte for byte");
  }
  if (input.ConsumeBool()) {
    is_accepted([&] { simhost::clear_property(transaction, owner, key); });
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  Input input(data, size);
  Transaction transaction(shared_host(), simhost::storage::Access::write);
  for (int calls = 0; calls < 12 && input.remaining_bytes() > 0; ++calls) {
    set_and_get(input, transaction);
  }
  simhost::scenario::description(transaction);
  auto const image = simhost::state_image(transaction, simhost::Extent::whole);
  require(is_accepted([&] { simhost::load_state(transaction, image, simhost::Extent::whole); }),
          "the host reads its own image");
  return 0;
}
