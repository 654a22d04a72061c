// A program that runs as a child of this process, and no longer than this process does.
#pragma once

#include <functional>
#include <map>
#include <string>
#include <vector>

#include "events/loop.h"

namespace simhost::events {

/// A program and its words; what is in `environment` is set beside what this process has.
struct Command {
  std::string program;
  std::vector<std::string> words;
  std::map<std::string, std::string> environment;
};

class Process {
 public:
  /// Starts it; `ended` is called when it has ended by itself, with how. It does nothing any more
  /// then, but the kernel may go on closing what it had open: one socket that takes whole frames
  /// after the other, some seventy a second.
  Process(Loop &loop, Command const &command, std::function<void(std::string)> ended);
  /// Ends it at once if it still runs.
  ~Process();
  Process(Process const &) = delete;
  Process &operator=(Process const &) = delete;

  [[nodiscard]] int id() const { return id_; }
  /// A descriptor that is at its end as soon as it is about to end. It tells nothing any more once
  /// the program has closed its own end and gone on.
  [[nodiscard]] int life() const { return life_.number(); }
  /// Asks it to end, and ends it if it has not done so in that time. It runs no more after that;
  /// what it had open may still be closed once as much time has gone again: is_gone() tells.
  void end(Clock::duration patience);
  /// Ends it at once, and waits for nothing. Nobody is told.
  void kill();
  /// Whether it has ended, and nothing of it is open any more.
  [[nodiscard]] bool is_gone() const { return !runs_; }

 private:
  void read_life();
  void tell(std::string const &how);
  [[nodiscard]] bool is_gone_within(Clock::duration patience) const;
  std::string reap();

  // One end of a pipe of which the program has the other one: it is told by that when it is about
  // to end.
  struct Start {
    int id;
    Descriptor life;
  };
  static Start start(Command const &command);
  Process(Loop &loop, Start start, std::function<void(std::string)> ended);

  int id_;
  bool runs_ = true;
  bool is_left_ = false;  // to the kernel, which needs nobody who waits for it
  Descriptor life_;
  Descriptor descriptor_;
  std::function<void(std::string)> ended_;
  Loop::Watch life_watch_;
  Loop::Watch watch_;
};

/// Whether the kernel takes a process down, or has done so: it may still close what that had open.
bool is_ending(int process);

/// Runs a program to its end. Throws std::runtime_error, with what it said, if it failed.
void run(Command const &command);

}  // namespace simhost::events
