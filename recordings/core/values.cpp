#include "recordings/core/values.h"

#include <algorithm>
#include <cstring>

#include "recordings/core/identities.h"
#include "recordings/core/memory.h"
#include "recordings/core/of_thread.h"

namespace recordings {
namespace {

constexpr std::string_view not_there = "no memory of the process is there";
constexpr std::string_view contradiction = "its lengths contradict each other";
constexpr std::string_view too_much = "it is longer than a trace holds";

Block &block() {
  return OfThread<Block>::get();
}

void write_number(Line &line, std::int64_t value, bool is_signed) {
  if (is_signed) {
    line.number(value);
  } else {
    line.number(static_cast<std::uint64_t>(value));
  }
}

/// Ends an object that began with what was to be found at an address.
void close_unread(Line &line, std::string_view why) {
  line.member("unread").text(why).raw("}");
}

void write_unread(Line &line, std::string_view why) {
  line.raw("{");
  close_unread(line, why);
}

std::string_view why_unread(std::size_t wanted) {
  return wanted > most_bytes ? too_much : not_there;
}

/// A text of a fixed width: as text if the NUL and zeros end it, so that nothing of it is lost.
void write_array_text(Line &line, char const *at, std::size_t width) {
  auto const length = strnlen(at, width);
  if (std::all_of(at + length, at + width, [](char one) { return one == '\0'; })) {
    line.text({at, length});
  } else {
    line.raw(R"({"hex":")").hex(at, width).raw("\"}");
  }
}

/// Writes the records of one block.
class Walk {
 public:
  Walk(Line &line, Block &held, std::int64_t form) : line_(line), held_(held), form_(form) {}

  /// The record at an offset of the block; where what follows it begins, or 0 if that is unknown.
  std::size_t record(Record const &record, std::size_t start) {
    if (!held_.need(start + record.size)) {
      write_unread(line_, why_unread(start + record.size));
      return 0;
    }
    end_ = start + record.size;
    line_.raw("{");
    bool is_more_there = false;
    bool has_view = false;
    for (Field const &field : record.fields) {
      bool const is_view = field.tag != no_tag;
      is_more_there |= is_view && !is_empty(record, field, start);
      if (!is_view || holds(record, field, start)) {
        has_view |= is_view;
        line_.member(field.name);
        write_field(record, field, start);
      }
    }
    if (is_more_there && !has_view) {
      line_.member("unread").text("nothing says which view of it holds");
    }
    if (record.followed_by != nullptr && end_ != 0) {
      line_.member(record.followed_by->name);
      write_following(record, start);
    }
    line_.raw("}");
    return end_;
  }

  void records(Record const &record, std::size_t count) {
    line_.raw("[");
    std::size_t at = 0;
    for (std::size_t index = 0; index < count; ++index) {
      line_.comma();
      at = this->record(record, at);
    }
    line_.raw("]");
  }

 private:
  [[nodiscard]] std::int64_t number(Record const &record, int field, std::size_t start) const {
    Field const &known = record.fields[static_cast<std::size_t>(field)];
    return number_at(held_.at(start + known.offset), known.width, known.is_signed);
  }

  [[nodiscard]] bool holds(Record const &record, Field const &field, std::size_t start) const {
    auto const tag = field.tag == form_tag ? form_ : number(record, field.tag, start);
    return tag == field.tag_value;
  }

  /// Whether it is an array with no elements, so that nothing depends on which view holds.
  [[nodiscard]] bool is_empty(Record const &record, Field const &field, std::size_t start) const {
    return field.counted_by >= 0 && number(record, field.counted_by, start) == 0;
  }

  void write_field(Record const &record, Field const &field, std::size_t start) {
    if (field.bits != nullptr) {
      write_number(line_, field.bits(held_.at(start)), field.is_signed);
    } else if (!field.is_array) {
      write_element(field, start + field.offset);
    } else {
      write_array(record, field, start);
    }
  }

  void write_array(Record const &record, Field const &field, std::size_t start) {
    auto const first = start + field.offset;
    std::size_t count = field.count;
    if (field.counted_by >= 0) {
      count = static_cast<std::uint64_t>(number(record, field.counted_by, start));
    } else if (field.rest_of >= 0) {
      auto const whole = static_cast<std::size_t>(number(record, field.rest_of, start));
      count = (std::max<std::size_t>(whole, field.offset) - field.offset) / field.width;
    }
    bool const is_too_much = count > most_bytes;
    if (is_too_much || !held_.need(first + count * field.width)) {
      write_unread(line_, is_too_much ? too_much : why_unread(first + count * field.width));
      end_ = 0;
      return;
    }
    auto const end = first + count * field.width;
    if (field.kind == Kind::bytes && field.width == 1) {
      line_.raw("\"").hex(held_.at(first), count).raw("\"");
    } else {
      line_.raw("[");
      for (std::size_t at = first; at < end; at += field.width) {
        line_.comma();
        write_element(field, at);
      }
      line_.raw("]");
    }
    end_ = std::max(end_, end);
  }

