// Which calls of a trace were made, and which of its processes is which: in a file that the
// processes of a tool share.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace recordings {

class Ledger {
 public:
  Ledger() = default;
  Ledger(Ledger const &) = delete;
  Ledger &operator=(Ledger const &) = delete;
  ~Ledger();

  /// Whether the file is one for so many processes and calls.
  bool open(std::string const &path, std::size_t parts, std::size_t calls);

  /// Takes a process of the trace, if no other process of the tool has it.
  bool claim(std::size_t part);
  [[nodiscard]] bool is_claimed(std::size_t part) const;

  void note_made(std::size_t call);
  [[nodiscard]] bool is_made(std::size_t call) const;
  void note_failure();

 private:
  std::uint8_t *bytes_ = nullptr;
  std::size_t size_ = 0;
  std::size_t parts_ = 0;
};

}  // namespace recordings
