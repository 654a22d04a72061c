// Open vSwitch tells nobody but its log why it makes none. What it mostly is, is told here.
#include "daemon/bridge/made_bridge.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <linux/if_tun.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>

#include "events/descriptor.h"
#include "events/netlink_family.h"

namespace simhost::daemon {

void require_made(WantedBridge const &wanted, std::filesystem::path const &socket) {
  if (access(socket.c_str(), F_OK) == 0) {
    return;
  }
  auto why = fmt::format("Open vSwitch does not make the bridge {} of the switch '{}'",
                         wanted.row.name, wanted.alias);
  constexpr auto *kTun = "/dev/net/tun";
  events::Descriptor const tun(open(kTun, O_RDWR | O_CLOEXEC));
  unsigned features = 0;
  if (wanted.row.datapath == "netdev" &&
      (!tun || ioctl(tun.number(), TUNGETFEATURES, &features) != 0)) {
    why += fmt::format(", for which it needs {}: {}", kTun, std::strerror(errno));
  }
  if (wanted.row.datapath == "system" && !events::has_netlink_family("ovs_datapath")) {
    why += ", for which it needs the kernel's module openvswitch";
  }
  throw std::runtime_error(why);
}

}  // namespace simhost::daemon
