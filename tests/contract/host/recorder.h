#ifndef TESTS_CONTRACT_HOST_RECORDER_H
#define TESTS_CONTRACT_HOST_RECORDER_H

/**
 * @file
 * What the two recording libraries share: the list of calls so far, and what to return next.
 *
 * The first half is for the libraries (see recording.h), the second for the tests, which reach it
 * through ctypes.
 */

#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>

namespace recording {

enum class Kind { integer, text, pointer };

/** A parameter by its declaration. */
struct Parameter {
  std::string_view type;
  Kind kind;
  std::size_t memory; /**< size of the record that a pointer leads to; 0 if it leads to none */
};

/** An argument: an integer with its sign extended, or an address. */
struct Argument {
  std::uint64_t bits;
};

/** What a call does next. Trivial, so that a long jump may cross its frame. */
struct Answer {
  std::uint64_t bits; /**< the result, in as many low bytes as it has */
  bool sprung;        /**< spring() instead of returning */
};

/** Makes a call known; its name and types must be literals. */
void declare(std::string_view function, std::string_view result,
             std::span<Parameter const> parameters) noexcept;

/** Notes one call, fills its output parameters as told, and says what to return. */
Answer record(std::string_view name, std::span<Argument const> arguments) noexcept;

/** Springs the trap in the call in progress, as record() was told; its frames hold nothing to
 * destroy. */
[[noreturn]] void spring() noexcept;

}  // namespace recording

extern "C" {

/**
 * Calls are counted from 1 since the last reset; `nth` 0 means every call that no rule of its own
 * names. Arguments are counted from 1. Each function returns 0, or -1 if there is no such call or
 * argument. Texts that are returned live until the next call of the same function.
 */

/** Forgets all calls and rules. */
void recorder_reset(void);

/** All calls that the libraries implement: {name: {"result": type, "parameters": [type, ...]}}. */
char const *recorder_functions(void);

/** The calls since the last reset, in order, as a JSON list. */
char const *recorder_calls(void);

/** Notes no more calls until the next reset; they are counted and return as before. */
void recorder_take_no_notes(void);

/** Sets the result: a sign-extended integer or an address. Without a rule it is 0 or null. */
int recorder_answer(char const *function, unsigned nth, std::uint64_t bits);

/**
 * Sets the bytes that an output parameter receives; they are copied now. Without a rule the memory
 * is left as the caller passed it.
 */
int recorder_output(char const *function, unsigned nth, unsigned argument, void const *bytes,
                    std::size_t size);

/** Also records this many bytes of what a pointer argument leads to. */
int recorder_capture(char const *function, unsigned argument, std::size_t size);

/** Lets a call take its time. */
int recorder_delay(char const *function, unsigned nth, unsigned milliseconds);

/**
 * Springs the call trap, before or after the outputs are written. `type` is a Python exception
 * type that the caller keeps alive; the message is copied. `value` is the jump's value, not 0.
 */
int recorder_spring(char const *function, unsigned nth, void *type, char const *message, int value,
                    int after_outputs);

/** Whether the trap's symbols were found, which they are if the module loaded these libraries. */
int recorder_has_trap(void);

/** The trap's exception_status, as a library sees it. */
int recorder_exception_status(void);
void recorder_set_exception_status(int value);
}

#endif  // TESTS_CONTRACT_HOST_RECORDER_H
