#include "recordings/core/decoded.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <string>
#include <string_view>

#include "recordings/core/memory.h"
#include "recordings/core/values.h"

namespace recordings {
namespace {

/// The place of a value in its line, as far as it has been followed.
class Place {
 public:
  class Step {
   public:
    Step(Place &place, std::string_view more) : place_(place), before_(place.path_.size()) {
      place.path_ += more;
    }
    Step(Step const &) = delete;
    Step &operator=(Step const &) = delete;
    ~Step() { place_.path_.resize(before_); }

   private:
    Place &place_;
    std::size_t before_;
  };

  explicit Place(std::string_view begin) : path_(begin) {}

  [[nodiscard]] Step member(std::string_view name) { return {*this, "." + std::string(name)}; }
  [[nodiscard]] Step element(std::size_t index) {
    return {*this, '[' + std::to_string(index) + ']'};
  }

  [[noreturn]] void misfit(std::string const &what) const { throw Misfit(path_ + ": " + what); }
  [[noreturn]] void unread(std::string const &why) const {
    throw Unread(path_ + ": was not recorded: " + why);
  }

 private:
  std::string path_;
};

std::string shown(Json const &value) {
  constexpr std::size_t longest = 40;
  auto text = value.dump(-1, ' ', true, Json::error_handler_t::replace);
  return text.size() <= longest ? text : text.substr(0, longest) + "...";
}

/// Refuses a value that is of another kind, which may be the reason why there is none.
[[noreturn]] void refuse_kind(Place &place, Json const &given, std::string const &wanted) {
  if (auto const why = given.is_object() ? given.find("unread") : given.end(); why != given.end()) {
    place.unread(why->is_string() ? why->get<std::string>() : "nobody knows why");
  }
  place.misfit("is no " + wanted + ": " + shown(given));
}

Json const &member(Place &place, Json const &object, std::string_view name) {
  auto const found = object.find(name);
  if (found == object.end()) {
    place.misfit("lacks " + std::string(name));
  }
  return *found;
}

/// Looks at an object from which members are taken, each of which the tables name.
class Members {
 public:
  Members(Place &place, Json const &object) : place_(place), object_(object) {
    if (!object.is_object() || object.contains("unread")) {
      refuse_kind(place, object, "object");
    }
  }

  Json const &take(std::string_view name) {
    Json const &found = member(place_, object_, name);
    taken_.push_back(name);
    return found;
  }

  [[nodiscard]] bool has(std::string_view name) const { return object_.contains(name); }

  void refuse_others() const {
    for (auto const &one : object_.items()) {
      if (std::ranges::find(taken_, one.key()) == taken_.end()) {
        place_.misfit("there is no " + shown(one.key()));
      }
    }
  }

