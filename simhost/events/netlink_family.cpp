// The one family that is always there knows the others.
#include "events/netlink_family.h"

#include <linux/genetlink.h>

#include <span>
#include <string>

#include "events/netlink_request.h"

namespace simhost::events {

bool has_netlink_family(std::string_view name) {
  genlmsghdr const question{.cmd = CTRL_CMD_GETFAMILY, .version = 1, .reserved = 0};
  NetlinkRequest asked(GENL_ID_CTRL, 0, question);
  std::string const text(name);
  // With the zero at its end.
  asked.with(CTRL_ATTR_FAMILY_NAME, std::as_bytes(std::span(text.c_str(), text.size() + 1)));
  return error_in(asked.exchanged(NETLINK_GENERIC)) == 0;
}

}  // namespace simhost::events
