// Texts in which a tool puts the number of its process, such as those of what it makes for a time:
// in each process they are others.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <vector>

#include "recordings/core/decoded.h"

namespace recordings {

class Names {
 public:
  /// A process of the trace is this one now.
  void note_process(std::int64_t recorded, std::int64_t now);

  /// Whether a text is the recorded one, but for such a number.
  [[nodiscard]] bool are_same(std::string_view recorded, std::string_view asked) const;

  /// Notes which texts are such, of inputs that are the same.
  void learn(Json const &recorded, Json const &asked);

  /// Recorded values with the texts of now.
  [[nodiscard]] Json of_now(Json const &recorded) const;

  /// Values of now with recorded texts.
  [[nodiscard]] Json as_recorded(Json const &asked) const;

 private:
  std::vector<std::pair<std::string, std::string>> processes_;  ///< digits, recorded and now
  std::unordered_map<std::string, std::string> now_;            ///< by what was recorded
};

}  // namespace recordings