 private:
  Place &place_;
  Json const &object_;
  std::vector<std::string_view> taken_;
};

std::uint64_t decode_number(Place &place, Json const &given, std::uint32_t width, bool is_signed) {
  if (!given.is_number_integer()) {
    refuse_kind(place, given, "whole number");
  }
  auto const unused = 64U - 8U * width;
  auto const most =
      is_signed ? static_cast<std::uint64_t>(std::numeric_limits<std::int64_t>::max()) >> unused
                : std::numeric_limits<std::uint64_t>::max() >> unused;
  auto const least = is_signed ? std::numeric_limits<std::int64_t>::min() >> unused : 0;
  bool const fits = given.is_number_unsigned() ? given.get<std::uint64_t>() <= most
                                               : given.get<std::int64_t>() >= least;
  if (!fits) {
    place.misfit(shown(given) + " is not from " + std::to_string(least) + " to " +
                 std::to_string(most));
  }
  return given.is_number_unsigned() ? given.get<std::uint64_t>()
                                    : static_cast<std::uint64_t>(given.get<std::int64_t>());
}

int value_of_digit(Place &place, char digit) {
  constexpr std::string_view digits = "0123456789abcdef";
  auto const value = digits.find(digit);
  if (value == std::string_view::npos) {
    place.misfit("has a character that is no hexadecimal digit");
  }
  return static_cast<int>(value);
}

Bytes decode_hex(Place &place, Json const &given) {
  if (!given.is_string()) {
    refuse_kind(place, given, "text of digits");
  }
  auto const &digits = given.get_ref<std::string const &>();
  if (digits.size() % 2 != 0) {
    place.misfit("has an odd number of digits");
  }
  Bytes bytes(digits.size() / 2);
  for (std::size_t at = 0; at < bytes.size(); ++at) {
    bytes[at] = static_cast<char>(16 * value_of_digit(place, digits[2 * at]) +
                                  value_of_digit(place, digits[2 * at + 1]));
  }
  return bytes;
}

void require_size(Place &place, std::size_t found, std::size_t wanted) {
  if (found != wanted) {
    place.misfit("has " + std::to_string(found) + " bytes, and not " + std::to_string(wanted));
  }
}

void require_count(Place &place, Json const &list, std::uint64_t wanted) {
  if (!list.is_array()) {
    refuse_kind(place, list, "list");
  }
  if (list.size() != wanted) {
    place.misfit("has " + std::to_string(list.size()) + " elements, and not " +
                 std::to_string(wanted));
  }
}

/// The bytes of a text, whatever they are.
Bytes decode_text_bytes(Place &place, Json const &given) {
  if (given.is_string()) {
    auto const &text = given.get_ref<std::string const &>();
    if (text.find('\0') != std::string::npos) {
      place.misfit("is a text with a NUL in it");
    }
    return {text.begin(), text.end()};
  }
  Members members(place, given);
  Json const &digits = members.take("hex");
  members.refuse_others();
  auto const step = place.member("hex");
  return decode_hex(place, digits);
}

/// A text that its NUL ends.
Bytes decode_text(Place &place, Json const &given) {
  auto bytes = decode_text_bytes(place, given);
  if (std::ranges::find(bytes, '\0') != bytes.end()) {
    place.misfit("is a text with a NUL in it");
  }
  bytes.push_back('\0');
  return bytes;
}

std::uint64_t decode_number_of_pointer(Place &place, Members &members) {
  Json const &number = members.take("at");
  auto const step = place.member("at");
  return decode_number(place, number, sizeof(std::uint64_t), false);
}

/// The number of a pointer of which nothing else is told.
std::uint64_t decode_pointer(Place &place, Json const &given) {
  Members members(place, given);
  auto const number = decode_number_of_pointer(place, members);
  members.refuse_others();
  return number;
}

void require_room(Place &place, std::size_t size, std::size_t room) {
  if (size > room) {
    place.misfit("has " + std::to_string(size) + " bytes, and there is room for " +
                 std::to_string(room));
  }
}

/// Puts the records of one block in their places.
class Layout {
 public:
  Layout(Place &place, std::int64_t form) : place_(place), form_(form) {}

  /// The record at an offset of the block; where what follows it begins.
  std::size_t record(Record const &record, Json const &given, std::size_t start) {
    Members members(place_, given);
    make_room(start + record.size);
    end_ = start + record.size;
    // Those without a tag first: they tell which view holds.
    for (Field const &field : record.fields) {
      if (field.tag == no_tag) {
        take_field(members, record, field, start);
      }
    }
    for (Field const &field : record.fields) {
      if (field.tag != no_tag && holds(record, field, start)) {
        take_field(members, record, field, start);
      }
    }
    if (record.followed_by != nullptr) {
      Json const &list = members.take(record.followed_by->name);
      auto const step = place_.member(record.followed_by->name);
      following(record, list, start);
    }
    members.refuse_others();
    return end_;
  }

  /// So many of them, one after the other.
  void records(Record const &record, Json const &list, std::uint64_t count) {
    require_count(place_, list, count);
    std::size_t at = 0;
    for (std::size_t index = 0; index < list.size(); ++index) {
      auto const step = place_.element(index);
      at = this->record(record, list[index], at);
    }
  }

  [[nodiscard]] Bytes taken() { return std::move(bytes_); }

 private:
  void make_room(std::size_t size) {
    if (size > most_bytes) {
      place_.misfit("is longer than a trace holds");
    }
    bytes_.resize(std::max(bytes_.size(), size));
  }

  void put(std::size_t at, Bytes const &held) {
    std::ranges::copy(held, bytes_.begin() + static_cast<std::ptrdiff_t>(at));
  }

