// What is asked of the daemon of a state while one call is made.
#pragma once

#include <filesystem>
#include <optional>

#include "planes/openvswitch/line/line.h"

namespace simhost::openvswitch {

/// A daemon that says nothing in time is asked no more in the same call, which so waits for it
/// once, however much it wants to know.
class Asking {
 public:
  explicit Asking(std::filesystem::path state);

  /// Another call begins.
  void begin() { none_.reset(); }
  /// What the daemon says. Throws NoDaemon.
  Json said(Json const &question);
  /// Its reply. Refuses: without a daemon (QEX_TIMEOUT), and what the daemon refuses
  /// (QEX_IO_ERROR).
  Json reply(Json const &question);
  /// Nothing without a daemon.
  std::optional<Json> reply_if_there(Json const &question);

 private:
  std::filesystem::path state_;
  std::optional<NoDaemon> none_;  // in this call
};

}  // namespace simhost::openvswitch