  void write_element(Field const &field, std::size_t at) {
    switch (field.kind) {
      case Kind::number:
        write_number(line_, number_at(held_.at(at), field.width, field.is_signed), field.is_signed);
        break;
      case Kind::text:
        write_array_text(line_, held_.at(at), field.width);
        break;
      case Kind::bytes:
        line_.raw("\"").hex(held_.at(at), field.width).raw("\"");
        break;
      case Kind::record:
        auto const end = end_;
        record(*field.record, at);
        end_ = end;
        break;
    }
  }

  void write_following(Record const &record, std::size_t start) {
    line_.raw("[");
    if (record.packed_size < 0) {
      auto const count = number(record, record.followed_count, start);
      for (std::int64_t index = 0; index < count && end_ != 0; ++index) {
        line_.comma();
        end_ = this->record(*record.followed_by, end_);
      }
    } else {
      write_packed(record, start);
    }
    line_.raw("]");
  }

  void write_packed(Record const &record, std::size_t start) {
    auto const end = start + static_cast<std::size_t>(number(record, record.packed_size, start));
    auto at = end_;
    auto least = at;
    while (at >= least && at < end) {
      line_.comma();
      least = this->record(*record.followed_by, at);
      if (least == 0) {
        end_ = 0;
        return;
      }
      at += static_cast<std::size_t>(number(*record.followed_by, record.packed_length, at));
    }
    // One that ends before its own fields do, or after the block, says nothing of what follows.
    if (at < least || at != end) {
      write_unread(line_.comma(), contradiction);
      at = 0;
    }
    end_ = at;
  }

  Line &line_;
  Block &held_;
  std::int64_t form_;
  std::size_t end_ = 0;
};

std::int64_t form_of(Argument const &argument, Words words) {
  return argument.is_form ? static_cast<std::int64_t>(words[argument.length]) : no_form;
}

/// What a length says; an argument that is itself an output holds it where its pointer leads.
std::int64_t length_of(Call const &call, Argument const &argument, Words words,
                       std::uint64_t result) {
  if (argument.length == length_is_result) {
    return static_cast<std::int64_t>(result);
  }
  if (argument.is_form) {
    return bytes_of_form(static_cast<std::int64_t>(words[argument.length]));
  }
  Argument const &length = call.arguments[static_cast<std::size_t>(argument.length)];
  auto const word = words[argument.length];
  if (length.passing != Passing::out_number) {
    return static_cast<std::int64_t>(word);
  }
  auto &held = block();
  held.open(word);
  return held.need(length.width) ? number_at(held.at(0), length.width, length.is_signed) : 0;
}

void write_text(Line &line, std::uint64_t address, std::uint32_t width) {
  auto &held = block();
  held.open(address);
  if (address == 0) {
    line.raw("null");
  } else if (width != 0 && held.need(width)) {
    line.text({held.at(0), strnlen(held.at(0), width)});
  } else if (width == 0 && held.need_text()) {
    std::string_view const text{held.at(0), strnlen(held.at(0), held.size())};
    if (text.size() < held.size()) {
      line.text(text);
    } else {
      line.raw("{").member("begins").text(text);
      close_unread(line, too_much);
    }
  } else {
    write_unread(line, not_there);
  }
}

/// The bytes at an address as a member of an object that is open, which this ends.
void close_memory(Line &line, std::uint64_t address, std::int64_t size) {
  auto &held = block();
  held.open(address);
  if (size >= 0 && held.need(static_cast<std::size_t>(size))) {
    line.member("bytes").raw("\"").hex(held.at(0), static_cast<std::size_t>(size)).raw("\"}");
  } else {
    close_unread(line,
                 size < 0 ? "its length is negative" : why_unread(static_cast<std::size_t>(size)));
  }
}

/// Records at an address, or numbers, of which there are so many.
void write_elements(Line &line, Argument const &argument, std::uint64_t address,
                    std::int64_t count) {
  auto &held = block();
  held.open(address);
  auto const width = argument.record != nullptr ? argument.record->size : argument.width;
  auto const size = static_cast<std::size_t>(count) * width;
  if (count < 0 || static_cast<std::size_t>(count) > most_bytes || !held.need(size)) {
    write_unread(line, count < 0 ? "its length is negative" : why_unread(size));
  } else if (argument.record != nullptr) {
    Walk(line, held, no_form).records(*argument.record, static_cast<std::size_t>(count));
  } else {
    line.raw("[");
    for (std::int64_t index = 0; index < count; ++index) {
      line.comma();
      auto const *const at = held.at(static_cast<std::size_t>(index) * width);
      write_number(line, number_at(at, width, argument.is_signed), argument.is_signed);
    }
    line.raw("]");
  }
}

void write_memory(Line &line, Call const &call, Argument const &argument, Words words,
                  std::uint64_t address) {
  if (address == 0) {
    line.raw("null");
    return;
  }
  auto const length = length_of(call, argument, words, 0);
  if (argument.record != nullptr || argument.width != 1) {
    write_elements(line, argument, address, length);
  } else {
    line.raw("{");
    close_memory(line, address, length);
  }
}

void write_input(Line &line, Call const &call, Argument const &argument, Words words,
                 std::uint64_t word, Identify identify) {
  switch (argument.passing) {
    case Passing::number:
      write_number(line, static_cast<std::int64_t>(word), argument.is_signed);
      break;
    case Passing::text:
    case Passing::array_text:
      write_text(line, word, argument.width);
      break;
    case Passing::memory:
      write_memory(line, call, argument, words, word);
      break;
    case Passing::record:
      if (word == 0) {
        line.raw("null");
      } else {
        write_record(line, *argument.record, word, no_form);
      }
      break;
    default:
      write_pointer(line, word, identify);
      break;
  }
}

/// What lies where a pointer leads that the call left.
void write_left(Line &line, Call const &call, Argument const &argument, Words words,
                std::uint64_t address, std::uint64_t result) {
  if (address == 0) {
    line.raw("null");
    return;
  }
  line.raw("{").member("at").number(identity_of(address));
  if (argument.passing == Passing::out_memory) {
    close_memory(line, address, length_of(call, argument, words, result));
    return;
  }
  if (argument.passing == Passing::out_pointee) {
    line.member(argument.record->name);
    if (argument.length != no_length && !argument.is_form) {
      write_elements(line, argument, address, length_of(call, argument, words, result));
    } else {
      write_record(line, *argument.record, address, form_of(argument, words));
    }
  }
  line.raw("}");
}

void write_output(Line &line, Call const &call, Argument const &argument, Words words,
                  std::uint64_t word, std::uint64_t result) {
  auto &held = block();
  held.open(word);
  switch (argument.passing) {
    case Passing::out_text:
      write_text(line, word, 0);
      break;
    case Passing::out_record:
      write_record(line, *argument.record, word, no_form);
      break;
    case Passing::out_number:
      if (held.need(argument.width)) {
        write_number(line, number_at(held.at(0), argument.width, argument.is_signed),
                     argument.is_signed);
      } else {
        write_unread(line, not_there);
      }
      break;
    default:
      if (held.need(sizeof(std::uint64_t))) {
        auto const left = number_at(held.at(0), sizeof(std::uint64_t), false);
        write_left(line, call, argument, words, static_cast<std::uint64_t>(left), result);
      } else {
        write_unread(line, not_there);
      }
      break;
  }
}

}  // namespace

