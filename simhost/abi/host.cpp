// One host per process, through forks and up to its end.
#include "abi/host.h"

#include <pthread.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string_view>
#include <system_error>

#include "abi/fresh_host.h"
#include "model/plane.h"
#include "model/sharing.h"
#include "planes/stored/stored_plane.h"

namespace simhost {
namespace {

// An open state file must not cross a fork: file locks stay with the parent while the child's copy
// of the connection believes to hold them, and the log would be deleted under the child's feet. So
// it is closed before, and each side opens it again when it needs it.
void before_fork() {
  this_host().lock().lock();
  this_host().close_state_file();
}

void after_fork() {
  this_host().lock().unlock();
}

// Absolute, because it may be opened again after the process has changed its directory.
std::filesystem::path absolute(std::filesystem::path const &named) {
  std::error_code error;
  auto file = std::filesystem::absolute(named, error);
  if (error) {
    storage::refuse_file(named, "the current folder: " + error.message());
  }
  return file;
}

// Asked for by a test that wants to know what it forgot to release.
void report_ledger(Ledger const &ledger) {
  char const *const asked = std::getenv("SIMHOST_LEDGER");
  if (asked != nullptr && std::string_view(asked) == "1" && ledger.count() > 0) {
    std::fprintf(stderr, "simulated host: not given back:\n%s", ledger.summary().c_str());
  }
}

// Closing the last connection folds the log into the state file, so that the file alone is the
// state when no process uses it.
struct CloseAtExit {
  ~CloseAtExit() {
    std::scoped_lock const held(this_host().lock());
    report_ledger(this_host().ledger());
    this_host().close_state_file();
  }
};

Host *new_host() {
  run_on(stored::plane());
  pthread_atfork(before_fork, after_fork, after_fork);
  return new Host;
}

}  // namespace

std::optional<storage::StateFile> const &Host::state_file() {
  if (!configured_) {
    if (char const *const named = std::getenv("SIMHOST_STATE");
        named != nullptr && *named != '\0') {
      state_file_ = absolute(named);
    }
    configured_ = true;
  }
  return state_file_;
}

storage::Store &Host::state() {
  auto const &file = state_file();
  if (state_ && !state_->is_current()) {
    state_.reset();
  }
  if (!state_) {
    state_.emplace(file, populate_fresh_host);
    if (file) {
      run_on(plane_.emplace(stored::plane(), file->location()));
      share_through(&sharing_.emplace(file->location()));
    }
  }
  if (plane_) {
    plane_->begin_call();
  }
  return *state_;
}

void Host::close_state_file() {
  if (state_file_) {
    state_.reset();
  }
}

Host &this_host() {
  // Never destroyed: other threads and the exit handlers of others may still call.
  static Host &host = *new_host();
  static CloseAtExit const close_at_exit;
  return host;
}

}  // namespace simhost
