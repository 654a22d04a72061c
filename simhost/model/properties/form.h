// How values are said in words: numbers, choices, records and lists as data, which documents,
// descriptions, reference tables and fuzzers read alike. What is said is a part of an object of
// C++, reached through the functions of its form; the makers below see to it that they belong
// together.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <span>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>

#include "base/bytes.h"

namespace simhost {

/// A word and the number it stands for.
struct Word {
  std::string_view text;
  std::int64_t value;
};

enum class FormKind {
  none,     ///< nothing says it but its bytes
  number,   ///< least to greatest
  seconds,  ///< a number of milliseconds, said with up to three decimals
  boolean,  ///< 0 or 1
  choice,   ///< one of the words
  bits,     ///< any of the words, each a bit
  text,     ///< up to so many bytes
  range,    ///< two numbers, or one that is both: "10-12", 20
  mac,      ///< an address of Ethernet
  ip,       ///< an address of IPv4 or IPv6
  address,  ///< either, or one of Ethernet
  record,   ///< members of names
  one_of,   ///< one of the members, by its name
  list,     ///< elements in their order
};

struct Member;

struct Form {
  FormKind kind = FormKind::none;

  /// A number, a boolean, a choice, bits; the lower end of a range; which member of a one_of.
  std::int64_t (*load)(void const *object) = nullptr;
  void (*store)(void *object, std::int64_t value) = nullptr;
  /// The upper end of a range.
  std::int64_t (*load_end)(void const *object) = nullptr;
  void (*store_end)(void *object, std::int64_t value) = nullptr;
  std::int64_t least = 0;
  std::int64_t greatest = 0;
  std::span<Word const> words = {};

  std::string (*text)(void const *object) = nullptr;
  void (*put_text)(void *object, std::string_view text) = nullptr;
  /// The bytes of an address.
  Bytes (*bytes)(void const *object) = nullptr;
  void (*put_bytes)(void *object, BytesView bytes) = nullptr;

  std::span<Member const> members = {};
  /// Whether the first member may stand for a record of nothing else.
  bool first_alone = false;

  std::size_t (*count)(void const *object) = nullptr;
  void const *(*element_at)(void const *object, std::size_t index) = nullptr;
  /// A further element, with its defaults; null if there is no room.
  void *(*append)(void *object) = nullptr;
  Form const *element = nullptr;

  std::size_t most = 0;  ///< bytes of a text, elements of a list
  /// Whether a text is the name of an uplink, or of a port or group that stands for some.
  bool of_uplinks = false;
};

/// Whether a record is said without a member that has its default.
enum class Presence { always, required, unless_absent };

struct Member {
  std::string_view name;
  std::string_view says;
  Form form;
  Presence presence = Presence::always;
  std::int64_t absent = 0;  ///< the number that stands for none
};

/// A form and what it says a part of.
template <typename Type>
struct FormOf : Form {
  using Object = Type;
};

namespace form {

template <typename Type>
struct ClassOf;
template <typename Field, typename Class>
struct ClassOf<Field Class::*> {
  using Object = Class;
  using Value = Field;
};

/// A number in a field of a record, wherever the record is; packed records align nothing, so that
/// no reference may be bound to the field.
template <auto kField>
struct NumberField {
  using Object = typename ClassOf<decltype(kField)>::Object;
  using Value = typename ClassOf<decltype(kField)>::Value;
  static std::int64_t load(Object const &object) {
    if constexpr (std::is_enum_v<Value>) {
      return copy<std::underlying_type_t<Value>>(object);
    } else {
      return copy<Value>(object);
    }
  }
  static void store(Object &object, std::int64_t number) {
    auto const value = static_cast<Value>(number);
    std::memcpy(&(object.*kField), &value, sizeof value);
  }

