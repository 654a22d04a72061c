// What a player has given out for what a trace calls by numbers, and what a tool gave of its own.
#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <memory>
#include <optional>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "recordings/core/decoded.h"

namespace recordings {

/// The functions that a list was made with.
struct ListFunctions {
  void *alloc;
  void *release;
};

class Holdings {
 public:
  /// The address that stands for a number, which is made if there is none.
  [[nodiscard]] std::uint64_t address_of(std::uint64_t number);

  /// Memory with these bytes for a number. Where the number has memory that is as long, it is that,
  /// unless it is to be new.
  [[nodiscard]] std::uint64_t give(std::uint64_t number, Bytes const &bytes, bool is_new);

  /// The tool's own memory stands for a number: what it allocated for the host.
  void adopt(std::uint64_t number, std::uint64_t address, std::size_t size);

  /// A pointer of the tool's own, which a call was given; it may be another one the next time.
  void note_own(std::uint64_t number, std::uint64_t address) { own_[number] = address; }

  /// The number that was given out with an address, until what is there is released.
  [[nodiscard]] std::optional<std::uint64_t> number_of(std::uint64_t address) const;

  /// Whether something was given out for a number.
  [[nodiscard]] bool has(std::uint64_t number) const { return addresses_.contains(number); }

  /// What is at an address ends. Nothing else gets that address for long, so that whoever uses it
  /// still is told.
  void release(std::uint64_t address);

  /// A text that stays where it is.
  [[nodiscard]] char const *text(std::string const &text);

  void keep_functions(std::uint64_t list, ListFunctions functions);
  [[nodiscard]] ListFunctions functions_of(std::uint64_t list) const;

  /// Whether an address was ever given out by this.
  [[nodiscard]] bool is_of_this(std::uint64_t address) const { return blocks_.contains(address); }

 private:
  struct Block {
    std::unique_ptr<char[]> bytes;
    std::size_t size;
  };
  struct Held {
    std::uint64_t number;
    std::size_t size;
  };

  std::uint64_t allocate(std::size_t size);
  std::optional<std::uint64_t> forget(std::uint64_t address);
  void retire(std::uint64_t address);
  void remember(std::uint64_t number, std::uint64_t address, std::size_t size);

  std::unordered_map<std::uint64_t, Block> blocks_;  ///< all that is allocated
  std::deque<std::uint64_t> released_;               ///< of those, the oldest first
  std::size_t released_bytes_ = 0;
  std::unordered_map<std::uint64_t, Held> held_;  ///< by address, what is given out
  /// By number; each address of these is in held_, with that number.
  std::unordered_map<std::uint64_t, std::uint64_t> addresses_;
  std::unordered_map<std::uint64_t, std::uint64_t> own_;
  std::unordered_set<std::string> texts_;
  std::unordered_map<std::uint64_t, ListFunctions> functions_;
  ListFunctions last_functions_{};
};

}  // namespace recordings
