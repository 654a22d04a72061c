// By the cookies and the form of what is taught.
#include "daemon/learned/taught.h"

#include <utility>

#include "planes/openvswitch/compile/pipeline.h"

namespace simhost::daemon {
namespace {

openvswitch::Counted taught_in(std::uint8_t table) {
  using openvswitch::Counted;
  switch (table) {
    case openvswitch::table::kFirstAddresses:
      return Counted::first_address;
    case openvswitch::table::kLearnedAddresses:
      return Counted::learned;
    case openvswitch::table::kRecentSources:
      return Counted::recent_source;
    case openvswitch::table::kMovedSources:
      return Counted::moved_source;
    case openvswitch::table::kPortsWithFirst:
      return Counted::port_with_first;
    case openvswitch::table::kRefusedSources:
      return Counted::refused_source;
    default:
      return Counted::counted_source;
  }
}

}  // namespace

void Taught::have(std::shared_ptr<openvswitch::Compiled const> flows) {
  flows_ = std::move(flows);
  teachers_.reset();
}

Origin Taught::origin_of(openflow::ReadFlow const &read) {
  if (!read.foreign.empty()) {
    return Origin::foreign;
  }
  if (!teachers_) {
    teachers_.emplace(flows_->flows);
  }
  if (teachers_->teach(read.flow)) {
    return Origin::taught;
  }
  bool const is_of_kind = openvswitch::kind_of(read.flow.cookie) == taught_in(read.flow.table);
  return is_of_kind ? Origin::outdated : Origin::foreign;
}

}  // namespace simhost::daemon
