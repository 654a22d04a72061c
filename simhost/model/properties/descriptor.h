// The declaration of a setting, from which everything else about it comes: what the raw calls
// check, what the typed calls read and write, its default, what it is called in documents, and the
// reference. Each is a constant in the folder of its domain:
//
//   inline constexpr auto mtu = property<qex_uint32>(VSPROP_MTU)
//       .of_switch().typed().within(kLeast, kGreatest).defaults_to(kDefault)
//       .json("mtu").says("bytes that a frame may have");
#pragma once

#include <concepts>
#include <cstdint>
#include <functional>
#include <limits>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <vector>

#include "base/api.h"
#include "base/bytes.h"
#include "base/outcomes.h"
#include "model/properties/codec.h"
#include "model/properties/form.h"
#include "qexapi/types.h"
#include "storage/properties.h"

namespace simhost {

/// A property and the bytes that it is to have.
struct Setting {
  storage::ChangingTransaction &transaction;
  storage::PropertyOwner const &owner;
  BytesView value;
};

/// What is done with a value of its own.
using Use = std::function<void(void *value)>;

struct Descriptor;

/// Another property that a document says as a part of this one.
struct Companion {
  Descriptor const *property = nullptr;
  std::string_view member;
  /// What the value has for it; nothing if it is not to be set.
  std::optional<Bytes> (*part_of)(void const *value) = nullptr;
  void (*join)(void *value, BytesView part) = nullptr;
};

/// A setting whatever its value is in C++; see Property.
struct Descriptor {
  std::string_view key;
  storage::PropertyScope scope = storage::PropertyScope::global;
  /// What typed calls and documents store it as.
  storage::PropertyType type = storage::PropertyType::config;
  bool is_typed = false;  ///< has typed calls
  bool is_any_bytes = false;

  /// Refuses bytes that are no value, whatever else the host has.
  void (*check_value)(Descriptor const &descriptor, BytesView bytes) = nullptr;
  /// A further rule for that; null if there is none.
  void (*check_rule)(void const *value) = nullptr;
  /// Refuses values that do not go with what else the host has; null if all do.
  void (*check_place)(Setting const &setting) = nullptr;
  /// If the value is computed, that is, not what is stored under the key: reads it.
  Bytes (*read)(storage::Transaction &, storage::PropertyOwner const &) = nullptr;
  /// Likewise: writes it; null if callers may only read it.
  void (*write)(Setting const &setting) = nullptr;

  /// The bytes of the default after `change` has changed it.
  Bytes (*make)(Descriptor const &descriptor, Use const &change) = nullptr;
  /// Hands the value that the bytes are to `look`; refuses other bytes.
  void (*see)(BytesView bytes, Use const &look) = nullptr;
  bool has_default = false;  ///< something stands for it while it is not set
  /// The switch's property whose value a port without one uses; null if there is none.
  Descriptor const *inherited = nullptr;

  std::string_view name;              ///< in documents; empty if only its bytes are
  std::string_view uplink_port_name;  ///< likewise, of an uplink port
  bool is_always_said = false;        ///< its default, too
  Form form;
  Companion companion;

  std::string_view bytes;       ///< what they are, for the reference
  std::string_view words;       ///< what it means; of one of any bytes, why it takes them
  bool frames_obey_it = false;  ///< where frames move; others are kept, and no frame looks at them
  std::string_view beyond_frames;  ///< the member that frames cannot obey all the same, and why
  QEX_ReturnStatus outside = QEX_BAD_PARAM;  ///< for a number out of its bounds

  [[nodiscard]] constexpr bool is_computed() const { return read != nullptr; }
  [[nodiscard]] constexpr bool is_read_only() const { return read != nullptr && write == nullptr; }
  /// The default as bytes.
  [[nodiscard]] Bytes default_bytes() const {
    return make(*this, [](void *) {});
  }
};

/// Refuses bytes that a property may not have there.
SIMHOST_API void check_setting(Descriptor const &descriptor, Setting const &setting);
/// Refuses a number that its form does not say.
SIMHOST_API void check_number(Descriptor const &descriptor, std::int64_t number);
/// Refuses bits that no word of its form stands for (QEX_BAD_PARAM).
SIMHOST_API void check_bits(Descriptor const &descriptor, std::int64_t bits);
/// Refuses a text that is longer than its form says (QEX_NAME_TOO_LONG).
SIMHOST_API void check_text(Descriptor const &descriptor, std::string_view text);

template <typename Value>
struct Property : Descriptor {
  /// The default of a text is one that a constant can have.
  using Default = std::conditional_t<
      std::same_as<Value, std::string>, std::string_view,
      std::conditional_t<std::is_trivially_copyable_v<Value>, Value, std::nullptr_t>>;
  Default unset{};

