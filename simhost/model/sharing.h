// Where the model meets what several hosts share. What is shared is decided together, and then it
// is in the state of each.
#pragma once

#include "base/api.h"

namespace simhost {

namespace storage {
class ChangingTransaction;
}

class Sharing {
 public:
  virtual ~Sharing() = default;

  /// A transaction is about to be committed, and nothing but that can fail any more. Returns when
  /// what it changes of what is shared is decided, and has written so into the transaction, and
  /// into the file all of it: whether there was anything to decide. Refuses it if it is decided
  /// otherwise (QEX_BUSY), or nobody knows (QEX_TIMEOUT).
  virtual bool prepare(storage::ChangingTransaction &transaction) = 0;
};

/// Chooses it for the transactions of this process; null: its host shares nothing. It must live as
/// long as the process, or until another one is chosen.
SIMHOST_API void share_through(Sharing *through);

}  // namespace simhost
