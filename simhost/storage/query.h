// SQL on the state. Private to this layer: those above know rows and the functions on them.
#pragma once

#include <SQLiteCpp/Statement.h>

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <type_traits>
#include <vector>

#include "storage/connection.h"
#include "storage/ports.h"
#include "storage/store.h"

namespace simhost::storage {

/// One run of a prepared statement that reads. It resets the statement when it goes, because a
/// statement left in the middle of its rows would keep its transaction from ending.
class Query {
 public:
  /// `sql` is a literal: the statement prepared from it is kept. Throws std::logic_error for one
  /// that changes the state.
  Query(Transaction &transaction, std::string_view sql)
      : Query(transaction.connection(), sql, false) {}
  ~Query();
  Query(Query const &) = delete;
  Query &operator=(Query const &) = delete;

  /// Binds the parameters from the left, one per call; the value is copied.
  Query &with(std::int64_t value);
  Query &with(std::string_view text);
  Query &with(std::span<std::byte const> bytes);
  /// A key, a number or a kind of row.
  template <typename Enum>
  requires std::is_enum_v<Enum> Query &with(Enum value) {
    return with(static_cast<std::int64_t>(value));
  }

  /// Lets refusals name the setting whose value it is, not the column. The name must outlive this.
  Query &of_setting(std::string_view name);

  /// Steps to the next row; false when there is none.
  bool next();
  /// Steps to the row that every state has; throws UnusableState without one.
  void require_row();
  /// The columns of the row that next() reached, counted from 0. The file may have been written by
  /// anybody: these throw UnusableState for a value of another type or outside its bounds.
  [[nodiscard]] std::int64_t integer(int column) const;
  [[nodiscard]] std::int64_t integer(int column, std::int64_t least, std::int64_t greatest) const;
  /// Any value of an unsigned type of up to 32 bits.
  template <typename Number>
  [[nodiscard]] Number number(int column) const {
    static_assert(std::is_unsigned_v<Number> && sizeof(Number) < sizeof(std::int64_t));
    return static_cast<Number>(integer(column, 0, std::numeric_limits<Number>::max()));
  }
  [[nodiscard]] PortNumber port_number(int column) const {
    return PortNumber(
        static_cast<std::uint32_t>(integer(column, 1, std::numeric_limits<std::uint32_t>::max())));
  }
  /// 0 or 1.
  [[nodiscard]] bool flag(int column) const { return integer(column, 0, 1) != 0; }
  /// Of the host's clock: no sum or difference of two of them overflows.
  [[nodiscard]] std::chrono::milliseconds time(int column) const;
  /// One of an enumeration whose values are 0 to `last`.
  template <typename Enum>
  [[nodiscard]] Enum choice(int column, Enum last) const {
    return static_cast<Enum>(integer(column, 0, static_cast<std::int64_t>(last)));
  }
  /// Without a NUL in it.
  [[nodiscard]] std::string text(int column) const;
  /// Likewise, and not empty.
  [[nodiscard]] std::string name(int column) const;
  [[nodiscard]] std::vector<std::byte> bytes(int column) const;
  /// Of that length.
  [[nodiscard]] std::vector<std::byte> bytes(int column, std::size_t length) const;
  [[nodiscard]] bool is_null(int column) const;
  /// Throws UnusableState, which says that the column, or the setting, holds `what`.
  [[noreturn]] void refuse(int column, std::string const &what) const;

  /// What `read` makes of the first row; nothing without one.
  template <typename Read>
  auto first(Read const &read) {
    return next() ? std::optional(read(*this)) : std::nullopt;
  }
  /// What `read` makes of each row.
  template <typename Read>
  auto all(Read const &read) {
    std::vector<std::decay_t<decltype(read(*this))>> rows;
    while (next()) {
      rows.push_back(read(*this));
    }
    return rows;
  }

 protected:
  Query(Connection &connection, std::string_view sql, bool may_change)
      : connection_(connection), statement_(connection.prepared(sql, may_change)) {
    connection_.start_statement();
  }

  // Runs a statement that yields no rows; how many rows it changed.
  int execute();

 private:
  // Bytes that may come out of the state before it is asked how large the file is.
  static constexpr std::uint64_t kFree = std::uint64_t{1} << 20;

  // Counts bytes that came out.
  void take(std::size_t size) const;

  Connection &connection_;
  SQLite::Statement &statement_;
  int bound_ = 0;
  std::string_view setting_;
  mutable std::uint64_t taken_ = 0;
  mutable std::uint64_t allowed_ = kFree;
};

/// Likewise, of one that changes the state.
class Change : public Query {
 public:
  Change(ChangingTransaction &transaction, std::string_view sql)
      : Query(transaction.connection(), sql, true) {}

  template <typename Value>
  Change &with(Value const &value) {
    Query::with(value);
    return *this;
  }
  /// Returns how many rows it changed.
  int run() { return execute(); }
};

}  // namespace simhost::storage
