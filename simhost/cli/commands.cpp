// Words on the command line: numbers are read as scenario documents read theirs.
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

std::function<std::string(std::string const &)> decimal_number() {
  return [](std::string const &text) -> std::string {
    static constexpr std::size_t kDigits = 12;
    static constexpr std::size_t kDecimals = 3;
    auto const point = text.find('.');
    auto const decimals = point == std::string::npos ? "0" : text.substr(point + 1);
    bool const is_decimal = are_digits(text.substr(0, point)) && are_digits("1" + decimals) &&
                            !decimals.empty() && decimals.size() <= kDecimals;
    if (!is_decimal) {
      return fmt::format("'{}' is no number such as 3 or 0.25", text);
    }
    return text.substr(0, point).size() > kDigits
               ? fmt::format("{} has more than {} digits", text, kDigits)
               : "";
  };
}

std::function<std::string(std::string const &)> one_of(std::string const &one,
                                                       std::string const &other) {
  return [one, other](std::string const &word) -> std::string {
    return word == one || word == other
               ? ""
               : fmt::format("'{}' is neither {} nor {}", word, one, other);
  };
}

std::string text_of(nlohmann::ordered_json const &document) {
  try {
    return document.dump();
  } catch (nlohmann::ordered_json::exception const &) {
    throw Failure("a word is no UTF-8");
  }
}

std::string printable(std::string_view text) {
  std::string shown;
  for (std::size_t at = 0; at < text.size(); ++at) {
    auto const byte = static_cast<unsigned char>(text[at]);
    // The second set of control characters has this byte first.
    bool const is_second_set = byte == 0xC2 && at + 1 < text.size() &&
                               static_cast<unsigned char>(text[at + 1]) >= 0x80 &&
                               static_cast<unsigned char>(text[at + 1]) < 0xA0;
    if (is_second_set) {
      shown += fmt::format("\\xc2\\x{:02x}", static_cast<unsigned char>(text[++at]));
    } else if (byte < 0x20 || byte == 0x7F) {
      shown += fmt::format("\\x{:02x}", byte);
    } else {
      shown += text[at];
    }
  }
  return shown;
}

std::string whole_text(std::function<std::size_t(char *text, std::size_t size)> const &copy_out) {
  // Room for most: to ask for the size alone takes as long as to have the text.
  std::string text(std::size_t{1} << 20, '\0');
  while (true) {
    auto const size = copy_out(text.data(), text.size());
    if (size == 0) {
      throw Failure(simhost_error());
    }
    if (size < text.size()) {
      text.resize(size);
      return text;
    }
    // Until it is asked again, another process may have made more of the host.
    text.resize(size * 2);
  }
}

}  // namespace simhost::cli