  /// What stands for a value that is not set.
  [[nodiscard]] Value default_value() const {
    if constexpr (std::same_as<Default, std::nullptr_t>) {
      return Value{};
    } else {
      return Value(unset);
    }
  }

  [[nodiscard]] constexpr Property of_switch() const {
    return with_owner(storage::PropertyScope::global, storage::PropertyType::config);
  }
  /// Of the host's part of a switch.
  [[nodiscard]] constexpr Property of_host() const {
    return with_owner(storage::PropertyScope::host, storage::PropertyType::config);
  }
  [[nodiscard]] constexpr Property of_port() const {
    return with_owner(storage::PropertyScope::port, storage::PropertyType::policy);
  }
  /// The type, where it is another than a switch's or a port's usually is.
  [[nodiscard]] constexpr Property config() const {
    return with_type(storage::PropertyType::config);
  }
  [[nodiscard]] constexpr Property runtime() const {
    return with_type(storage::PropertyType::runtime);
  }
  [[nodiscard]] constexpr Property transient() const {
    return with_type(storage::PropertyType::transient);
  }
  [[nodiscard]] constexpr Property typed() const {
    auto made = *this;
    made.is_typed = true;
    made.has_default = true;
    return made;
  }

  [[nodiscard]] constexpr Property defaults_to(Default value) const {
    auto made = *this;
    made.unset = value;
    made.has_default = true;
    return made;
  }
  [[nodiscard]] constexpr Property inherits(Property const &property) const {
    auto made = defaults_to(property.unset);
    made.inherited = &property;
    return made;
  }

  [[nodiscard]] constexpr Property within(std::int64_t least, std::int64_t greatest,
                                          QEX_ReturnStatus otherwise = QEX_BAD_PARAM) const {
    auto made = *this;
    made.form.least = least;
    made.form.greatest = greatest;
    made.outside = otherwise;
    return made;
  }
  [[nodiscard]] constexpr Property among(std::span<Word const> words_of_values) const {
    auto made = *this;
    made.form = form::choice<form::WholeNumber<Value>>(words_of_values);
    return made;
  }
  /// A text of so many bytes.
  [[nodiscard]] constexpr Property up_to(std::size_t most) const {
    auto made = *this;
    made.form.most = most;
    return made;
  }
  /// A text that is the name of an uplink, or of what stands for some.
  [[nodiscard]] constexpr Property of_uplinks() const {
    auto made = *this;
    made.form.of_uplinks = true;
    return made;
  }
  /// A rule for values by themselves; it refuses what is against it.
  template <auto kRule>
  [[nodiscard]] constexpr Property obeys() const {
    auto made = *this;
    made.check_rule = [](void const *value) { kRule(*static_cast<Value const *>(value)); };
    return made;
  }
  /// Likewise for values and what else the host has, which may change while they stay.
  [[nodiscard]] constexpr Property fits(void (*rule)(Setting const &setting)) const {
    auto made = *this;
    made.check_place = rule;
    return made;
  }
  [[nodiscard]] constexpr Property computed_by(Bytes (*reader)(storage::Transaction &,
                                                               storage::PropertyOwner const &),
                                               void (*writer)(Setting const &) = nullptr) const {
    auto made = *this;
    made.read = reader;
    made.write = writer;
    return made;
  }

  [[nodiscard]] constexpr Property json(std::string_view member) const {
    auto made = *this;
    made.name = member;
    made.has_default = true;
    return made;
  }
  [[nodiscard]] constexpr Property json(std::string_view member,
                                        FormOf<Value> const &said_as) const {
    auto made = json(member);
    made.form = said_as;
    return made;
  }
  [[nodiscard]] constexpr Property json_of_uplink_port(std::string_view member) const {
    auto made = *this;
    made.uplink_port_name = member;
    return made;
  }
  [[nodiscard]] constexpr Property always_said() const {
    auto made = *this;
    made.is_always_said = true;
    return made;
  }
  /// A property whose value documents say as the member of that name.
  template <typename Other, auto kPart, auto kJoin>
  [[nodiscard]] constexpr Property together_with(Property<Other> const &property,
                                                 std::string_view member) const {
    auto made = *this;
    made.companion = {
        .property = &property,
        .member = member,
        .part_of = [](void const *value) -> std::optional<Bytes> {
          std::optional<Other> const part = std::invoke(kPart, *static_cast<Value const *>(value));
          return part ? std::optional(Codec<Other>::bytes(*part)) : std::nullopt;
        },
        .join =
            [](void *value, BytesView part) {
              std::invoke(kJoin, *static_cast<Value *>(value), Codec<Other>::value(part));
            }};
    return made;
  }

