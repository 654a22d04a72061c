// One object for each descriptor; what does not apply to a property is left out of its object.
#include "scenario/reference.h"

#include "model/options/host_settings.h"
#include "model/options/runtime_options.h"
#include "model/properties/longest_key.h"
#include "model/properties/registry.h"
#include "scenario/fabric_members.h"
#include "scenario/forms.h"
#include "scenario/keys.h"
#include "scenario/members.h"
#include "scenario/settings.h"

namespace simhost::scenario {
namespace {

std::string_view name_of(KeyFamily family) {
  return family == KeyFamily::common ? "common" : "vendor";
}

std::string_view name_of(storage::PropertyScope scope) {
  switch (scope) {
    case storage::PropertyScope::global:
      return "switch";
    case storage::PropertyScope::host:
      return "host";
    case storage::PropertyScope::port:
      return "port";
  }
  return "";
}

// The setting of whose document member the property is a part.
Descriptor const *find_whole(Descriptor const &part) {
  for (auto const *const descriptor : descriptors()) {
    auto const *const companion = descriptor->companion.property;
    if (companion != nullptr && companion->key == part.key) {
      return descriptor;
    }
  }
  return nullptr;
}

void add_names(Json &said, Descriptor const &descriptor) {
  if (!descriptor.name.empty()) {
    said["name"] = descriptor.name;
  }
  if (!descriptor.uplink_port_name.empty()) {
    said["uplink_port_name"] = descriptor.uplink_port_name;
  }
  if (auto const *const whole = find_whole(descriptor)) {
    said["part_of"] = {{"name", whole->name}, {"member", whole->companion.member}};
  }
}

void add_default(Json &said, Descriptor const &descriptor) {
  descriptor.make(descriptor, [&](void *value) {
    said["value"] = form_to_json(descriptor.form, value);
    if (descriptor.has_default && descriptor.form.kind != FormKind::none) {
      said["default"] = to_json(descriptor.form, value);
    }
  });
  if (descriptor.inherited != nullptr) {
    said["inherits"] = descriptor.inherited->key;
  }
}

Json property_to_json(Descriptor const &descriptor) {
  auto const &constant = constant_of(descriptor);
  Json said{{"key", descriptor.key},
            {"constant", constant.name},
            {"family", name_of(constant.family)},
            {"scope", name_of(descriptor.scope)},
            {"type", type_to_json(descriptor.type)},
            {"typed", descriptor.is_typed},
            {"computed", descriptor.is_computed()},
            {"read_only", descriptor.is_read_only()},
            {"any_bytes", descriptor.is_any_bytes},
            {"bytes", descriptor.bytes}};
  add_names(said, descriptor);
  add_default(said, descriptor);
  said["words"] = descriptor.words;
  said["frames"] = descriptor.frames_obey_it ? "obey" : "kept";
  if (!descriptor.beyond_frames.empty()) {
    said["beyond_frames"] = descriptor.beyond_frames;
  }
  return said;
}

Json option_to_json(RuntimeOption const &option) {
  Json said{{"name", option.name}};
  std::visit([&](auto const &value) { said["default"] = value; }, option.initial);
  if (option.is_number()) {
    said["least"] = option.least;
    said["greatest"] = option.greatest;
  }
  return said;
}

// The members of an object that is no setting, with the values that a new one has.
template <typename Object>
Json object_to_json(std::span<Member const> members, Object const *unless_given) {
  return form_to_json(form::record<Object>(members), unless_given)["members"];
}

Json objects_to_json() {
  Link const link;
  auto const made = new_switch();
  PortMembers const port;
  UplinkPortMembers const uplink_port;
  auto const address = new_address();
  McastGroup const group{};
  FaultMembers const fault;
  return {{keys::clock, object_to_json<ClockMembers>(kClockMembers, nullptr)},
          {keys::underlay, object_to_json<UnderlayMembers>(kUnderlayMembers, nullptr)},
          {keys::uplinks, object_to_json(kLinkMembers, &link)},
          {keys::mac_learning, object_to_json(kGlobalLearningMembers, &kGlobalLearning)},
          {keys::switches, object_to_json(kSwitchMembers, &made)},
          {keys::ports, object_to_json(kPortMembers, &port)},
          {keys::uplink_ports, object_to_json(kUplinkPortMembers, &uplink_port)},
          {keys::fabric, object_to_json<FabricSpec>(kFabricMembers, nullptr)},
          {keys::lags, object_to_json<LagMembers>(kLagMembers, nullptr)},
          {keys::addresses, object_to_json(kAddressMembers, &address)},
          {keys::groups, object_to_json(kGroupMembers, &group)},
          {keys::faults, object_to_json(kFaultMembers, &fault)}};
}

}  // namespace

std::string reference() {
  Json all{{"properties", Json::array()},
           {"longest_key", kLongestKey},
           {"runtime_options", Json::array()},
           {"objects", objects_to_json()},
           {"keys",
            {{"document", kDocumentParts},
             {keys::switches, kSwitchParts},
             {keys::ports, kPortParts},
             {keys::uplink_ports, kUplinkPortParts},
             {keys::uplinks, {kName, keys::device, kObserved}}}}};
  for (auto const *const descriptor : descriptors()) {
    all["properties"].push_back(property_to_json(*descriptor));
  }
  for (auto const &option : runtime_options()) {
    all["runtime_options"].push_back(option_to_json(option));
  }
  return all.dump(1) + "\n";
}

}  // namespace simhost::scenario
