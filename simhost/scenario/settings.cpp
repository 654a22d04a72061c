// Everything here is told by the descriptors; there is no word about any one setting.
#include "scenario/settings.h"

#include <array>
#include <map>
#include <optional>
#include <string>
#include <utility>

#include "base/bytes.h"
#include "model/properties/properties.h"
#include "model/properties/registry.h"
#include "scenario/forms.h"
#include "scenario/reading.h"
#include "scenario/texts.h"
#include "storage/store.h"

namespace simhost::scenario {
namespace {

using storage::ChangingTransaction;
using storage::PropertyOwner;
using storage::PropertyScope;
using storage::Transaction;

constexpr std::array<Word, 4> kPropertyTypes{{{"config", CONFIG_PROP_TYPE},
                                              {"runtime", RUNTIME_PROP_TYPE},
                                              {"volatile", VOLATILE_PROP_TYPE},
                                              {"policy", POLICY_PROP_TYPE}}};

PropertyScope scope_of(SettingOwner kind) {
  switch (kind) {
    case SettingOwner::of_switch:
      return PropertyScope::global;
    case SettingOwner::of_host:
      return PropertyScope::host;
    default:
      return PropertyScope::port;
  }
}

// What such an owner calls a setting; empty if it has no member for it.
std::string_view name_for(SettingOwner kind, Descriptor const &descriptor) {
  if (descriptor.scope != scope_of(kind)) {
    return "";
  }
  return kind == SettingOwner::of_uplink_port ? descriptor.uplink_port_name : descriptor.name;
}

template <typename Each>
void for_each_named(SettingOwner kind, Each const &each) {
  for (auto const *const descriptor : descriptors()) {
    if (auto const name = name_for(kind, *descriptor); !name.empty()) {
      each(*descriptor, name);
    }
  }
}

// Whether a member, its own or another's, says what is under the key.
bool is_named(SettingOwner kind, std::string_view key) {
  bool named = false;
  for_each_named(kind, [&](Descriptor const &descriptor, std::string_view) {
    auto const *const companion = descriptor.companion.property;
    named = named || descriptor.key == key || (companion != nullptr && companion->key == key);
  });
  return named;
}

// What a member makes of a property: its bytes, or nothing where it is to go.
struct Made {
  Descriptor const *property;
  std::optional<Bytes> bytes;
};

std::vector<Made> made_from(Descriptor const &descriptor, Node const &node) {
  std::vector<Made> all;
  auto const &companion = descriptor.companion;
  std::optional<Bytes> part;
  auto bytes = descriptor.make(descriptor, [&](void *value) {
    read(descriptor.form, node, value);
    if (companion.property != nullptr) {
      part = companion.part_of(value);
    }
  });
  all.push_back({&descriptor, std::move(bytes)});
  if (companion.property != nullptr) {
    all.push_back({companion.property, std::move(part)});
  }
  return all;
}

Json value_to_json(Descriptor const &descriptor, Transaction &transaction,
                   PropertyOwner const &owner, BytesView bytes) {
  auto const &companion = descriptor.companion;
  Json said;
  descriptor.see(bytes, [&](void *value) {
    if (companion.property != nullptr) {
      if (auto const part = find_bytes(transaction, *companion.property, owner)) {
        companion.join(value, *part);
      }
    }
    said = to_json(descriptor.form, value);
  });
  return said;
}

// The properties that the members of an object say, as they will be read: texts that are no UTF-8
// are lost on the way.
std::map<std::string_view, Bytes> said_by(Json const &described, SettingOwner kind) {
  std::map<std::string_view, Bytes> all;
  for_each_named(kind, [&](Descriptor const &descriptor, std::string_view name) {
    auto const member = described.find(std::string(name));
    if (member == described.end()) {
      return;
    }
    auto const written = member->dump(-1, ' ', false, Json::error_handler_t::replace);
    auto const read_back = Json::parse(written);
    Node const node(read_back);
    try {
      for (auto &made : do_at(node, [&] { return made_from(descriptor, node); })) {
        if (made.bytes) {
          all[made.property->key] = *std::move(made.bytes);
        }
      }
    } catch (DocumentError const &) {
      // It cannot be read, so it says nothing.
    }
  });
  return all;
}

// Whether what members say is all that there is: the type and each of the bytes.
bool round_trips(std::map<std::string_view, Bytes> const &said,
                 storage::NamedProperty const &stored) {
  auto const found = said.find(stored.name);
  return found != said.end() && found->second == stored.property.value &&
         stored.property.type == find_descriptor(stored.name)->type;
}

Bytes bytes_from(Node const &node) {
  auto const hex = node.find("hex");
  auto const text = node.find("text");
  if (hex.has_value() == text.has_value()) {
    node.fail("must have one of the keys hex, text");
  }
  if (text) {
    return bytes_of_text(text->text());
  }
  auto const bytes = bytes_from_hex(hex->text());
  if (!bytes) {
    hex->fail("must be hexadecimal digits, two for each byte");
  }
  return *bytes;
}

template <typename IsWanted>
void apply_bytes(ChangingTransaction &transaction, PropertyOwner const &owner, Node const &node,
                 std::string_view under, IsWanted const &is_wanted) {
  if_there(node, under, [&](Node const &properties) {
    for_each_member(properties, [&](std::string const &key, Node const &property) {
      if (!is_wanted(key)) {
        return;
      }
      property.only({"type", "hex", "text"});
      auto const type = storage::PropertyType(property.at("type").choice(kPropertyTypes));
      set_property(transaction, owner, key, bytes_from(property), type);
    });
  });
}

void apply_member(ChangingTransaction &transaction, PropertyOwner const &owner,
                  Descriptor const &descriptor, Node const &member) {
  for (auto const &made : made_from(descriptor, member)) {
    if (made.bytes) {
      set_bytes(transaction, *made.property, owner, *made.bytes);
    } else {
      clear(transaction, *made.property, owner);
    }
  }
}

}  // namespace

Json type_to_json(storage::PropertyType type) {
  return word_to_json(static_cast<std::int64_t>(type), kPropertyTypes);
}

std::vector<std::string_view> setting_names(SettingOwner kind) {
  std::vector<std::string_view> names;
  for_each_named(kind, [&](Descriptor const &, std::string_view name) { names.push_back(name); });
  return names;
}

std::string_view name_at_uplink_port(std::string_view name) {
  std::string_view found;
  for_each_named(SettingOwner::of_port, [&](Descriptor const &descriptor, std::string_view own) {
    if (own == name) {
      found = descriptor.uplink_port_name;
    }
  });
  return found;
}

void apply_raw(ChangingTransaction &transaction, PropertyOwner const &owner, SettingOwner kind,
               Node const &node, std::string_view under) {
  apply_bytes(transaction, owner, node, under,
              [&](std::string_view key) { return !is_named(kind, key); });
}

void apply_named(ChangingTransaction &transaction, PropertyOwner const &owner, SettingOwner kind,
                 Node const &node) {
  for_each_named(kind, [&](Descriptor const &descriptor, std::string_view name) {
    if_there(node, name,
             [&](Node const &member) { apply_member(transaction, owner, descriptor, member); });
  });
  apply_bytes(transaction, owner, node, keys::properties,
              [&](std::string_view key) { return is_named(kind, key); });
}

void apply_settings(ChangingTransaction &transaction, PropertyOwner const &owner, SettingOwner kind,
                    Node const &node) {
  apply_raw(transaction, owner, kind, node);
  apply_named(transaction, owner, kind, node);
}

void describe_named(Json &described, Transaction &transaction, PropertyOwner const &owner,
                    SettingOwner kind) {
  for_each_named(kind, [&](Descriptor const &descriptor, std::string_view name) {
    auto bytes = find_bytes(transaction, descriptor, owner);
    if (!bytes && descriptor.is_always_said) {
      bytes = descriptor.default_bytes();
    }
    if (bytes) {
      described[std::string(name)] = value_to_json(descriptor, transaction, owner, *bytes);
    }
  });
}

void describe_raw(Json &described, Transaction &transaction, PropertyOwner const &owner,
                  SettingOwner kind, std::string_view under) {
  auto const said = said_by(described, kind);
  Json list = Json::object();
  for (auto const &stored : list_stored(transaction, owner)) {
    if (!round_trips(said, stored)) {
      list[stored.name] = {{"type", type_to_json(stored.property.type)},
                           {"hex", hex_text(stored.property.value)}};
    }
  }
  described[std::string(under)] = std::move(list);
}

}  // namespace simhost::scenario
