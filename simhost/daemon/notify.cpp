// One datagram to a unix socket, of the abstract kind if its name begins with @.
#include "daemon/notify.h"

#include <sys/socket.h>
#include <sys/un.h>

#include <cstddef>
#include <cstdlib>
#include <iterator>
#include <string_view>
#include <system_error>

#include "events/descriptor.h"
#include "events/unix_address.h"

namespace simhost::daemon {
namespace {

void send_to(sockaddr const *address, socklen_t size, std::string const &text) {
  events::Descriptor const socket_(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
  // Nobody waits for this process then, and it goes on.
  static_cast<void>(
      sendto(socket_.number(), text.data(), text.size(), MSG_NOSIGNAL, address, size));
}

void send_to_abstract(std::string_view name, std::string const &text) {
  sockaddr_un address{};
  if (name.size() > sizeof address.sun_path) {
    return;
  }
  address.sun_family = AF_UNIX;
  name.substr(1).copy(std::next(std::begin(address.sun_path)), name.size() - 1);
  send_to(reinterpret_cast<sockaddr const *>(&address),
          static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + name.size()), text);
}

}  // namespace

void notify(std::string const &assignments) try {
  char const *const named = std::getenv("NOTIFY_SOCKET");
  std::string_view const name = named == nullptr ? "" : named;
  if (name.starts_with('@')) {
    send_to_abstract(name, assignments);
  } else if (!name.empty()) {
    events::UnixAddress const address(name);
    send_to(address.get(), address.size(), assignments);
  }
} catch (std::system_error const &) {
  return;  // likewise
}

}  // namespace simhost::daemon
