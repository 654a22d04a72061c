// What stands in the way of what is wanted: told when it comes up, and kept for those who ask.
#pragma once

#include <functional>
#include <set>
#include <string>

namespace simhost::daemon {

/// For operators: one line for each thing that they may want to know.
using Say = std::function<void(std::string const &)>;

class Troubles {
 public:
  explicit Troubles(Say say) : say_(std::move(say)) {}

  /// Whatever is not added again from now on is over.
  void look_again();
  /// Says it if it was not there at the last look.
  void add(std::string const &text);
  /// All of them; empty if there are none.
  [[nodiscard]] std::string text() const;

 private:
  Say say_;
  std::set<std::string> before_;
  std::set<std::string> now_;
};

}  // namespace simhost::daemon
