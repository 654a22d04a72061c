#include "daemon/troubles.h"

#include <fmt/ranges.h>

#include <utility>

namespace simhost::daemon {

void Troubles::look_again() {
  before_ = std::exchange(now_, {});
}

void Troubles::add(std::string const &text) {
  if (now_.insert(text).second && !before_.contains(text)) {
    say_(text);
  }
}

std::string Troubles::text() const {
  return fmt::format("{}", fmt::join(now_, "; "));
}

}  // namespace simhost::daemon
