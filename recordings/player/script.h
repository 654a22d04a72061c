// A trace as it is played: its calls and callbacks in the order in which they began, and where in
// the file each of them is told.
//
// A trace may come from anywhere: nothing of it is believed before it has been looked at.
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "recordings/core/decoded.h"
#include "recordings/core/shapes.h"

namespace recordings {

/// A file that cannot be played: "line 7: what is wrong".
class Unplayable : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

/// A call, or a callback during one.
struct Event {
  std::size_t line;                  ///< of its begin, from 1 on
  std::size_t part;                  ///< the process that it is of
  std::uint64_t thread;              ///< of that
  Call const *call;                  ///< null for a callback
  std::optional<std::size_t> outer;  ///< what it is within
  std::vector<std::size_t> inner;    ///< what is within it, in order
  std::size_t number;                ///< of a call: how many calls are before it in the trace
  std::string_view begin;            ///< the line
  std::string_view end;              ///< likewise; empty if it did not end
};

/// What one process did.
struct Part {
  std::int64_t process;
  std::map<std::uint64_t, std::vector<std::size_t>> threads;  ///< the calls of each, in order
};

class Script {
 public:
  /// Reads the text of a trace.
  explicit Script(std::string text);

  /// Whether all values are what the tables say; those that the recorder could not read are.
  void check_values() const;

  [[nodiscard]] std::vector<Event> const &events() const { return events_; }
  [[nodiscard]] std::vector<Part> const &parts() const { return parts_; }
  [[nodiscard]] std::size_t calls() const { return calls_; }

 private:
  friend class ScriptReader;

  std::string text_;
  std::vector<Event> events_;
  std::vector<Part> parts_;
  std::size_t calls_ = 0;
};

/// The text of a trace in a file.
std::string text_of_file(std::string const &path);

}  // namespace recordings
