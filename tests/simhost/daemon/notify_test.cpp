// A service manager that listens at a socket of the abstract kind, which is no file.
#include "daemon/notify.h"

#include <gmock/gmock.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <array>
#include <cstddef>
#include <cstdlib>
#include <iterator>
#include <string>

#include "events/descriptor.h"

namespace {

TEST(AServiceManager, IsToldAtAnAbstractSocket) {
  auto const name = "simhost-notify-" + std::to_string(getpid());
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  name.copy(std::next(std::begin(address.sun_path)), name.size());
  auto const size = offsetof(sockaddr_un, sun_path) + 1 + name.size();
  simhost::events::Descriptor const manager(socket(AF_UNIX, SOCK_DGRAM | SOCK_NONBLOCK, 0));
  ASSERT_EQ(bind(manager.number(), reinterpret_cast<sockaddr const *>(&address),
                 static_cast<socklen_t>(size)),
            0);
  setenv("NOTIFY_SOCKET", ("@" + name).c_str(), 1);
  simhost::daemon::notify("READY=1");
  unsetenv("NOTIFY_SOCKET");
  std::array<char, 16> said{};
  ASSERT_EQ(recv(manager.number(), said.data(), said.size(), 0), 7);
  EXPECT_STREQ(said.data(), "READY=1");
}

}  // namespace
