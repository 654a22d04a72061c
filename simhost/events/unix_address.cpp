// Through a descriptor of the folder: an address has room for little more than a hundred bytes.
#include "events/unix_address.h"

#include <fcntl.h>

#include <iterator>
#include <string>

namespace simhost::events {
namespace {

Descriptor folder_of(std::filesystem::path const &socket) {
  auto const folder = socket.has_parent_path() ? socket.parent_path() : ".";
  return owned(open(folder.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC), folder.c_str());
}

}  // namespace

UnixAddress::UnixAddress(std::filesystem::path const &socket) : folder_(folder_of(socket)) {
  auto const path =
      "/proc/self/fd/" + std::to_string(folder_.number()) + "/" + socket.filename().string();
  if (path.size() >= sizeof address_.sun_path) {
    errno = ENAMETOOLONG;
    fail_with_errno(socket.string());
  }
  address_.sun_family = AF_UNIX;
  path.copy(std::begin(address_.sun_path), path.size());
}

}  // namespace simhost::events
