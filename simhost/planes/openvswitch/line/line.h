// What the processes that use a state and the daemon that moves its frames say to each other: one
// JSON text per line, over a unix socket beside the state. Each question is replied to once.
#pragma once

#include <chrono>
#include <cstddef>
#include <filesystem>
#include <nlohmann/json.hpp>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>

namespace simhost::openvswitch {

using Json = nlohmann::json;

/// No daemon is there, or it says nothing in time, or nothing that could be understood.
class NoDaemon : public std::runtime_error {
  using std::runtime_error::runtime_error;
};

/// Nobody listens, so that nothing was asked.
class NobodyListens : public NoDaemon {
  using NoDaemon::NoDaemon;
};

/// The socket of the daemon of a state.
std::filesystem::path socket_of(std::filesystem::path const &state);

/// Of a line; more is no line of ours.
inline constexpr std::size_t kLongestLine = std::size_t{16} << 20;

/// Takes lines apart as their bytes come. Throws NoDaemon for a line that is too long.
class Lines {
 public:
  void add(std::string_view bytes) { left_ += bytes; }
  /// The next whole line, without its end.
  std::optional<std::string> next();

 private:
  std::string left_;
  std::size_t searched_ = 0;
};

/// Asks whoever listens at a socket, and waits for the reply no longer than that. Throws NoDaemon.
Json ask_at(std::filesystem::path const &socket, Json const &question,
            std::chrono::milliseconds patience);
/// Likewise the daemon of a state.
Json ask(std::filesystem::path const &state, Json const &question,
         std::chrono::milliseconds patience);

}  // namespace simhost::openvswitch
