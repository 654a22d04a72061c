#include "recordings/recorder/frames.h"

#include <atomic>
#include <cstring>

#include "recordings/core/identities.h"
#include "recordings/core/kept_errno.h"
#include "recordings/core/of_thread.h"
#include "recordings/core/process.h"
#include "recordings/core/trap.h"
#include "recordings/core/values.h"
#include "recordings/recorder/trace.h"
#include "vswitch/call_trap.h"

// Weak: there is a trap only with the module.
#pragma weak exception_buffer
#pragma weak exceptionType
#pragma weak exceptionMsg

namespace recordings {
namespace {

/// What is known of a call or a callback in progress. It is not in the frame itself: a jump may
/// have left that, and its memory may be another's.
struct Entry {
  void const *frame;
  Call const *call;  ///< null for a callback
  void *callback;    ///< that the tool gave to the call
  std::uint64_t number;
  std::uint64_t armed_before;
  std::uint64_t released;         ///< what the call ends, for the host to release meanwhile
  std::uint64_t released_number;  ///< which nothing else may have by then
  pid_t process;
  bool is_armed;
};

struct Thread {
  std::uint64_t number = 0;
  std::size_t depth = 0;
  Room entries;
  Line line;

  [[nodiscard]] Entry &at(std::size_t index) const {
    return reinterpret_cast<Entry *>(entries.data())[index];
  }
  [[nodiscard]] Entry *top() const { return depth == 0 ? nullptr : &at(depth - 1); }
};

// The thread whose frame the trap leads to; 0 for none. The buffer is one for the whole process,
// and a thread that arms nothing itself must not take it from one that does.
constinit std::atomic<std::uint64_t> armed_thread{};

// What the tool gave to a walk, for a host that calls back in a thread of its own.
constinit std::atomic<void *> last_callback{};

Thread &this_thread() {
  Thread &thread = OfThread<Thread>::get();
  if (thread.number == 0) {
    thread.number = next_thread();
  }
  return thread;
}

/// Whether the trap is now this thread's to lead to its frame; `before` is whose it was.
bool take_trap(Thread const &thread, std::uint64_t &before) {
  before = armed_thread.load();
  return before == thread.number ||
         (before == 0 && armed_thread.compare_exchange_strong(before, thread.number));
}

bool trap_is_there() {
  return &exception_buffer != nullptr && &exceptionType != nullptr && &exceptionMsg != nullptr;
}

Line &start_line(Thread &thread, std::string_view what, std::uint64_t number) {
  thread.line.clear();
  thread.line.raw("{").member(what).number(number);
  thread.line.member("process").number(std::int64_t{process_id()});
  return thread.line;
}

void finish_line(Line &line, std::string_view what, std::uint64_t number,
                 File file = File::may_be_closed) {
  line.raw("}\n");
  if (!line.is_whole()) {
    // There was no memory for it: that it was there is still told.
    line.clear();
    line.raw("{").member(what).number(number);
    line.member("process").number(std::int64_t{process_id()});
    line.member("unread").text("no memory to write it in").raw("}\n");
  }
  write_line(line, file);
}

/// Whether the entry's begin is in the trace of this process: a child of a fork has no part in it.
bool is_ours(Entry const &entry) {
  return entry.process == process_id();
}

/// Ends what a jump has left above the entry with a frame.
void drop_left(Thread &thread, void const *frame) {
  while (thread.depth > 0 && thread.top()->frame < frame) {
    Entry const &left = *thread.top();
    if (left.is_armed) {
      armed_thread = left.armed_before;
    }
    if (is_ours(left)) {
      Line &line = start_line(thread, "end", left.number);
      line.member("left").raw("true");
      finish_line(line, "end", left.number);
    }
    --thread.depth;
  }
}

/// Likewise before a frame that is new: one that had its place was left, too.
void drop_left_before(Thread &thread, void const *frame) {
  drop_left(thread, static_cast<char const *>(frame) + 1);
}

bool push(Thread &thread, Entry const &entry) {
  if (!thread.entries.reserve((thread.depth + 1) * sizeof(Entry))) {
    return false;
  }
  thread.at(thread.depth++) = entry;
  return true;
}

/// Takes the entry of a frame that ends.
Entry pop(Thread &thread, void const *frame) {
  drop_left(thread, frame);
  Entry const entry = *thread.top();
  --thread.depth;
  return entry;
}

/// Which event an event is within, if that is in the trace of this process.
void write_within(Line &line, Thread const &thread) {
  if (thread.depth > 0 && is_ours(*thread.top())) {
    line.member("within").number(thread.top()->number);
  }
}

void write_begin(Thread &thread, Frame const &frame, Entry const &entry, std::int64_t moment) {
  Line &line = start_line(thread, "call", entry.number);
  line.member("thread").number(thread.number);
  write_within(line, thread);
  line.member("function").raw("\"").raw(entry.call->name).raw("\"");
  line.member("at").number(since_start(moment));
  write_inputs(line, *entry.call, static_cast<Words>(frame.words));
  finish_line(line, "call", entry.number);
}

void forget_released(Entry &entry, Frame const &frame) {
  Call const &call = *entry.call;
  for (std::size_t at = 0; at < call.arguments.size(); ++at) {
    if (call.arguments[at].passing == Passing::released && frame.words[at] != 0) {
      entry.released = frame.words[at];
      entry.released_number = identity_of(entry.released);
      forget(entry.released);
    }
  }
}

/// The trap leads to the caller again, unless it was armed for another meanwhile.
void disarm(Frame const &frame, Entry const &entry) {
  if (!frame.is_armed) {
    return;
  }
  armed_thread = entry.armed_before;
  // Copies of one buffer, padding and all.
  // NOLINTNEXTLINE(bugprone-suspicious-memory-comparison)
  if (std::memcmp(&exception_buffer, &frame.own, sizeof frame.own) == 0) {
    std::memcpy(&exception_buffer, &frame.caller, sizeof frame.caller);
  }
}

/// All of the end but the jump, which leaves nothing to destroy.
void end_with_trap(Frame &frame, int value) noexcept {
  KeptErrno const kept;
  auto const moment = now();
  Thread &thread = this_thread();
  Entry const entry = pop(thread, &frame);
  if (is_ours(entry)) {
    Line &line = start_line(thread, "end", entry.number);
    line.member("took").number(moment - frame.began);
    write_trap(line, exceptionType, exceptionMsg, value);
    finish_line(line, "end", entry.number);
  }
  armed_thread = entry.armed_before;
  std::memcpy(&exception_buffer, &frame.caller, sizeof frame.caller);
}

void write_given(Line &line, Thread const &thread, Given const &given) {
  Entry const *const around = thread.top();
  line.member(given.name);
  if (given.is_pointer && given.value != 0 && around != nullptr &&
      around->released == given.value) {
    line.raw("{").member("at").number(around->released_number).raw("}");
  } else if (given.is_pointer) {
    write_pointer(line, given.value);
  } else {
    line.number(static_cast<std::int64_t>(given.value));
  }
}

}  // namespace

bool begin(Frame &frame, Call const &call) noexcept {
  if (!is_recording()) {
    return false;
  }
  KeptErrno const kept;
  Thread &thread = this_thread();
  drop_left_before(thread, &frame);
  if (thread.depth > 0 && thread.top()->call != nullptr) {
    return false;
  }
  Entry entry{&frame, &call, nullptr, next_number(), 0, 0, 0, process_id(), false};
  frame.began = now();
  write_begin(thread, frame, entry, frame.began);
  forget_released(entry, frame);
  if (!push(thread, entry)) {
    return false;
  }
  Entry &pushed = *thread.top();
  frame.is_armed = call.is_armed && trap_is_there() && take_trap(thread, pushed.armed_before);
  pushed.is_armed = frame.is_armed;
  if (frame.is_armed) {
    std::memcpy(&frame.caller, &exception_buffer, sizeof frame.caller);
  }
  frame.began = now();
  return true;
}

void note_trap(Frame &frame) noexcept {
  std::memcpy(&frame.own, &exception_buffer, sizeof frame.own);
}

void end(Frame &frame, std::uint64_t result) noexcept {
  auto const moment = now();
  KeptErrno const kept;
  Thread &thread = this_thread();
  Entry const entry = pop(thread, &frame);
  disarm(frame, entry);
  if (!is_ours(entry)) {
    return;
  }
  Call const &call = *entry.call;
  Line &line = start_line(thread, "end", entry.number);
  line.member("took").number(moment - frame.began);
  write_result(line, call, result);
  // What a call that is refused leaves has no meaning.
  if (has_outputs(call) && (call.result != Result::status || result == 0)) {
    write_outputs(line, call, static_cast<Words>(frame.words), result);
  }
  // Since the begin, only the host had its turn, and callbacks with lines of their own.
  finish_line(line, "end", entry.number, File::is_kept);
}

void pass_trap_on(Frame &frame, int value) noexcept {
  end_with_trap(frame, value);
  longjmp(exception_buffer, value);
}

void note_callback(Frame &frame, void *callback) noexcept {
  Entry *const top = this_thread().top();
  if (top != nullptr && top->frame == &frame) {
    top->callback = callback;
  }
  last_callback = callback;
}

void *callback_in_progress() noexcept {
  Entry const *const top = this_thread().top();
  return top != nullptr && top->callback != nullptr ? top->callback : last_callback.load();
}

std::uint64_t begin_callback(void const *here, std::string_view argument, Given first,
                             Given const *second) noexcept {
  if (!is_recording()) {
    return 0;
  }
  KeptErrno const kept;
  Thread &thread = this_thread();
  drop_left_before(thread, here);
  auto const number = next_number();
  Line &line = start_line(thread, "callback", number);
  line.member("thread").number(thread.number);
  write_within(line, thread);
  line.member("argument").raw("\"").raw(argument).raw("\"");
  line.member("at").number(since_start(now()));
  line.member("in").raw("{");
  write_given(line, thread, first);
  if (second != nullptr) {
    write_given(line, thread, *second);
  }
  line.raw("}");
  finish_line(line, "callback", number);
  return push(thread, {here, nullptr, nullptr, number, 0, 0, 0, process_id(), false}) ? number : 0;
}

void end_callback(std::uint64_t number, Given const *result) noexcept {
  Thread &thread = this_thread();
  if (number == 0 || thread.depth == 0) {
    return;
  }
  KeptErrno const kept;
  Entry const entry = *thread.top();
  --thread.depth;
  if (!is_ours(entry)) {
    return;
  }
  Line &line = start_line(thread, "end", number);
  if (result != nullptr) {
    write_given(line, thread, *result);
  }
  finish_line(line, "end", number);
}

}  // namespace recordings
