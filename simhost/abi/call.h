// One call of the host, from its entry to what it returns: one that reads the state, one that
// changes it, or one that does neither.
#pragma once

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

 private:
  char const *name_;

 protected:
  storage::Patience patience_;
};

/// Ends the process with a message while a call runs in this thread: its lock is held.
SIMHOST_API void require_no_call() noexcept;

/// A call that does not look at the state.
class StatelessCall : public Call {
 public:
  using Call::Call;
  void complete() {}
};

/// A call on the state; what it changed is undone when it goes without complete().
template <typename Transaction>
class CallOnState : public Call {
 public:
  explicit CallOnState(CallName const &name);
  ~CallOnState();
  CallOnState(CallOnState const &) = delete;
  CallOnState &operator=(CallOnState const &) = delete;

  /// The one transaction of the call, which begins when it is first asked for.
  Transaction &transaction();
  void complete();

 private:
  std::optional<Transaction> transaction_;
};

extern template class SIMHOST_API CallOnState<storage::ReadingTransaction>;
extern template class SIMHOST_API CallOnState<storage::ChangingTransaction>;

/// A call that reads the state, and one that changes it.
using ReadingCall = CallOnState<storage::ReadingTransaction>;
using ChangingCall = CallOnState<storage::ChangingTransaction>;

}  // namespace simhost
