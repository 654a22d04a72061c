// Hexadecimal digits, or words in any order.
#include "cli/frame_words.h"

#include <charconv>
#include <map>
#include <optional>
#include <set>
#include <string_view>

#include "cli/commands.h"

namespace simhost::cli {
namespace {

using Bytes = std::vector<std::uint8_t>;

constexpr std::size_t kShortest = 14;
constexpr std::uint64_t kLongest = 65535;
constexpr std::uint64_t kUsual = 60;
constexpr std::uint64_t kLastVlan = 4095;
constexpr std::uint64_t kLastPriority = 7;
constexpr unsigned kPriorityBit = 13;
constexpr std::uint16_t kTag = 0x8100;
// Of experiments.
constexpr std::uint64_t kNoProtocol = 0x88b5;

template <typename Number>
std::optional<Number> whole(std::string_view text, int base) {
  Number number{};
  auto const *const end = text.data() + text.size();
  auto const read = std::from_chars(text.data(), end, number, base);
  return read.ec == std::errc{} && read.ptr == end ? std::optional(number) : std::nullopt;
}

Bytes from_digits(std::string const &word) {
  std::string digits;
  for (char const one : word) {
    if (one != ':' && one != ' ') {
      digits += one;
    }
  }
  Bytes bytes;
  for (std::size_t at = 0; at < digits.size(); at += 2) {
    auto const byte = whole<std::uint8_t>(std::string_view(digits).substr(at, 2), 16);
    if (!byte || at + 2 > digits.size()) {
      throw Failure("'" + word +
                    "' is no frame: neither bytes in hexadecimal nor words such as"
                    " dst=02:00:00:00:00:01");
    }
    bytes.push_back(*byte);
  }
  return bytes;
}

class Words {
 public:
  explicit Words(std::vector<std::string> const &words) {
    for (auto const &word : words) {
      auto const equals = word.find('=');
      auto const key = word.substr(0, equals);
      if (equals == std::string::npos || !kKeys.contains(key)) {
        throw Failure("'" + word + "' is none of dst=, src=, vlan=, priority=, type=, size=");
      }
      if (!words_.emplace(key, word.substr(equals + 1)).second) {
        throw Failure(key + "= is there twice");
      }
    }
  }

  [[nodiscard]] bool has(std::string const &key) const { return words_.contains(key); }

  [[nodiscard]] Bytes address(std::string const &key) const {
    auto const found = words_.find(key);
    if (found == words_.end()) {
      throw Failure("a frame has " + key + "=");
    }
    auto const &text = found->second;
    Bytes bytes;
    constexpr std::size_t kTextOfAddress = 17;
    for (std::size_t at = 0; text.size() == kTextOfAddress && at < text.size(); at += 3) {
      auto const byte = whole<std::uint8_t>(std::string_view(text).substr(at, 2), 16);
      bool const ends_well = at + 2 == text.size() || text[at + 2] == ':';
      if (!byte || !ends_well) {
        break;
      }
      bytes.push_back(*byte);
    }
    constexpr std::size_t kAddress = 6;
    if (bytes.size() != kAddress) {
      throw Failure(key + "=" + text + ": no address such as 02:00:00:00:00:01");
    }
    return bytes;
  }

  [[nodiscard]] std::uint64_t number(std::string const &key, std::uint64_t otherwise,
                                     std::uint64_t greatest) const {
    auto const found = words_.find(key);
    if (found == words_.end()) {
      return otherwise;
    }
    std::string_view text = found->second;
    int const base = text.starts_with("0x") ? 16 : 10;
    text.remove_prefix(base == 16 ? 2 : 0);
    auto const number = whole<std::uint64_t>(text, base);
    if (!number || *number > greatest) {
      throw Failure(key + "=" + found->second + ": no number up to " + std::to_string(greatest));
    }
    return *number;
  }

 private:
  static inline std::set<std::string> const kKeys{"dst", "src", "vlan", "priority", "type", "size"};
  std::map<std::string, std::string> words_;
};

void append_pair(Bytes &frame, std::uint64_t pair) {
  constexpr unsigned kByte = 8;
  frame.push_back(static_cast<std::uint8_t>(pair >> kByte));
  frame.push_back(static_cast<std::uint8_t>(pair));
}

Bytes from_words(Words const &words) {
  auto frame = words.address("dst");
  auto const source = words.address("src");
  frame.insert(frame.end(), source.begin(), source.end());
  if (words.has("vlan") || words.has("priority")) {
    append_pair(frame, kTag);
    append_pair(frame, words.number("priority", 0, kLastPriority) << kPriorityBit |
                           words.number("vlan", 0, kLastVlan));
  }
  append_pair(frame, words.number("type", kNoProtocol, UINT16_MAX));
  auto const size = words.number("size", kUsual, kLongest);
  if (size < frame.size()) {
    throw Failure("size=" + std::to_string(size) + ": the header has " +
                  std::to_string(frame.size()) + " bytes");
  }
  frame.resize(size);
  return frame;
}

}  // namespace

Bytes frame_from(std::vector<std::string> const &words) {
  if (words.size() == 1 && words.front().find('=') == std::string::npos) {
    auto frame = from_digits(words.front());
    if (frame.size() < kShortest || frame.size() > kLongest) {
      throw Failure("a frame has 14 to 65535 bytes, not " + std::to_string(frame.size()));
    }
    return frame;
  }
  return from_words(Words(words));
}

}  // namespace simhost::cli