  /// What becomes of frames depends on it.
  [[nodiscard]] constexpr Property frames_obey() const {
    auto made = *this;
    made.frames_obey_it = true;
    return made;
  }
  /// But not on that member of it.
  [[nodiscard]] constexpr Property frames_cannot(std::string_view member_and_reason) const {
    auto made = *this;
    made.beyond_frames = member_and_reason;
    return made;
  }

  [[nodiscard]] constexpr Property says(std::string_view meaning) const {
    auto made = *this;
    made.words = meaning;
    return made;
  }
  /// Why the host looks at none of the bytes.
  [[nodiscard]] constexpr Property any_bytes(
      std::string_view reason) const requires std::same_as<Value, Bytes> {
    auto made = says(reason);
    made.is_any_bytes = true;
    return made;
  }
  /// What the bytes are, where the type does not tell.
  [[nodiscard]] constexpr Property in_bytes(std::string_view what) const {
    auto made = *this;
    made.bytes = what;
    return made;
  }

 private:
  [[nodiscard]] constexpr Property with_owner(storage::PropertyScope owner,
                                              storage::PropertyType usual) const {
    auto made = with_type(usual);
    made.scope = owner;
    return made;
  }
  [[nodiscard]] constexpr Property with_type(storage::PropertyType other) const {
    auto made = *this;
    made.type = other;
    return made;
  }
};

/// The name of a type as the headers spell it.
template <typename Type>
constexpr std::string_view type_name() {
  constexpr std::string_view kBegin = "Type = ";
  std::string_view const all = __PRETTY_FUNCTION__;
  auto const first = all.find(kBegin) + kBegin.size();
  return all.substr(first, all.find_first_of(";]", first) - first);
}

template <typename Value>
struct BytesName {
  static constexpr std::string_view kName = type_name<Value>();
};
template <std::integral Number>
struct BytesName<Number> {
  static constexpr std::string_view kName = sizeof(Number) == 1   ? "1 byte"
                                            : sizeof(Number) == 2 ? "2 bytes"
                                                                  : "4 bytes";
};
template <>
struct BytesName<Bytes> {
  static constexpr std::string_view kName = "bytes";
};
template <>
struct BytesName<std::string> {
  static constexpr std::string_view kName = "text and its NUL";
};
template <CodesItself Value>
struct BytesName<Value> {
  static constexpr std::string_view kName = Value::kBytes;
};

template <typename Value>
constexpr Form usual_form() {
  if constexpr (std::same_as<Value, qex_Bool>) {
    return form::boolean<form::WholeNumber<Value>>();
  } else if constexpr (std::integral<Value>) {
    return form::number<form::WholeNumber<Value>>(std::numeric_limits<Value>::min(),
                                                  std::numeric_limits<Value>::max());
  } else if constexpr (std::same_as<Value, std::string>) {
    return form::whole_text<Value>(0);
  } else {
    return {};
  }
}

/// A property of that key: of a switch, a configuration, unless something else is said.
template <typename Value>
constexpr Property<Value> property(std::string_view key) {
  Property<Value> made;
  made.key = key;
  made.form = usual_form<Value>();
  made.bytes = BytesName<Value>::kName;
  made.check_value = [](Descriptor const &descriptor, BytesView bytes) {
    auto const value = Codec<Value>::value(bytes);
    if constexpr (std::integral<Value>) {
      check_number(descriptor, value);
    } else if constexpr (std::same_as<Value, std::string>) {
      check_text(descriptor, value);
    } else if (descriptor.form.kind == FormKind::bits) {
      check_bits(descriptor, descriptor.form.load(&value));
    }
    if (descriptor.check_rule != nullptr) {
      descriptor.check_rule(&value);
    }
  };
  made.make = [](Descriptor const &descriptor, Use const &change) {
    auto value = static_cast<Property<Value> const &>(descriptor).default_value();
    change(&value);
    return Codec<Value>::bytes(value);
  };
  made.see = [](BytesView bytes, Use const &look) {
    auto value = Codec<Value>::value(bytes);
    look(&value);
  };
  return made;
}

}  // namespace simhost
