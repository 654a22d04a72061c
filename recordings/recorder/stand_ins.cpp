#include "recordings/recorder/stand_ins.h"

#include <array>
#include <atomic>
#include <utility>

#include "recordings/core/identities.h"

namespace recordings {
namespace {

constexpr std::size_t most_functions = 32;

template <typename Function>
void *address_of(Function function) {
  return reinterpret_cast<void *>(function);
}

Given pointer(std::string_view name, void const *value) {
  return {name, true, reinterpret_cast<std::uint64_t>(value)};
}

char visit(void *reached, void *context) {
  auto *const given = reinterpret_cast<Visit>(callback_in_progress());
  char here = 0;
  auto const second = pointer("context", context);
  auto const number = begin_callback(&here, "callback", pointer("reached", reached), &second);
  char const result = given(reached, context);
  Given const told{"result", false, static_cast<std::uint64_t>(result)};
  end_callback(number, &told);
  return result;
}

std::array<std::atomic<Allocate>, most_functions> allocators;
std::array<std::atomic<Release>, most_functions> releasers;

template <std::size_t slot>
void *allocate(std::size_t size) {
  char here = 0;
  auto const number = begin_callback(&here, "alloc", {"size", false, size}, nullptr);
  void *const result = allocators[slot].load()(size);
  auto const told = pointer("result", result);
  end_callback(number, &told);
  return result;
}

template <std::size_t slot>
void release(void *memory) {
  char here = 0;
  auto const number = begin_callback(&here, "release", pointer("memory", memory), nullptr);
  forget(reinterpret_cast<std::uint64_t>(memory));
  releasers[slot].load()(memory);
  end_callback(number, nullptr);
}

template <std::size_t... slots>
constexpr std::array<Allocate, most_functions> all_allocate(std::index_sequence<slots...> /**/) {
  return {allocate<slots>...};
}
template <std::size_t... slots>
constexpr std::array<Release, most_functions> all_release(std::index_sequence<slots...> /**/) {
  return {release<slots>...};
}

constexpr auto every_slot = std::make_index_sequence<most_functions>();
constexpr auto allocate_in = all_allocate(every_slot);
constexpr auto release_in = all_release(every_slot);

template <typename Function>
Function in_a_slot(std::array<std::atomic<Function>, most_functions> &held,
                   std::array<Function, most_functions> const &stand_ins, Function given) {
  if (given == nullptr) {
    return given;
  }
  for (std::size_t slot = 0; slot < most_functions; ++slot) {
    Function there = nullptr;
    if (held[slot].compare_exchange_strong(there, given) || there == given) {
      return stand_ins[slot];
    }
  }
  return given;
}

template <typename Function>
void *given_in_slots(std::array<std::atomic<Function>, most_functions> const &held,
                     std::array<Function, most_functions> const &stand_ins, void *function) {
  for (std::size_t slot = 0; slot < most_functions; ++slot) {
    if (address_of(stand_ins[slot]) == function) {
      return address_of(held[slot].load());
    }
  }
  return function;
}

}  // namespace

Visit stand_in(Frame &frame, Visit given) noexcept {
  if (given == nullptr) {
    return given;
  }
  note_callback(frame, address_of(given));
  return visit;
}

Allocate stand_in(Frame & /*frame*/, Allocate given) noexcept {
  return in_a_slot(allocators, allocate_in, given);
}

Release stand_in(Frame & /*frame*/, Release given) noexcept {
  return in_a_slot(releasers, release_in, given);
}

}  // namespace recordings

void *recorder_given_for(void *function) {
  using namespace recordings;
  if (function == address_of(visit)) {
    return callback_in_progress();
  }
  return given_in_slots(allocators, allocate_in, given_in_slots(releasers, release_in, function));
}
