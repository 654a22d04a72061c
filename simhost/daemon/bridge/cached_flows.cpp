// Asked of its control socket: OpenFlow has no word for it.
#include "daemon/bridge/cached_flows.h"

#include <chrono>

#include "planes/openvswitch/trace/control.h"

namespace simhost::daemon {

void forget_cached_flows(std::filesystem::path const &folder) {
  using namespace std::chrono_literals;
  constexpr auto kPatience = 2s;
  openvswitch::ask_control(openvswitch::find_control_socket(folder), "revalidator/purge", {},
                           openvswitch::Deadline::clock::now() + kPatience);
}

}  // namespace simhost::daemon