  [[nodiscard]] std::int64_t number(Record const &record, int field, std::size_t start) const {
    Field const &known = record.fields[static_cast<std::size_t>(field)];
    return number_at(bytes_.data() + start + known.offset, known.width, known.is_signed);
  }

  [[nodiscard]] bool holds(Record const &record, Field const &field, std::size_t start) const {
    auto const tag = field.tag == form_tag ? form_ : number(record, field.tag, start);
    return tag == field.tag_value;
  }

  void take_field(Members &members, Record const &record, Field const &field, std::size_t start) {
    Json const &given = members.take(field.name);
    auto const step = place_.member(field.name);
    if (field.bits != nullptr) {
      bits(field, given, start);
    } else if (field.is_array) {
      array(record, field, given, start);
    } else {
      element(field, given, start + field.offset);
    }
  }

  void bits(Field const &field, Json const &given, std::size_t start) {
    auto const value =
        static_cast<std::int64_t>(decode_number(place_, given, field.width, field.is_signed));
    auto *const held = bytes_.data() + start;
    field.set_bits(held, value);
    if (field.bits(held) != value) {
      place_.misfit(shown(given) + " does not fit into its bits");
    }
  }

  /// Elements that the tables, a field that counts them, or one with the bytes of all tells.
  void array(Record const &record, Field const &field, Json const &given, std::size_t start) {
    std::uint64_t count = field.count;
    if (field.counted_by >= 0) {
      count = static_cast<std::uint64_t>(number(record, field.counted_by, start));
    } else if (field.rest_of >= 0) {
      auto const whole = static_cast<std::uint64_t>(number(record, field.rest_of, start));
      count = (std::max<std::uint64_t>(whole, field.offset) - field.offset) / field.width;
    }
    auto const first = start + field.offset;
    if (field.kind == Kind::bytes && field.width == 1) {
      auto const held = decode_hex(place_, given);
      require_size(place_, held.size(), count);
      make_room(first + held.size());
      put(first, held);
    } else {
      require_count(place_, given, count);
      make_room(first + given.size() * field.width);
      for (std::size_t index = 0; index < given.size(); ++index) {
        auto const step = place_.element(index);
        element(field, given[index], first + index * field.width);
      }
    }
    end_ = std::max(end_, first + count * field.width);
  }

  void element(Field const &field, Json const &given, std::size_t at) {
    switch (field.kind) {
      case Kind::number: {
        auto const value = decode_number(place_, given, field.width, field.is_signed);
        std::memcpy(bytes_.data() + at, &value, field.width);
        break;
      }
      case Kind::text: {
        auto const text = decode_text_bytes(place_, given);
        require_room(place_, text.size(), field.width);
        put(at, text);
        break;
      }
      case Kind::bytes: {
        auto const held = decode_hex(place_, given);
        require_size(place_, held.size(), field.width);
        put(at, held);
        break;
      }
      case Kind::record:
        auto const end = end_;
        record(*field.record, given, at);
        end_ = end;
        break;
    }
  }

  void following(Record const &record, Json const &list, std::size_t start) {
    if (record.packed_size >= 0) {
      packed(record, list, start);
      return;
    }
    auto const count = number(record, record.followed_count, start);
    require_count(place_, list, static_cast<std::uint64_t>(std::max<std::int64_t>(count, 0)));
    for (std::size_t index = 0; index < list.size(); ++index) {
      auto const step = place_.element(index);
      end_ = this->record(*record.followed_by, list[index], end_);
    }
  }

  /// Each has a length of its own, and all of them that of the block.
  void packed(Record const &record, Json const &list, std::size_t start) {
    if (!list.is_array()) {
      refuse_kind(place_, list, "list");
    }
    auto const whole = number(record, record.packed_size, start);
    auto at = end_;
    for (std::size_t index = 0; index < list.size(); ++index) {
      auto const step = place_.element(index);
      auto const end = this->record(*record.followed_by, list[index], at);
      auto const length = number(*record.followed_by, record.packed_length, at);
      if (length < static_cast<std::int64_t>(end - at)) {
        place_.misfit("is longer than the " + std::to_string(length) + " bytes that it says");
      }
      at += static_cast<std::size_t>(length);
      make_room(at);
    }
    end_ = at;
    if (static_cast<std::int64_t>(at - start) != whole) {
      place_.misfit("ends after " + std::to_string(at - start) + " bytes, and not " +
                    std::to_string(whole));
    }
  }