 private:
  template <typename Number>
  static Number copy(Object const &object) {
    Number number;
    std::memcpy(&number, &(object.*kField), sizeof number);
    return number;
  }
};

/// A number that is the whole object.
template <typename Number>
struct WholeNumber {
  using Object = Number;
  static std::int64_t load(Object const &object) { return object; }
  static void store(Object &object, std::int64_t number) { object = static_cast<Number>(number); }
};

template <typename Access>
constexpr FormOf<typename Access::Object> number_of(FormKind kind) {
  using Object = typename Access::Object;
  FormOf<Object> made;
  made.kind = kind;
  made.load = [](void const *object) { return Access::load(*static_cast<Object const *>(object)); };
  made.store = [](void *object, std::int64_t value) {
    Access::store(*static_cast<Object *>(object), value);
  };
  return made;
}

template <typename Access>
constexpr auto number(std::int64_t least, std::int64_t greatest) {
  auto made = number_of<Access>(FormKind::number);
  made.least = least;
  made.greatest = greatest;
  return made;
}
template <auto kField>
constexpr auto number(std::int64_t least, std::int64_t greatest) {
  return number<NumberField<kField>>(least, greatest);
}

template <typename Access>
constexpr auto seconds() {
  return number_of<Access>(FormKind::seconds);
}

template <typename Access>
constexpr auto boolean() {
  auto made = number_of<Access>(FormKind::boolean);
  made.greatest = 1;
  return made;
}
template <auto kField>
constexpr auto boolean() {
  return boolean<NumberField<kField>>();
}

/// The words must outlive the form, here and below.
template <typename Access>
constexpr auto choice(std::span<Word const> words) {
  auto made = number_of<Access>(FormKind::choice);
  made.words = words;
  return made;
}
template <auto kField>
constexpr auto choice(std::span<Word const> words) {
  return choice<NumberField<kField>>(words);
}

template <typename Access>
constexpr auto bits(std::span<Word const> words) {
  auto made = number_of<Access>(FormKind::bits);
  made.words = words;
  return made;
}
template <auto kField>
constexpr auto bits(std::span<Word const> words) {
  return bits<NumberField<kField>>(words);
}

/// One bit of a number.
template <typename Access, std::int64_t kBit>
struct Bit {
  using Object = typename Access::Object;
  static std::int64_t load(Object const &object) {
    return (Access::load(object) & kBit) != 0 ? 1 : 0;
  }
  static void store(Object &object, std::int64_t value) {
    auto const others = Access::load(object) & ~kBit;
    Access::store(object, value != 0 ? others | kBit : others);
  }
};

/// Two numbers in two fields.
template <auto kFirst, auto kLast>
constexpr auto range(std::int64_t least, std::int64_t greatest) {
  auto made = number<kFirst>(least, greatest);
  auto const last = number<kLast>(least, greatest);
  made.kind = FormKind::range;
  made.load_end = last.load;
  made.store_end = last.store;
  return made;
}

template <typename Object>
constexpr FormOf<Object> whole_text(std::size_t most) {
  FormOf<Object> made;
  made.kind = FormKind::text;
  made.text = [](void const *object) { return *static_cast<Object const *>(object); };
  made.put_text = [](void *object, std::string_view text) {
    *static_cast<Object *>(object) = text;
  };
  made.most = most;
  return made;
}

/// A text that is an object by itself: an array of characters with room for its NUL.
template <typename Characters>
constexpr FormOf<Characters> array_text() {
  FormOf<Characters> made;
  made.kind = FormKind::text;
  made.text = [](void const *object) {
    return std::string(text_in(*static_cast<Characters const *>(object)));
  };
  made.put_text = [](void *object, std::string_view text) {
    auto &field = *static_cast<Characters *>(object);
    std::memset(field, 0, sizeof field);
    text.copy(field, sizeof field);
  };
  made.most = sizeof(Characters) - 1;
  return made;
}

/// A field that is such an array.
template <auto kField>
struct TextField {
  using Object = typename ClassOf<decltype(kField)>::Object;
  using Characters = typename ClassOf<decltype(kField)>::Value;
  static Characters const &in(Object const &object) { return object.*kField; }
  static Characters &in(Object &object) { return object.*kField; }
};

/// A text in the array that `Access` finds in an object.
template <typename Access>
constexpr FormOf<typename Access::Object> text() {
  using Object = typename Access::Object;
  using Characters = typename Access::Characters;
  FormOf<Object> made;
  made.kind = FormKind::text;
  made.text = [](void const *object) {
    return array_text<Characters>().text(&Access::in(*static_cast<Object const *>(object)));
  };
  made.put_text = [](void *object, std::string_view text) {
    array_text<Characters>().put_text(&Access::in(*static_cast<Object *>(object)), text);
  };
  made.most = array_text<Characters>().most;
  return made;
}

/// A text that is the name of an uplink, or of what stands for some.
template <typename Object>
constexpr FormOf<Object> of_uplinks(FormOf<Object> const &text) {
  auto made = text;
  made.of_uplinks = true;
  return made;
}

/// What is in a record that is a field of another.
template <auto kPart, typename Access>
struct In {
  using Object = typename ClassOf<decltype(kPart)>::Object;
  static std::int64_t load(Object const &object) { return Access::load(object.*kPart); }
  static void store(Object &object, std::int64_t value) { Access::store(object.*kPart, value); }
};
template <auto kPart, typename Access>
struct TextIn {
  using Object = typename ClassOf<decltype(kPart)>::Object;
  using Characters = typename Access::Characters;
  static Characters const &in(Object const &object) { return Access::in(object.*kPart); }
  static Characters &in(Object &object) { return Access::in(object.*kPart); }
};

template <typename Object>
constexpr Member member(std::string_view name, FormOf<Object> const &form, std::string_view says) {
  return {.name = name, .says = says, .form = form};
}
/// One that must be given.
template <typename Object>
constexpr Member required_member(std::string_view name, FormOf<Object> const &form,
                                 std::string_view says) {
  return {.name = name, .says = says, .form = form, .presence = Presence::required};
}
/// One that is left out while it is `absent`, a list or a text while it is empty, a record while
/// all of its members are left out.
template <typename Object>
constexpr Member sparse(std::string_view name, FormOf<Object> const &form, std::string_view says,
                        std::int64_t absent = 0) {
  return {.name = name,
          .says = says,
          .form = form,
          .presence = Presence::unless_absent,
          .absent = absent};
}

template <typename Object>
constexpr FormOf<Object> record(std::span<Member const> members) {
  FormOf<Object> made;
  made.kind = FormKind::record;
  made.members = members;
  return made;
}

/// A record that its first member can stand for.
template <typename Object>
constexpr FormOf<Object> record_or_first(std::span<Member const> members) {
  auto made = record<Object>(members);
  made.first_alone = true;
  return made;
}

/// One of the members, the one whose place among them is in the field.
template <auto kField>
constexpr auto one_of(std::span<Member const> members) {
  auto made = number_of<NumberField<kField>>(FormKind::one_of);
  made.members = members;
  return made;
}

/// A list whose elements `Access` counts, finds and appends; each begins as its type makes it.
template <typename Access>
constexpr FormOf<typename Access::Object> list(Form const &element, std::size_t most) {
  using Object = typename Access::Object;
  FormOf<Object> made;
  made.kind = FormKind::list;
  made.count = [](void const *object) {
    return Access::count(*static_cast<Object const *>(object));
  };
  made.element_at = [](void const *object, std::size_t index) -> void const * {
    return Access::at(*static_cast<Object const *>(object), index);
  };
  made.append = [](void *object) -> void * {
    return Access::append(*static_cast<Object *>(object));
  };
  made.element = &element;
  made.most = most;
  return made;
}

/// A vector in a field.
template <auto kField>
struct VectorField {
  using Object = typename ClassOf<decltype(kField)>::Object;
  static std::size_t count(Object const &object) { return (object.*kField).size(); }
  static void const *at(Object const &object, std::size_t index) {
    return &(object.*kField).at(index);
  }
  static void *append(Object &object) { return &(object.*kField).emplace_back(); }
};

/// A vector that is the whole object.
template <typename Vector>
struct WholeVector {
  using Object = Vector;
  static std::size_t count(Object const &object) { return object.size(); }
  static void const *at(Object const &object, std::size_t index) { return &object.at(index); }
  static void *append(Object &object) { return &object.emplace_back(); }
};

/// An address in so many bytes.
template <typename Access>
constexpr FormOf<typename Access::Object> address(FormKind kind) {
  using Object = typename Access::Object;
  FormOf<Object> made;
  made.kind = kind;
  made.bytes = [](void const *object) {
    return Access::bytes(*static_cast<Object const *>(object));
  };
  made.put_bytes = [](void *object, BytesView bytes) {
    Access::put(*static_cast<Object *>(object), bytes);
  };
  return made;
}

/// Every bit that a word stands for.
constexpr std::int64_t all_bits(std::span<Word const> words) {
  std::int64_t all = 0;
  for (auto const &word : words) {
    all |= word.value;
  }
  return all;
}

/// Whether a word stands for the number.
constexpr bool is_among(std::int64_t value, std::span<Word const> words) {
  for (auto const &word : words) {
    if (word.value == value) {
      return true;
    }
  }
  return false;
}

}  // namespace form

}  // namespace simhost
