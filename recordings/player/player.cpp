#include "recordings/player/player.h"

#include <pthread.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <deque>
#include <memory>
#include <mutex>
#include <string_view>

#include "recordings/core/kept_errno.h"
#include "recordings/core/of_thread.h"
#include "recordings/core/process.h"
#include "recordings/core/signatures.h"
#include "recordings/player/playing.h"
#include "recordings/player/trap.h"

namespace recordings {
namespace {

constexpr char const *trace_variable = "VSWITCH_PLAY_TRACE";
constexpr char const *ledger_variable = "VSWITCH_PLAY_LEDGER";
constexpr char const *by_variable = "VSWITCH_PLAY_BY";

/// What is played, and what was: tools may still hold memory of that.
struct State {
  std::mutex mutex;
  std::unique_ptr<Playing> playing;
  std::deque<Holdings> ended;
  std::uint64_t began = 0;  ///< how often
  pid_t process = 0;
};

// Never destroyed: tools call until the very end of their process.
State &state() {
  static auto *const the_state = new State;
  return *the_state;
}

constinit std::atomic<bool> plays{};
constinit std::atomic<bool> has_ended{};

/// This thread's calls in progress, and its place in the trace.
struct Thread {
  std::uint64_t began = 0;
  pid_t process = 0;
  ThreadPlace place;
  std::vector<InProgress> calls;
};

/// What is played in this process; the trace that the environment names is read when it is needed.
Playing &playing() {
  State &all = state();
  if (all.playing == nullptr) {
    char const *const trace = std::getenv(trace_variable);
    char const *const ledger = std::getenv(ledger_variable);
    char const *const by = std::getenv(by_variable);
    if (trace == nullptr || ledger == nullptr) {
      throw Unplayed("the recording has ended");
    }
    bool const is_by_arguments = by != nullptr && std::string_view(by) == "arguments";
    try {
      all.playing =
          std::make_unique<Playing>(trace, ledger, is_by_arguments ? By::arguments : By::order);
    } catch (Unplayable const &unplayable) {
      throw Unplayed(trace + std::string(": ") + unplayable.what());
    }
    all.process = process_id();
  }
  if (all.process != process_id()) {
    all.process = process_id();
    all.playing->be_child();
  }
  return *all.playing;
}

/// This thread, without the calls that a jump has left, and as new in a new recording or process.
Thread &this_thread(void const *frame) {
  Thread &thread = OfThread<Thread>::get();
  if (thread.began != state().began || thread.process != process_id()) {
    thread = {state().began, process_id(), {}, {}};
  }
  while (!thread.calls.empty() && thread.calls.back().frame < frame) {
    thread.calls.pop_back();
  }
  return thread;
}

/// The call in progress that has this frame.
InProgress &in_progress(Thread &thread, void const *frame) {
  if (thread.calls.empty() || thread.calls.back().frame != frame) {
    throw Unplayed("this call began in another process, or in a recording that has ended");
  }
  return thread.calls.back();
}

void tell(std::string_view words) {
  std::fprintf(stderr, "vswitch play: %.*s\n", static_cast<int>(words.size()), words.data());
}

/// As the text of an exception, which programs show in a line.
std::string in_one_line(std::string words) {
  constexpr std::string_view between = "\n  ";
  for (auto at = words.find(between); at != std::string::npos; at = words.find(between, at)) {
    words.replace(at, between.size(), "; ");
  }
  return words;
}

Ending failed(std::string const &words) {
  tell(words);
  if (state().playing != nullptr) {
    state().playing->note_failure(words);
  }
  keep_trap_text(in_one_line(words));
  return {Ending::Way::fails, 1, 1, "RuntimeError"};
}

/// Does a part of a call; whatever is wrong ends the call. No part may wait for the interpreter: a
/// thread that has its lock may be waiting for this one.
template <typename Part>
Ending carefully(Part part) noexcept {
  KeptErrno const kept;
  std::scoped_lock const lock(state().mutex);
  try {
    return part();
  } catch (std::exception const &error) {
    return failed(error.what());
  }
}

constexpr Ending goes_on{Ending::Way::returns, 0, 0, nullptr};

Ending begin(void const *frame, Call const &call, Words words) noexcept {
  return carefully([&] {
    Playing &all = playing();
    // One that had the place of this frame was left, too.
    Thread &thread = this_thread(static_cast<char const *>(frame) + 1);
    auto const outer = thread.calls.empty() ? std::nullopt : thread.calls.back().callback;
    auto found = all.begin(thread.place, call, words, outer);
    found.frame = frame;
    thread.calls.push_back(found);
    return goes_on;
  });
}

/// A word of 1 says that there is one.
Ending next_callback(void const *frame, Words words, Callback &callback) noexcept {
  return carefully([&] {
    auto const next = playing().next_callback(in_progress(this_thread(frame), frame), words);
    if (next) {
      callback = *next;
    }
    return Ending{Ending::Way::returns, next ? 1U : 0U, 0, nullptr};
  });
}

Ending end_callback(void const *frame, std::uint64_t result) noexcept {
  return carefully([&] {
    Thread &thread = this_thread(frame);
    playing().end_callback(thread.place, in_progress(thread, frame), result);
    return goes_on;
  });
}

Ending end(void const *frame, Words words) noexcept {
  return carefully([&] { return playing().end(in_progress(this_thread(frame), frame), words); });
}

void leave(void const *frame) noexcept {
  KeptErrno const kept;
  std::scoped_lock const lock(state().mutex);
  Thread &thread = this_thread(frame);
  if (!thread.calls.empty() && thread.calls.back().frame == frame) {
    thread.calls.pop_back();
  }
}

/// Calls the tool's function, which may jump over this frame.
std::uint64_t call_back(Callback const &callback) {
  switch (callback.kind) {
    case Callback::Kind::visit: {
      auto *const visit = reinterpret_cast<Visit>(callback.function);
      return word_of(visit(value_of<void *>(callback.first), value_of<void *>(callback.second)));
    }
    case Callback::Kind::alloc: {
      auto *const alloc = reinterpret_cast<Allocate>(callback.function);
      return word_of(alloc(callback.first));
    }
    case Callback::Kind::release:
      reinterpret_cast<Release>(callback.function)(value_of<void *>(callback.first));
      break;
  }
  return 0;
}

/// What the tool has printed by then is not lost. A stream in which a thread waits is let be.
void flush_printed() noexcept {
  if (ftrylockfile(stdout) == 0) {
    std::fflush(stdout);
    funlockfile(stdout);
  }
}

/// Jumps, or ends the process where nothing leads anywhere.
[[noreturn]] void raise(Call const &call, SavedTrap const &trap, Ending const &ending) noexcept {
  if (call.is_armed && is_armed(trap)) {
    spring_trap(trap, ending.class_name, ending.word != 0, ending.value);
  }
  if (ending.way == Ending::Way::traps) {
    tell(kept_trap_text());
  }
  flush_printed();
  _exit(exit_status);
}

/// Whether a call is given what was given out in a recording that has ended.
bool is_left_over(Call const &call, std::uint64_t const *words) noexcept {
  if (!has_ended.load(std::memory_order_relaxed)) {
    return false;
  }
  std::scoped_lock const lock(state().mutex);
  for (std::size_t at = 0; at < call.arguments.size(); ++at) {
    auto const passing = call.arguments[at].passing;
    if ((passing == Passing::handle || passing == Passing::released) &&
        std::ranges::any_of(state().ended,
                            [&](Holdings const &one) { return one.is_of_this(words[at]); })) {
      return true;
    }
  }
  return false;
}

bool releases(Call const &call) {
  return std::ranges::any_of(call.arguments, [](Argument const &argument) {
    return argument.passing == Passing::released;
  });
}

void lock_state() {
  state().mutex.lock();
}

void unlock_state() {
  state().mutex.unlock();
}

[[gnu::constructor]] void look_at_environment() {
  char const *const trace = std::getenv(trace_variable);
  if (trace != nullptr && *trace != '\0') {
    plays = true;
  }
  pthread_atfork(lock_state, unlock_state, unlock_state);
}

}  // namespace

bool is_played(Call const &call, std::uint64_t const *words) noexcept {
  return plays.load(std::memory_order_relaxed) || is_left_over(call, words);
}

// Nothing here has a destructor: the tool's functions, and the traps, may jump over it.
std::uint64_t play(Call const &call, std::uint64_t const *words) {
  if (is_left_over(call, words)) {
    // What is left of it, and whoever still has it, goes with it.
    if (releases(call)) {
      return 0;
    }
    refuse_call(call, "what it is given belongs to a recording that has ended");
  }
  SavedTrap trap;
  save_trap(trap);
  Callback callback{};
  auto ending = begin(&trap, call, words);
  while (ending.way == Ending::Way::returns) {
    ending = next_callback(&trap, words, callback);
    if (ending.way != Ending::Way::returns || ending.word == 0) {
      break;
    }
    ending = end_callback(&trap, call_back(callback));
  }
  if (ending.way == Ending::Way::returns) {
    ending = end(&trap, words);
  }
  leave(&trap);
  restore_trap(trap);
  if (ending.way != Ending::Way::returns) {
    raise(call, trap, ending);
  }
  return ending.word;
}

void refuse_call(Call const &call, char const *why) noexcept {
  SavedTrap trap;
  save_trap(trap);
  auto const ending =
      carefully([&]() -> Ending { throw Unplayed(std::string(call.name) + ": " + why); });
  raise(call, trap, ending);
}

void begin_playing(std::string const &trace, std::string const &ledger, By by) {
  end_playing();
  std::scoped_lock const lock(state().mutex);
  state().playing = std::make_unique<Playing>(trace, ledger, by);
  state().process = process_id();
  ++state().began;
  plays = true;
}

void end_playing() noexcept {
  std::scoped_lock const lock(state().mutex);
  plays = false;
  if (state().playing != nullptr) {
    state().ended.push_back(state().playing->take_holdings());
    state().playing.reset();
    has_ended = true;
  }
}

std::string first_failure() {
  std::scoped_lock const lock(state().mutex);
  return state().playing == nullptr ? "" : state().playing->first_failure();
}

}  // namespace recordings
