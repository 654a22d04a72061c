// The address of a unix socket, however long the name of its folder is.
#pragma once

#include <sys/socket.h>
#include <sys/un.h>

#include <filesystem>

#include "events/descriptor.h"

namespace simhost::events {

/// Of the file `socket`, in the folder that has that name when this is made. Whatever is done with
/// the address is done while this lives.
class UnixAddress {
 public:
  /// Throws std::system_error if there is no such folder, or the name of the file is itself too
  /// long.
  explicit UnixAddress(std::filesystem::path const &socket);

  [[nodiscard]] sockaddr const *get() const {
    return reinterpret_cast<sockaddr const *>(&address_);
  }
  [[nodiscard]] socklen_t size() const { return sizeof address_; }
  /// The folder, for unlinkat(2) and its like.
  [[nodiscard]] int folder() const { return folder_.number(); }

 private:
  Descriptor folder_;
  sockaddr_un address_{};
};

}  // namespace simhost::events
