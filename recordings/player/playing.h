// A trace that is being played in this process: which of its calls a call is, and what that left.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <set>
#include <span>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "recordings/player/comparison.h"
#include "recordings/player/ending.h"
#include "recordings/player/holdings.h"
#include "recordings/player/ledger.h"
#include "recordings/player/names.h"
#include "recordings/player/player.h"
#include "recordings/player/script.h"

namespace recordings {

/// A call that cannot be played: why, in words.
class Unplayed : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

/// How far a thread of the tool is.
struct ThreadPlace {
  std::optional<std::uint64_t> thread;  ///< of the trace
  std::size_t next = 0;                 ///< of its calls
};

/// A call in progress.
struct InProgress {
  void const *frame;
  std::size_t event;
  std::size_t inner;                    ///< how many of its callbacks were played
  std::optional<std::size_t> callback;  ///< that is being played
  bool is_again;                        ///< all calls like it were made
};

/// What the host called back.
struct Callback {
  enum class Kind : std::uint8_t { visit, alloc, release };

  Kind kind;
  void *function;
  std::uint64_t first;
  std::uint64_t second;
};

/// Calls that are asked for in the same words.
struct Alike {
  std::vector<std::size_t> events;
  std::size_t made = 0;  ///< how many of them, from the first on, need no more look
};

class Playing {
 public:
  Playing(std::string const &trace, std::string const &ledger, By by);

  /// Finds the call that is being made; `outer` is the callback that makes it.
  InProgress begin(ThreadPlace &place, Call const &call, Words words,
                   std::optional<std::size_t> outer);

  /// What the host calls back next; nothing if it has called back for the last time.
  std::optional<Callback> next_callback(InProgress &call, Words words);

  /// What the tool returned.
  void end_callback(ThreadPlace const &place, InProgress &call, std::uint64_t result);

  /// What the call left is in its place, and what it returned is told.
  Ending end(InProgress const &progress, Words words);

  void note_failure(std::string const &words);
  [[nodiscard]] std::string const &first_failure() const { return first_failure_; }

  /// What was given out, which a tool may still have when nothing is played any more.
  [[nodiscard]] Holdings take_holdings() { return std::move(holdings_); }

  /// This process is a child of that one: it has a part of its own.
  void be_child() { part_.reset(); }

 private:
  [[nodiscard]] Json inputs_of(Event const &event) const;
  [[nodiscard]] std::string line_of(Event const &event) const;

  void claim(Call const &call, Json const &asked);
  [[nodiscard]] bool can_begin(std::size_t part, Call const &call, Json const &asked) const;
  [[nodiscard]] bool is_it(Event const &event, Call const &call, Json const &asked) const;

  void take_thread(ThreadPlace &place, Call const &call, Json const &asked);
  InProgress by_order(ThreadPlace &place, Call const &call, Json const &asked,
                      std::optional<std::size_t> outer);
  InProgress by_arguments(Call const &call, Json const &asked);
  [[nodiscard]] std::string key_of(std::size_t part, Call const &call, Json const &inputs) const;

  [[noreturn]] void refuse(Call const &call, Json const &asked, Event const *next) const;
  [[nodiscard]] Event const *nearest(Call const &call, Json const &asked) const;
  [[nodiscard]] Event const *first_that_nobody_made() const;

  void note_own_pointers(Call const &call, Json const &recorded, Words words);
  [[nodiscard]] std::uint64_t pointer(Json const &given);
  [[nodiscard]] void *function(Event const &call, Words words, std::string_view name);
  void place_outputs(Call const &call, Json const &in, Json const &end, Words words, bool is_again);
  [[nodiscard]] std::uint64_t returned(Call const &call, Json const &end);

  std::string trace_;  ///< the name of the file
  Script script_;
  Ledger ledger_;
  By by_;
  Holdings holdings_;
  Names names_;
  std::optional<std::size_t> part_;
  std::set<std::uint64_t> taken_threads_;
  /// By process, function and inputs.
  std::unordered_map<std::string, Alike> alike_;
  std::string first_failure_;
};

}  // namespace recordings
