// One call of the host, from its entry to what it returns: one that reads the state, one that
// changes it, or one that does neither.
#pragma once

#include <mutex>
#include <optional>

#include "base/api.h"
#include "storage/store.h"

namespace simhost {

class DataLists;
class Handles;
class Ledger;

/// The name of a call, which is a literal.
struct CallName {
  // NOLINTNEXTLINE(google-explicit-constructor): a literal is what callers have
  CallName(char const *literal) : text(literal) {}
  CallName(char const *literal, bool is_resumed) : text(literal), is_resumed(is_resumed) {}

  char const *text;
  bool is_resumed = false;
};

/// Goes on with a call after code of the caller's has run in between: it is no further call, so no
/// fault that waits for one hits it.
inline CallName resumed(char const *name) {
  return {name, true};
}

/// Holds the host's lock for its whole life, so none of the caller's code may run meanwhile.
class SIMHOST_API Call {
 public:
  /// Throws what a fault that waits for this call says.
  explicit Call(CallName const &name);
  ~Call();
  Call(Call const &) = delete;
  Call &operator=(Call const &) = delete;

  [[nodiscard]] char const *name() const { return name_; }
  /// How long it goes on waiting for other processes, faults and state together.
  [[nodiscard]] storage::Patience const &patience() const { return patience_; }
  Ledger &ledger();
  Handles &handles();
  DataLists &lists();

 protected:
  // Ends the transaction in which the call looked for faults.
  void end_look();

  std::unique_lock<std::mutex> held_;
  storage::Patience patience_;
  // Goes on as the transaction of a call that reads: most calls do, and no fault waits for most.
  std::optional<storage::ReadingTransaction> look_;

 private:
  char const *name_;
};

/// Ends the process with a message while a call runs in this thread: its lock is held.
SIMHOST_API void require_no_call() noexcept;

/// A call that does not look at the state.
class SIMHOST_API StatelessCall : public Call {
 public:
  explicit StatelessCall(CallName const &name);
  void complete() {}
};

/// A call that reads the state.
class SIMHOST_API ReadingCall : public Call {
 public:
  using Call::Call;

  /// The one transaction of the call.
  storage::ReadingTransaction &transaction();
  void complete();
};

/// A call that changes the state; what it changed is undone when it goes without complete().
class SIMHOST_API ChangingCall : public Call {
 public:
  explicit ChangingCall(CallName const &name);
  ~ChangingCall();
  ChangingCall(ChangingCall const &) = delete;
  ChangingCall &operator=(ChangingCall const &) = delete;

  /// The one transaction of the call, which begins when it is first asked for.
  storage::ChangingTransaction &transaction();
  void complete();

 private:
  std::optional<storage::ChangingTransaction> transaction_;
};

}  // namespace simhost
