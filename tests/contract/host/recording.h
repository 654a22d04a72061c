#ifndef TESTS_CONTRACT_HOST_RECORDING_H
#define TESTS_CONTRACT_HOST_RECORDING_H

/**
 * @file
 * CALL(name) implements a call of the host: it records its arguments and returns as told.
 *
 * All types come from the host's own declaration, so there is nothing here to get wrong.
 */

#include <array>
#include <cstring>
#include <type_traits>

#include "recorder.h"

namespace recording {

/** A text as a template argument. */
template <std::size_t size>
struct Name {
  consteval Name(char const (&literal)[size]) {
    for (std::size_t i = 0; i < size; ++i) {
      text[i] = literal[i];
    }
  }
  char text[size]{};
};

/** The spelling of a type, typedefs resolved. */
template <typename T>
consteval std::string_view type_name() {
  std::string_view const pretty = __PRETTY_FUNCTION__;
  std::string_view const before = "T = ";
  std::size_t const begin = pretty.find(before) + before.size();
  return pretty.substr(begin, pretty.find_first_of(";]", begin) - begin);
}

template <typename T>
concept Record = (std::is_class_v<T> || std::is_union_v<T>)&&requires {
  sizeof(T);
};

template <typename T>
consteval Parameter parameter() {
  using Pointee = std::remove_pointer_t<T>;
  if constexpr (std::is_same_v<T, char const *>) {
    return {type_name<T>(), Kind::text, 0};
  } else if constexpr (std::is_pointer_v<T> && Record<Pointee>) {
    return {type_name<T>(), Kind::pointer, sizeof(Pointee)};
  } else if constexpr (std::is_pointer_v<T>) {
    return {type_name<T>(), Kind::pointer, 0};
  } else {
    return {type_name<T>(), Kind::integer, 0};
  }
}

/** Enumerations cross as C ints, and may carry values that no enumerator has. */
template <typename T>
using Passed = std::conditional_t<std::is_enum_v<T>, int, T>;

template <typename T>
Argument seen(T value) {
  if constexpr (std::is_pointer_v<T>) {
    return {reinterpret_cast<std::uint64_t>(value)};
  } else {
    return {static_cast<std::uint64_t>(static_cast<std::int64_t>(value))};
  }
}

template <Name name, typename Function>
struct Call;

template <Name name, typename Result, typename... Parameters>
struct Call<name, Result(Parameters...)> {
  static constexpr std::array<Parameter, sizeof...(Parameters)> parameters{
      parameter<Parameters>()...};

  static Passed<Result> call(Passed<Parameters>... arguments) {
    std::array<Argument, sizeof...(Parameters)> const all{seen(arguments)...};
    Answer const answer = record(name.text, all);
    if (answer.sprung) {
      spring();
    }
    if constexpr (!std::is_void_v<Result>) {
      // Byte order makes the low bytes the first.
      Passed<Result> result;
      std::memcpy(&result, &answer.bits, sizeof result);
      return result;
    }
  }
};

struct Declaration {
  template <Name name, typename Result, typename... Parameters>
  explicit Declaration(Call<name, Result(Parameters...)> call) {
    declare(name.text, type_name<Result>(), call.parameters);
  }
};

}  // namespace recording

// NOLINTBEGIN(bugprone-macro-parentheses): the arguments are names
// A function cannot be defined from its type, but its symbol can be resolved to one that was. The
// resolver runs while the library is being relocated, so it does nothing else.
#define CALL(function)                                                                 \
  extern "C" decltype(&function) resolve_##function() {                                \
    return reinterpret_cast<decltype(&function)>(                                      \
        &recording::Call<#function, decltype(function)>::call);                        \
  }                                                                                    \
  extern "C" __attribute__((visibility("default"),                                     \
                            ifunc("resolve_" #function))) decltype(function) function; \
  static recording::Declaration const declare_##function {                             \
    recording::Call<#function, decltype(function)> {}                                  \
  }
// NOLINTEND(bugprone-macro-parentheses)

#endif  // TESTS_CONTRACT_HOST_RECORDING_H
