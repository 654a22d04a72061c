// What the tables say of calls and of the memory that they take and give. They are written from the
// binding definitions; see make_tables.py.
#pragma once

#include <cstdint>
#include <span>
#include <string_view>

#include "recordings/core/api.h"

namespace recordings {

struct Record;

/// What lies in some bytes.
enum class Kind : std::uint8_t { number, text, bytes, record };

/// A number of a record that no address leads to. Of one that is set, what does not fit is lost.
using BitsOf = std::int64_t (*)(void const *record);
using SetBits = void (*)(void *record, std::int64_t value);

/// Where the field is that tells which view of a union holds; the form is an argument of the call.
inline constexpr int no_tag = -1;
inline constexpr int form_tag = -2;

struct Field {
  std::string_view name;
  Kind kind;
  bool is_signed;
  bool is_array;
  std::uint32_t width;  ///< bytes of it, or of each element
  std::uint32_t offset;
  std::uint32_t count;  ///< elements of an array whose number is fixed
  int counted_by;       ///< the field that counts its elements, or -1
  int rest_of;          ///< the field that says where the array and its record end, or -1
  int tag;              ///< of a view: the field that tells, no_tag or form_tag
  std::int64_t tag_value;
  Record const *record;  ///< of a record
  BitsOf bits;           ///< of a bit field
  SetBits set_bits;
};

struct Record {
  std::string_view name;
  std::uint32_t size;
  std::span<Field const> fields;
  Record const *followed_by;  ///< records after all fields, or null
  int followed_count;         ///< the field that counts them; -1 if `packed_size` tells
  int packed_size;            ///< the field with the bytes of the whole block, or -1
  int packed_length;          ///< the field of each of them with its own bytes
};

/// How an argument crosses.
enum class Passing : std::uint8_t {
  number,
  text,         ///< until its NUL
  array_text,   ///< likewise, in an array of `width` bytes
  handle,       ///< a pointer that leads nowhere to a caller
  released,     ///< likewise; what it designates ends with the call
  function,     ///< called back
  memory,       ///< `width` bytes times its length
  record,       ///< the caller's
  out_number,   ///< `width` bytes that the call writes
  out_text,     ///< `width` bytes at most
  out_record,   ///< the caller's, which the call fills
  out_handle,   ///< a pointer that the call leaves
  out_memory,   ///< likewise, to `width` bytes times its length
  out_pointee,  ///< likewise, to a record, or as many as its length says
};

/// What says how long memory is: an argument, or one of these.
inline constexpr int no_length = -1;
inline constexpr int length_is_result = -2;

struct Argument {
  std::string_view name;
  Passing passing;
  bool is_signed;
  bool is_form;  ///< an address whose bytes the argument `length` names by a form
  std::uint32_t width;
  int length;
  Record const *record;
};

/// Whether it comes out of the call.
inline bool is_output(Argument const &argument) noexcept {
  return argument.passing >= Passing::out_number;
}

enum class Result : std::uint8_t { nothing, status, number, text, handle };

struct Call {
  std::string_view name;
  std::string_view library;
  Result result;
  bool is_armed;  ///< whether it may trap
  std::span<Argument const> arguments;
};

/// The form of addresses where no argument names one.
inline constexpr std::int64_t no_form = -1;

/// Bytes of an address by the form that names it; 0 where nothing says it.
std::uint32_t bytes_of_form(std::int64_t form);

RECORDINGS_API extern std::span<Call const> const calls;

/// Those that calls take and give, and those that they hold.
extern std::span<Record const *const> const records;

}  // namespace recordings
