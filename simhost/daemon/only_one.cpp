// A lock of a record, because the kernel tells who holds those.
#include "daemon/only_one.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>

#include <stdexcept>

namespace simhost::daemon {

events::Descriptor lock(std::filesystem::path const &file) {
  auto descriptor = events::owned(
      open(file.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR),
      file.c_str());
  struct flock wanted {};
  wanted.l_type = F_WRLCK;
  wanted.l_whence = SEEK_SET;
  if (fcntl(descriptor.number(), F_SETLK, &wanted) == 0) {
    return descriptor;
  }
  fcntl(descriptor.number(), F_GETLK, &wanted);
  throw std::runtime_error(fmt::format("the process {} has {}", wanted.l_pid, file.string()));
}

}  // namespace simhost::daemon