  Place &place_;
  std::int64_t form_;
  Bytes bytes_;
  std::size_t end_ = 0;
};

Bytes record_at(Place &place, Record const &record, Json const &given, std::int64_t form) {
  Layout layout(place, form);
  layout.record(record, given, 0);
  return layout.taken();
}

/// One call's values, which say each other's lengths.
class Values {
 public:
  Values(Call const &call, Json const &in, Json const *out, Json const *result)
      : call_(call), in_(in), out_(out), result_(result), place_(out == nullptr ? "in" : "out") {}

  std::vector<Decoded> inputs() {
    Members members(place_, in_);
    std::vector<Decoded> all(call_.arguments.size());
    for (std::size_t at = 0; at < all.size(); ++at) {
      Argument const &argument = call_.arguments[at];
      if (!is_output(argument)) {
        Json const &given = members.take(argument.name);
        auto const step = place_.member(argument.name);
        all[at] = input(argument, given);
      } else if (members.has(argument.name)) {
        all[at].is_null = members.take(argument.name).is_null();
        if (!all[at].is_null) {
          place_.misfit(std::string(argument.name) + " is an output, and given");
        }
      }
    }
    members.refuse_others();
    return all;
  }

  std::vector<Decoded> outputs() {
    Members members(place_, *out_);
    std::vector<Decoded> all(call_.arguments.size());
    for (std::size_t at = 0; at < all.size(); ++at) {
      Argument const &argument = call_.arguments[at];
      if (!is_output(argument)) {
        continue;
      }
      all[at].is_null = has_no_place(argument);
      if (!all[at].is_null) {
        Json const &given = members.take(argument.name);
        auto const step = place_.member(argument.name);
        all[at] = output(argument, given);
      }
    }
    members.refuse_others();
    return all;
  }

 private:
  [[nodiscard]] bool has_no_place(Argument const &argument) const {
    return in_.is_object() && in_.contains(argument.name);
  }

  Decoded input(Argument const &argument, Json const &given) {
    Decoded made;
    if (argument.passing == Passing::number) {
      made.word = decode_number(place_, given, argument.width, argument.is_signed);
      return made;
    }
    made.is_null = given.is_null();
    if (made.is_null) {
      return made;
    }
    switch (argument.passing) {
      case Passing::text:
        made.bytes = decode_text(place_, given);
        break;
      case Passing::array_text:
        made.bytes = decode_text_bytes(place_, given);
        require_room(place_, made.bytes.size(), argument.width);
        made.bytes.resize(argument.width);
        break;
      case Passing::memory:
        made.bytes = memory(argument, given);
        break;
      case Passing::record:
        made.bytes = record_at(place_, *argument.record, given, no_form);
        break;
      default:
        made.word = decode_pointer(place_, given);
        break;
    }
    return made;
  }

  Decoded output(Argument const &argument, Json const &given) {
    Decoded made;
    switch (argument.passing) {
      case Passing::out_number: {
        made.word = decode_number(place_, given, argument.width, argument.is_signed);
        auto const *const held = reinterpret_cast<char const *>(&made.word);
        made.bytes.assign(held, held + argument.width);
        break;
      }
      case Passing::out_text:
        made.bytes = decode_text(place_, given);
        require_room(place_, made.bytes.size(), argument.width);
        break;
      case Passing::out_record:
        made.bytes = record_at(place_, *argument.record, given, no_form);
        require_size(place_, made.bytes.size(), argument.record->size);
        break;
      default:
        made = left(argument, given);
        break;
    }
    return made;
  }

  /// A pointer that the call left, and what lies there.
  Decoded left(Argument const &argument, Json const &given) {
    Decoded made;
    made.is_null = given.is_null();
    if (made.is_null) {
      return made;
    }
    Members members(place_, given);
    made.word = decode_number_of_pointer(place_, members);
    if (argument.passing == Passing::out_memory) {
      made.bytes = bytes(argument, members.take("bytes"));
    } else if (argument.passing == Passing::out_pointee) {
      Json const &pointee = members.take(argument.record->name);
      auto const step = place_.member(argument.record->name);
      made.bytes = this->pointee(argument, pointee);
    }
    members.refuse_others();
    return made;
  }

