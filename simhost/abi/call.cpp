// A call's hold on the host.
#include "abi/call.h"

#include <cstdio>
#include <cstdlib>

#include "abi/host.h"
#include "abi/pause.h"
#include "faults/faults.h"
#include "model/plane.h"

namespace simhost {
namespace {

constinit thread_local bool call_runs = false;

// The faults that hit the call of a function that is being made now.
std::vector<Fault> hits_on(std::string_view function, storage::Patience &patience) {
  auto &host = this_host();
  std::scoped_lock const held(host.lock());
  auto &state = host.state();
  {
    storage::ReadingTransaction look(state, patience);
    if (!any_fault_waits(look, function)) {
      return {};
    }
  }
  storage::ChangingTransaction transaction(state, patience);
  auto hits = count_call(transaction, function);
  transaction.commit();
  return hits;
}

// Likewise; a state that cannot be read has no faults, and a call that needs it will say so itself.
// But one that is only busy may have some.
std::vector<Fault> readable_hits_on(std::string_view function, storage::Patience &patience) {
  try {
    return hits_on(function, patience);
  } catch (storage::StateFailure const &failure) {
    if (failure.kind() == storage::FailureKind::busy) {
      throw;
    }
  } catch (std::exception const &) {
  }
  return {};
}

void inject_faults(std::string_view function, storage::Patience &patience) {
  auto const hits = readable_hits_on(function, patience);
  pause(delay_of(hits));
  inject(hits);
}

}  // namespace

Call::Call(CallName const &name) : name_(name.text) {
  if (!name.is_resumed) {
    inject_faults(name.text, patience_);
  }
  this_host().lock().lock();
  call_runs = true;
}

Call::~Call() {
  call_runs = false;
  this_host().lock().unlock();
}

Ledger &Call::ledger() {
  return this_host().ledger();
}

Handles &Call::handles() {
  return this_host().handles();
}

DataLists &Call::lists() {
  return this_host().lists();
}

void require_no_call() noexcept {
  if (call_runs) {
    std::fputs("simulated host: code of the caller's must not run within a call\n", stderr);
    std::abort();
  }
}

template <typename Transaction>
CallOnState<Transaction>::CallOnState(CallName const &name) : Call(name) {}

template <typename Transaction>
CallOnState<Transaction>::~CallOnState() = default;

template <typename Transaction>
Transaction &CallOnState<Transaction>::transaction() {
  return transaction_ ? *transaction_ : transaction_.emplace(this_host().state(), patience_);
}

template <typename Transaction>
void CallOnState<Transaction>::complete() {
  if (transaction_) {
    commit(*transaction_);
  }
}

template class CallOnState<storage::ReadingTransaction>;
template class CallOnState<storage::ChangingTransaction>;

}  // namespace simhost
