// One call of the host, from its entry to its answer.
#pragma once

#include <memory>

#include "base/api.h"

namespace simhost::storage {
class Transaction;
}

namespace simhost {

class DataLists;
class Handles;
class Ledger;

/// Holds the host's lock for its whole life, so none of the caller's code may run meanwhile. What
/// it changed in the state is undone when it goes without complete().
class SIMHOST_API Call {
 public:
  /// `name` is a literal. Throws what a fault that waits for this call says.
  explicit Call(char const *name);
  /// Goes on with a call that another Call began and has let go of: it is no further call, so no
  /// fault that waits for one meets it.
  struct Resumed {};
  Call(char const *name, Resumed);
  ~Call();
  Call(Call const &) = delete;
  Call &operator=(Call const &) = delete;

  [[nodiscard]] char const *name() const { return name_; }
  /// The call's one transaction on the state, for a call that only reads or for one that changes
  /// it.
  storage::Transaction &reading();
  storage::Transaction &changing();
  Ledger &ledger();
  Handles &handles();
  DataLists &lists();
  /// Lets go of the lock while `work` runs, which may then run the caller's code. Not with a
  /// transaction.
  template <typename Work>
  decltype(auto) unlocked(Work const &work) {
    Unlocked const unlocked;
    return work();
  }
  /// Makes the changes last.
  void complete();

 private:
  struct SIMHOST_API Unlocked {
    Unlocked();
    ~Unlocked();
    Unlocked(Unlocked const &) = delete;
    Unlocked &operator=(Unlocked const &) = delete;
  };

  char const *name_;
  std::unique_ptr<storage::Transaction> transaction_;
};

}  // namespace simhost
