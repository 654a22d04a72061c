// One datagram to a unix socket, of the abstract kind if its name begins with @.
#include "daemon/notify.h"

#include <sys/socket.h>
#include <sys/un.h>

#include <cstddef>
#include <cstdlib>
#include <string_view>

#include "events/descriptor.h"

namespace simhost::daemon {

void notify(std::string const &assignments) {
  char const *const named = std::getenv("NOTIFY_SOCKET");
  std::string_view const name = named == nullptr ? "" : named;
  sockaddr_un address{};
  auto &path = address.sun_path;
  if (name.empty() || name.size() >= sizeof path) {
    return;
  }
  address.sun_family = AF_UNIX;
  name.copy(static_cast<char *>(path), name.size());
  if (name.front() == '@') {
    path[0] = '\0';
  }
  events::Descriptor const socket_(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
  auto const size = offsetof(sockaddr_un, sun_path) + name.size();
  // Nobody waits for this process then, and it goes on.
  static_cast<void>(sendto(socket_.number(), assignments.data(), assignments.size(), MSG_NOSIGNAL,
                           reinterpret_cast<sockaddr const *>(&address),
                           static_cast<socklen_t>(size)));
}

}  // namespace simhost::daemon