  Bytes pointee(Argument const &argument, Json const &given) {
    if (argument.length == no_length || argument.is_form) {
      auto const form = argument.is_form ? signed_length(argument) : no_form;
      return record_at(place_, *argument.record, given, form);
    }
    return elements(argument, given);
  }

  Bytes memory(Argument const &argument, Json const &given) {
    if (argument.record != nullptr || argument.width != 1) {
      return elements(argument, given);
    }
    Members members(place_, given);
    Json const &digits = members.take("bytes");
    members.refuse_others();
    return bytes(argument, digits);
  }

  Bytes bytes(Argument const &argument, Json const &digits) {
    auto const step = place_.member("bytes");
    auto bytes = decode_hex(place_, digits);
    require_size(place_, bytes.size(), length_of(argument));
    return bytes;
  }

  /// Records, or numbers, of which another argument says how many.
  Bytes elements(Argument const &argument, Json const &given) {
    auto const count = length_of(argument);
    if (argument.record != nullptr) {
      Layout layout(place_, no_form);
      layout.records(*argument.record, given, count);
      return layout.taken();
    }
    require_count(place_, given, count);
    Bytes bytes(given.size() * argument.width);
    for (std::size_t index = 0; index < given.size(); ++index) {
      auto const step = place_.element(index);
      auto const value = decode_number(place_, given[index], argument.width, argument.is_signed);
      std::memcpy(bytes.data() + index * argument.width, &value, argument.width);
    }
    return bytes;
  }

  /// What the argument says that tells a length, or names a form.
  std::int64_t signed_length(Argument const &argument) {
    if (argument.length == length_is_result) {
      Place place("result");
      return static_cast<std::int64_t>(decode_number(place, *result_, sizeof(std::uint64_t), true));
    }
    Argument const &length = call_.arguments[static_cast<std::size_t>(argument.length)];
    bool const is_left = is_output(length);
    // What has no place says nothing.
    if (is_left && has_no_place(length)) {
      return 0;
    }
    Place place(is_left ? "out" : "in");
    Json const &told = member(place, is_left ? *out_ : in_, length.name);
    auto const step = place.member(length.name);
    return static_cast<std::int64_t>(decode_number(place, told, length.width, length.is_signed));
  }

  std::uint64_t length_of(Argument const &argument) {
    auto const told = signed_length(argument);
    if (argument.is_form) {
      return bytes_of_form(told);
    }
    if (told < 0) {
      place_.misfit("has a length that is negative: " + std::to_string(told));
    }
    return static_cast<std::uint64_t>(told);
  }

  Call const &call_;
  Json const &in_;
  Json const *out_;
  Json const *result_;
  Place place_;
};

}  // namespace

Json member_of(Json const &object, std::string_view name) {
  auto const found = object.find(name);
  return found == object.end() ? Json() : *found;
}

std::vector<Decoded> decode_inputs(Call const &call, Json const &in) {
  return Values(call, in, nullptr, nullptr).inputs();
}

std::vector<Decoded> decode_outputs(Call const &call, Json const &in, Json const &out,
                                    Json const &result) {
  return Values(call, in, &out, &result).outputs();
}

Decoded decode_result(Call const &call, Json const &result) {
  Place place("result");
  Decoded made;
  switch (call.result) {
    case Result::nothing:
    case Result::status:
      break;
    case Result::number:
      // Whatever its width, a register returns it.
      made.word = decode_number(place, result, sizeof(std::uint64_t), true);
      break;
    case Result::text:
      made.is_null = result.is_null();
      if (!made.is_null) {
        made.bytes = decode_text(place, result);
      }
      break;
    case Result::handle:
      made.is_null = result.is_null();
      if (!made.is_null) {
        made.word = decode_pointer(place, result);
      }
      break;
  }
  return made;
}

Bytes decode_record(Record const &record, Json const &given, std::int64_t form) {
  Place place(record.name);
  return record_at(place, record, given, form);
}

}  // namespace recordings
