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

using Look = std::optional<storage::ReadingTransaction>;

// The faults that hit the call of a function that is being made now. If none waits for it, the
// transaction that found none stays open as `look`.
std::vector<Fault> hits_on(std::string_view function, Look &look, storage::Patience &patience) {
  auto &state = this_host().state();
  if (!any_fault_waits(look.emplace(state, patience), function)) {
    return {};
  }
  look.reset();
  storage::ChangingTransaction transaction(state, patience);
  auto hits = count_call(transaction, function);
  transaction.commit();
  return hits;
}

// Likewise; a state that cannot be read has no faults, and a call that needs it will say so itself.
// But one that is only busy may have some.
std::vector<Fault> readable_hits_on(std::string_view function, Look &look,
                                    storage::Patience &patience) {
  try {
    return hits_on(function, look, patience);
  } catch (storage::StateFailure const &failure) {
    if (failure.kind() == storage::FailureKind::busy) {
      throw;
    }
  } catch (std::exception const &) {
  }
  look.reset();
  return {};
}

}  // namespace

Call::Call(CallName const &name) : held_(this_host().lock()), name_(name.text) {
  if (!name.is_resumed) {
    auto const hits = readable_hits_on(name.text, look_, patience_);
    if (!hits.empty()) {
      held_.unlock();
      pause(delay_of(hits));
      inject(hits);
      held_.lock();
    }
  }
  call_runs = true;
}

Call::~Call() {
  call_runs = false;
}

void Call::end_look() {
  look_.reset();
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

StatelessCall::StatelessCall(CallName const &name) : Call(name) {
  end_look();
}

storage::ReadingTransaction &ReadingCall::transaction() {
  return look_ ? *look_ : look_.emplace(this_host().state(), patience_);
}

void ReadingCall::complete() {
  if (look_) {
    commit(*look_);
  }
}

ChangingCall::ChangingCall(CallName const &name) : Call(name) {}
ChangingCall::~ChangingCall() = default;

storage::ChangingTransaction &ChangingCall::transaction() {
  if (!transaction_) {
    end_look();
    transaction_.emplace(this_host().state(), patience_);
  }
  return *transaction_;
}

void ChangingCall::complete() {
  if (transaction_) {
    commit(*transaction_);
  }
}

}  // namespace simhost
