// An Open vSwitch of our own: its two processes in a folder, watched, and gone with this process.
#pragma once

#include <filesystem>
#include <functional>
#include <memory>
#include <set>
#include <stdexcept>
#include <string>
#include <vector>

#include "events/process.h"

namespace simhost::openvswitch {

/// Which of Open vSwitch's data paths moves the frames.
enum class Datapath { netdev, system };

/// Throws std::runtime_error, which names the package to install, if a private Open vSwitch cannot
/// be run for want of it.
void require_package();

/// If one of the two processes ends by itself, both are started anew: the switch without its
/// database stops all frames, and finds back to it more slowly than it starts.
class PrivateOpenVswitch {
 public:
  struct Told {
    /// The database takes connections; the switch has been started, and reads it.
    std::function<void()> started;
    /// One of them has ended, and the other one is of no use: connections to either may stay open
    /// for a while, and nobody replies.
    std::function<void()> ended;
    /// A sentence for the log.
    std::function<void(std::string const &)> said;
  };

  /// Makes the folder if it is not there. Throws std::runtime_error if it cannot be used or another
  /// process uses it.
  PrivateOpenVswitch(events::Loop &loop, std::filesystem::path const &folder, Datapath datapath,
                     Told told);
  /// Ends both processes, in order.
  ~PrivateOpenVswitch();
  PrivateOpenVswitch(PrivateOpenVswitch const &) = delete;
  PrivateOpenVswitch &operator=(PrivateOpenVswitch const &) = delete;

  void start();
  /// Descriptors that are at their end as soon as one of the two is about to end; open until
  /// somebody was told that it has.
  [[nodiscard]] std::vector<int> lives() const;

 private:
  void create_database();
  void start_database();
  void start_switch_when_database_is_there();
  void start_switch();
  void restart(std::string const &why);
  void start_anew();
  void start_later(std::runtime_error const &obstacle);
  void leave_both();
  void leave(std::unique_ptr<events::Process> process);
  [[nodiscard]] events::Command command(std::string const &program,
                                        std::vector<std::string> words) const;

  events::Loop &loop_;
  std::filesystem::path folder_;
  Datapath datapath_;
  Told told_;
  events::Descriptor lock_;
  std::set<std::string> devices_of_others_;
  std::unique_ptr<events::Process> database_;
  std::unique_ptr<events::Process> switch_;
  // Killed, and not gone yet.
  std::vector<std::unique_ptr<events::Process>> left_;
  events::Clock::time_point started_;
  events::Clock::duration pause_ = {};
  events::Loop::Timer next_;
};

}  // namespace simhost::openvswitch