std::int64_t number_at(char const *at, std::uint32_t width, bool is_signed) noexcept {
  std::uint64_t bits = 0;
  std::memcpy(&bits, at, width);
  auto const unused = 64U - 8U * width;
  return is_signed ? static_cast<std::int64_t>(bits << unused) >> unused
                   : static_cast<std::int64_t>(bits);
}

void write_record(Line &line, Record const &record, std::uint64_t address,
                  std::int64_t form) noexcept {
  auto &held = block();
  held.open(address);
  Walk(line, held, form).record(record, 0);
}

void write_pointer(Line &line, std::uint64_t address, Identify identify) noexcept {
  if (address == 0) {
    line.raw("null");
  } else {
    line.raw("{").member("at").number(identify(address)).raw("}");
  }
}

void write_inputs(Line &line, Call const &call, Words words, Identify identify) noexcept {
  line.member("in").raw("{");
  for (std::size_t at = 0; at < call.arguments.size(); ++at) {
    Argument const &argument = call.arguments[at];
    if (!is_output(argument)) {
      line.member(argument.name);
      write_input(line, call, argument, words, words[at], identify);
    } else if (words[at] == 0) {
      // Nothing comes out where the caller has no place for it.
      line.member(argument.name).raw("null");
    }
  }
  line.raw("}");
}

bool has_outputs(Call const &call) noexcept {
  return std::ranges::any_of(call.arguments, is_output);
}

void write_outputs(Line &line, Call const &call, Words words, std::uint64_t result) noexcept {
  line.member("out").raw("{");
  for (std::size_t at = 0; at < call.arguments.size(); ++at) {
    Argument const &argument = call.arguments[at];
    if (is_output(argument) && words[at] != 0) {
      line.member(argument.name);
      write_output(line, call, argument, words, words[at], result);
    }
  }
  line.raw("}");
}

void write_result(Line &line, Call const &call, std::uint64_t result) noexcept {
  switch (call.result) {
    case Result::nothing:
      break;
    case Result::status:
      line.member("status").number(result);
      break;
    case Result::number:
      line.member("result").number(static_cast<std::int64_t>(result));
      break;
    case Result::text:
      line.member("result");
      write_text(line, result, 0);
      break;
    case Result::handle:
      line.member("result");
      write_pointer(line, result);
      break;
  }
}

}  // namespace recordings
