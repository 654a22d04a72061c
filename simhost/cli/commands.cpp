// Numbers on the command line, read as scenario documents read theirs.
#include "cli/commands.h"

#include <fmt/format.h>

#include <algorithm>
#include <charconv>
#include <string_view>
#include <system_error>

namespace simhost::cli {
namespace {

// The parser's own reading takes signs, and a zero in front for another base.
bool are_digits(std::string_view text) {
  auto const is_digit = [](char letter) { return letter >= '0' && letter <= '9'; };
  return !text.empty() && (text.front() != '0' || text.size() == 1) &&
         std::all_of(text.begin(), text.end(), is_digit);
}

}  // namespace

std::function<std::string(std::string const &)> whole_number(std::uint64_t least,
                                                             std::uint64_t greatest) {
  return [least, greatest](std::string const &digits) -> std::string {
    if (!are_digits(digits)) {
      return fmt::format("'{}' is no whole number, {} or more", digits, least);
    }
    std::uint64_t number = 0;
    auto const read = std::from_chars(digits.data(), digits.data() + digits.size(), number);
    if (read.ec == std::errc::result_out_of_range || number > greatest) {
      return fmt::format("{} is above {}", digits, greatest);
    }
    return number < least ? fmt::format("{} is below {}", digits, least) : "";
  };
}

}  // namespace simhost::cli
