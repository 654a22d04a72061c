// Statements: prepared once, bound and stepped for each run.
#include "storage/query.h"

#include <SQLiteCpp/Exception.h>
#include <fmt/format.h>

namespace simhost::storage {

Query::~Query() {
  statement_.tryReset();
  try {
    statement_.clearBindings();
  } catch (SQLite::Exception const &) {
    // Bindings that stay are overwritten by the next run.
  }
}

Query &Query::with(std::int64_t value) {
  connection_.guarded([&] { statement_.bind(++bound_, value); });
  return *this;
}

Query &Query::with(std::string_view text) {
  connection_.guarded([&] { statement_.bind(++bound_, std::string(text)); });
  return *this;
}

Query &Query::with(std::span<std::byte const> bytes) {
  // SQLite takes no bytes at a null address for NULL, which is not the same as no bytes.
  void const *const first = bytes.empty() ? "" : static_cast<void const *>(bytes.data());
  connection_.guarded([&] { statement_.bind(++bound_, first, static_cast<int>(bytes.size())); });
  return *this;
}

bool Query::next() {
  constexpr std::size_t kRow = 8;
  bool const found = connection_.guarded([&] { return statement_.executeStep(); });
  connection_.require_schema_of_now();
  take(kRow);
  return found;
}

Query &Query::of_setting(std::string_view name) {
  setting_ = name;
  return *this;
}

void Query::require_row() {
  if (!next()) {
    connection_.refuse("a row is missing in it that every state has");
  }
}

int Query::execute() {
  int const changed = connection_.guarded([&] { return statement_.exec(); });
  connection_.require_schema_of_now();
  return changed;
}

// A page that leads to itself has rows without end.
void Query::take(std::size_t size) const {
  constexpr std::uint64_t kPerByte = 16;
  taken_ += size;
  if (taken_ <= allowed_) {
    return;
  }
  allowed_ = connection_.allowance(kFree, kPerByte);
  if (taken_ > allowed_) {
    connection_.refuse("it yields more than it can hold");
  }
}

std::int64_t Query::integer(int column) const {
  auto const value = statement_.getColumn(column);
  if (!value.isInteger()) {
    refuse(column, "no integer");
  }
  return value.getInt64();
}

std::int64_t Query::integer(int column, std::int64_t least, std::int64_t greatest) const {
  auto const value = integer(column);
  if (value < least || value > greatest) {
    refuse(column, std::to_string(value));
  }
  return value;
}

std::chrono::milliseconds Query::time(int column) const {
  constexpr std::int64_t kFarthest = std::int64_t{3} << 60;
  return std::chrono::milliseconds(integer(column, -kFarthest, kFarthest));
}

std::string Query::text(int column) const {
  auto const value = statement_.getColumn(column);
  if (!value.isText()) {
    refuse(column, "no text");
  }
  auto text = value.getString();
  take(text.size());
  if (text.find('\0') != std::string::npos) {
    refuse(column, "a text with a NUL in it");
  }
  return text;
}

std::string Query::name(int column) const {
  auto name = text(column);
  if (name.empty()) {
    refuse(column, "no name");
  }
  return name;
}

std::vector<std::byte> Query::bytes(int column) const {
  auto const value = statement_.getColumn(column);
  if (!value.isBlob()) {
    refuse(column, "no bytes");
  }
  auto const *first = static_cast<std::byte const *>(value.getBlob());
  auto const size = static_cast<std::size_t>(value.getBytes());
  take(size);
  return {first, first + size};
}

std::vector<std::byte> Query::bytes(int column, std::size_t length) const {
  auto value = bytes(column);
  if (value.size() != length) {
    refuse(column, std::to_string(value.size()) + " bytes instead of " + std::to_string(length));
  }
  return value;
}

bool Query::is_null(int column) const {
  return statement_.getColumn(column).isNull();
}

void Query::refuse(int column, std::string const &what) const {
  auto const holder = setting_.empty()
                          ? fmt::format("column '{}'", statement_.getColumn(column).getName())
                          : fmt::format("setting '{}'", setting_);
  connection_.refuse(fmt::format("the {} holds {}", holder, what));
}

}  // namespace simhost::storage
