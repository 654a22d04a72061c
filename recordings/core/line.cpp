#include "recordings/core/line.h"

#include <sys/mman.h>

#include <algorithm>
#include <array>
#include <charconv>

namespace recordings {
namespace {

constexpr std::size_t first_size = std::size_t{1} << 16U;
constexpr std::string_view digits = "0123456789abcdef";

bool is_continuation(char byte) {
  return (static_cast<unsigned char>(byte) & 0xC0U) == 0x80U;
}

/// Bytes of the character at the begin of a text that is not empty, as UTF-8 has it; 0 if none is
/// there.
std::size_t character_length(std::string_view text) {
  auto const first = static_cast<unsigned char>(text[0]);
  if (first < 0x80U) {
    return 1;
  }
  std::size_t const length = first >= 0xF0U ? 4 : first >= 0xE0U ? 3 : 2;
  if (first < 0xC2U || first > 0xF4U || text.size() < length ||
      !std::ranges::all_of(text.substr(1, length - 1), is_continuation)) {
    return 0;
  }
  auto const second = static_cast<unsigned char>(text[1]);
  bool const is_overlong = (first == 0xE0U && second < 0xA0U) || (first == 0xF0U && second < 0x90U);
  bool const is_surrogate = first == 0xEDU && second >= 0xA0U;
  bool const is_beyond = first == 0xF4U && second >= 0x90U;
  return is_overlong || is_surrogate || is_beyond ? 0 : length;
}

bool is_utf8(std::string_view text) {
  while (!text.empty()) {
    auto const length = character_length(text);
    if (length == 0) {
      return false;
    }
    text.remove_prefix(length);
  }
  return true;
}

}  // namespace

Room::~Room() {
  if (data_ != nullptr) {
    munmap(data_, size_);
  }
}

bool Room::grow(std::size_t size) noexcept {
  std::size_t grown = std::max(size_, first_size);
  while (grown < size) {
    grown *= 2;
  }
  void *const found = data_ == nullptr ? mmap(nullptr, grown, PROT_READ | PROT_WRITE,
                                              MAP_PRIVATE | MAP_ANONYMOUS, -1, 0)
                                       : mremap(data_, size_, grown, MREMAP_MAYMOVE);
  if (found == MAP_FAILED) {
    return false;
  }
  data_ = static_cast<char *>(found);
  size_ = grown;
  return true;
}

Line &Line::number(std::int64_t value) noexcept {
  std::array<char, 24> written;
  auto const end = std::to_chars(written.begin(), written.end(), value).ptr;
  return raw({written.data(), end});
}

Line &Line::number(std::uint64_t value) noexcept {
  std::array<char, 24> written;
  auto const end = std::to_chars(written.begin(), written.end(), value).ptr;
  return raw({written.data(), end});
}

Line &Line::hex(void const *bytes, std::size_t size) noexcept {
  if (reserve(2 * size)) {
    auto const *const from = static_cast<unsigned char const *>(bytes);
    char *to = room_.data() + used_;
    for (std::size_t at = 0; at < size; ++at) {
      *to++ = digits[from[at] >> 4U];
      *to++ = digits[from[at] & 15U];
    }
    used_ += 2 * size;
  }
  return *this;
}

Line &Line::text(std::string_view bytes) noexcept {
  if (!is_utf8(bytes)) {
    return raw(R"({"hex":")").hex(bytes.data(), bytes.size()).raw("\"}");
  }
  raw("\"");
  while (!bytes.empty()) {
    auto const *const stop = std::ranges::find_if(bytes, [](char one) {
      return static_cast<unsigned char>(one) < 0x20U || one == '"' || one == '\\';
    });
    raw({bytes.begin(), stop});
    bytes.remove_prefix(static_cast<std::size_t>(stop - bytes.begin()));
    if (!bytes.empty()) {
      raw(R"(\u00)").hex(bytes.data(), 1);
      bytes.remove_prefix(1);
    }
  }
  return raw("\"");
}

}  // namespace recordings
