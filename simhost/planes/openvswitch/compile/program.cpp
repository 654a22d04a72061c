// Tags, which ports and uplinks get alike.
#include "planes/openvswitch/compile/program.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;

openflow::Action priority_from_register() {
  return openflow::Move{.source = openflow::part(field::kPriority, 0, 2),
                        .destination = openflow::whole(Field::vlan_pcp)};
}

}  // namespace

Actions with_tag(Field vlan, Actions const &output) {
  Actions actions{
      openflow::PushVlan{},
      openflow::Move{.source = vlan_bits(vlan), .destination = openflow::whole(Field::vlan_vid)},
      priority_from_register()};
  append(actions, output).emplace_back(openflow::PopVlan{});
  return actions;
}

Actions with_priority_tag(Actions const &output) {
  Actions actions{openflow::PushVlan{}, openflow::set(Field::vlan_vid, openflow::kVlanPresent),
                  priority_from_register()};
  append(actions, output).emplace_back(openflow::PopVlan{});
  return actions;
}

}  // namespace simhost::openvswitch
