// The format of blocks. It changes only together with kFormat.
#include "base/blocks.h"

#include <algorithm>
#include <cstring>

#include "base/outcomes.h"

namespace simhost {
namespace {

constexpr std::uint32_t kMagic = 0x5342454E;
constexpr std::uint32_t kFormat = 1;

struct Header {
  std::uint32_t magic;
  std::uint32_t format;
  BlockKind kind;
  std::uint32_t version;
  std::uint32_t length;
  std::uint32_t checksum;
};

// FNV-1a: finds what storage and transport do to a block, not what somebody does on purpose.
std::uint32_t checksum_of(BytesView bytes) {
  std::uint32_t sum = 2166136261U;
  for (auto const byte : bytes) {
    sum = (sum ^ std::to_integer<std::uint32_t>(byte)) * 16777619U;
  }
  return sum;
}

}  // namespace

void Writer::number(std::uint32_t value) {
  auto const raw = bytes_of(value);
  content_.insert(content_.end(), raw.begin(), raw.end());
}

void Writer::bytes(BytesView value) {
  number(static_cast<std::uint32_t>(value.size()));
  content_.insert(content_.end(), value.begin(), value.end());
}

Bytes Writer::block(BlockKind kind, std::uint32_t version) const {
  Header const header{.magic = kMagic,
                      .format = kFormat,
                      .kind = kind,
                      .version = version,
                      .length = static_cast<std::uint32_t>(content_.size()),
                      .checksum = checksum_of(content_)};
  Bytes block(sizeof header + content_.size());
  std::memcpy(block.data(), &header, sizeof header);
  std::copy(content_.begin(), content_.end(), block.begin() + sizeof header);
  return block;
}

Reader::Reader(BytesView block) : rest_(block) {
  auto const raw = take(sizeof(Header));
  auto const header = record_of<Header>(raw);
  if (header.magic != kMagic) {
    throw Refused(QEX_INVALID_METADATA);
  }
  if (header.format != kFormat) {
    throw Refused(QEX_VERSION_MISMATCH_MAJOR);
  }
  if (header.length != rest_.size()) {
    throw Refused(QEX_INVALID_METADATA);
  }
  if (header.checksum != checksum_of(rest_)) {
    throw Refused(QEX_CHECKSUM_MISMATCH);
  }
  kind_ = header.kind;
}

std::uint32_t Reader::number() {
  return record_of<std::uint32_t>(take(sizeof(std::uint32_t)));
}

BytesView Reader::bytes() {
  return take(number());
}

std::string Reader::text() {
  auto const raw = bytes();
  std::string_view const text(reinterpret_cast<char const *>(raw.data()), raw.size());
  if (text.find('\0') != std::string_view::npos) {
    throw Refused(QEX_INVALID_METADATA);
  }
  return std::string(text);
}

void Reader::end() const {
  if (!rest_.empty()) {
    throw Refused(QEX_INVALID_METADATA);
  }
}

BytesView Reader::take(std::size_t size) {
  if (size > rest_.size()) {
    throw Refused(QEX_INVALID_METADATA);
  }
  auto const taken = rest_.first(size);
  rest_ = rest_.subspan(size);
  return taken;
}

}  // namespace simhost
