// Watching the log to which SQLite writes each transaction.
#include "daemon/state_watch.h"

#include <sys/inotify.h>

#include <array>
#include <utility>

namespace simhost::daemon {
namespace {

events::Descriptor watched(std::filesystem::path const &file) {
  auto inotify = events::owned(inotify_init1(IN_CLOEXEC | IN_NONBLOCK), "inotify_init1");
  auto log = file;
  log += "-wal";
  for (auto const &name : {file, log}) {
    if (inotify_add_watch(inotify.number(), name.c_str(), IN_MODIFY) < 0) {
      events::fail_with_errno(name.string());
    }
  }
  return inotify;
}

}  // namespace

StateWatch::StateWatch(events::Loop &loop, std::filesystem::path const &file,
                       std::function<void()> written)
    : inotify_(watched(file)),
      written_(std::move(written)),
      watch_(loop.watch(inotify_.number(), [this] {
        std::array<char, 4096> part{};
        while (read(inotify_.number(), part.data(), part.size()) > 0) {
        }
        written_();
      })) {}

}  // namespace simhost::daemon
