// Properties by the raw calls: each is set as it is or refused, and the host still describes
// itself, writes its state, and returns what its ports have.

#include <algorithm>
#include <array>
#include <cstring>
#include <string>
#include <string_view>

#include "model/lookup.h"
#include "model/plane.h"
#include "model/properties/properties.h"
#include "model/state/images.h"
#include "tests/fuzz/host.h"
#include "tests/fuzz/properties.h"

namespace {

using simhost::storage::ChangingTransaction;
using simhost::storage::PropertyOwner;

PropertyOwner consume_owner(Input &input, ChangingTransaction &transaction) {
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

void set_and_get(Input &input, ChangingTransaction &transaction) {
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
    auto const found = simhost::find_property(transaction, owner, key);
    require(found.has_value(), "what is set is there");
    require(!is_kept_as_bytes(key) || found->value == value, "what is set is read byte for byte");
    require(set(found->value), "what is read can be set");
    require(simhost::find_property(transaction, owner, key)->value == found->value,
            "what was read and is set is read byte for byte");
  }
  if (input.ConsumeBool()) {
    is_accepted([&] { simhost::clear_property(transaction, owner, key); });
  }
}

/// What the host has to do with the bytes of settings that are one number; nothing here is taken
/// from the host.
struct Expected {
  std::string_view key;
  std::size_t size;
  std::int64_t least;
  std::int64_t greatest;
};
constexpr std::array kExpected{
    Expected{"com.quorix.vswitch.mtu", 4, 1280, 9190},
    Expected{"com.quorix.vswitch.multicastFilter", 4, 0, 3},
    Expected{"com.quorix.vswitch.disabled", 1, 0, 1},
    Expected{"com.quorix.vswitch.port.security", 4, 0, 7},
    Expected{"com.quorix.vswitch.port.priority", 4, 0, 7},
    Expected{"com.quorix.vswitch.port.txUplink", 1, 0, 1},
    Expected{"com.quorix.vswitch.port.vlanNestedTag", 1, 0, 1},
    Expected{"com.quorix.common.opaqueDvs.status.component.vswitch", 4, 0, 2},
    Expected{"com.quorix.common.host.volatile.status", 4, 0, 2},
    Expected{"com.quorix.common.host.portset.volatile.state", 4, 1, 2},
    Expected{"com.quorix.common.port.volatile.type", 4, 1, 4},
    Expected{"com.quorix.common.port.volatile.persist", 1, 0, 1},
    Expected{"com.quorix.common.port.ptAllowed", 1, 0, 1},
    Expected{"com.quorix.common.port.ptAllowedRT", 1, 0, 1},
    Expected{"com.quorix.common.port.connectid", 4, 0, 0xFFFFFFFF},
    Expected{"com.quorix.common.port.qexnicVlanID", 2, 0, 4094},
    Expected{"com.quorix.common.port.block", 1, 0, 1},
    Expected{"com.quorix.port.forward.not.ready.block", 1, 0, 1},
};

bool is_expected(Expected const &expected, simhost::BytesView value) {
  std::uint32_t number = 0;
  if (value.size() != expected.size) {
    return false;
  }
  std::memcpy(&number, value.data(), value.size());
  return number >= expected.least && number <= expected.greatest;
}

/// Each number is drawn, so each must be in the table.
bool is_one_number(simhost::Descriptor const &descriptor) {
  using simhost::FormKind;
  auto const kind = descriptor.form.kind;
  return !descriptor.is_computed() && (kind == FormKind::number || kind == FormKind::boolean ||
                                       kind == FormKind::choice || kind == FormKind::bits);
}

void set_one_number(Input &input, ChangingTransaction &transaction) {
  auto const known = simhost::descriptors();
  auto const &descriptor = *known[input.ConsumeIntegralInRange<std::size_t>(0, known.size() - 1)];
  if (!is_one_number(descriptor)) {
    return;
  }
  auto const expected = std::find_if(kExpected.begin(), kExpected.end(), [&](Expected const &row) {
    return row.key == descriptor.key;
  });
  require(expected != kExpected.end(), "what is drawn is in the table of what is expected");
  auto const owner = consume_owner(input, transaction);
  auto const value = consume_value(input);
  bool const is_set = is_accepted([&] {
    simhost::set_property(transaction, owner, descriptor.key, value,
                          simhost::storage::PropertyType::config);
  });
  require(is_set == (owner.scope == descriptor.scope && is_expected(*expected, value)),
          "numbers are accepted within their bounds, of their owners, and no others");
}

/// Sets a setting by its name; what is accepted says itself, and is accepted again.
void say(Input &input, ChangingTransaction &transaction) {
  using simhost::scenario::Json;
  auto const known = simhost::descriptors();
  auto const &descriptor = *known[input.ConsumeIntegralInRange<std::size_t>(0, known.size() - 1)];
  if (descriptor.name.empty()) {
    return;
  }
  bool const of_port = descriptor.scope == simhost::storage::PropertyScope::port;
  std::string const name(descriptor.name);
  // The raw call may have renamed it, and to what no document can say.
  auto const alias =
      simhost::get_switch(transaction, "s-id", simhost::storage::SwitchName::identifier).row.alias;
  if (!std::all_of(alias.begin(), alias.end(), [](unsigned char c) { return c < 0x80; })) {
    return;
  }
  auto const set = [&](Json const &said) {
    Json owner{{of_port ? "id" : "alias", of_port ? "p1" : alias}, {name, said}};
    Json const host{
        {"switches",
         Json::array({of_port ? Json{{"alias", alias}, {"ports", Json::array({owner})}} : owner})}};
    simhost::scenario::apply(transaction,
                             host.dump(-1, ' ', false, Json::error_handler_t::replace));
  };
  auto const shown = [&] {
    auto const host = simhost::scenario::host_to_json(transaction);
    auto const &owner = of_port ? host["switches"][0]["ports"][0] : host["switches"][0];
    return owner.at(name);
  };
  try {
    set(consume_said(input, descriptor.form));
  } catch (simhost::scenario::DocumentError const &) {
    return;
  }
  auto const said = shown();
  set(said);
  require(shown() == said, "what is said and read again is said alike");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  Input input(data, size);
  ChangingTransaction transaction(shared_host());
  for (int calls = 0; calls < 12 && input.remaining_bytes() > 0; ++calls) {
    switch (input.ConsumeIntegralInRange(0, 2)) {
      case 0:
        set_one_number(input, transaction);
        break;
      case 1:
        say(input, transaction);
        break;
      default:
        set_and_get(input, transaction);
        break;
    }
  }
  simhost::scenario::description(transaction);
  auto const image = simhost::state_image(transaction, simhost::Extent::whole);
  require(is_accepted([&] { simhost::load_state(transaction, image, simhost::Extent::whole); }),
          "the host reads its own image");
  return 0;
}
