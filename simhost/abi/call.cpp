// A call's hold on the host.
#include "abi/call.h"

#include "abi/host.h"
#include "faults/faults.h"

namespace simhost {
namespace {

// The faults that hit the call of a function that is being made now.
std::vector<Fault> hits_on(std::string_view function) {
  auto &host = this_host();
  std::scoped_lock const held(host.lock());
  auto &state = host.state();
  {
    storage::Transaction look(state, storage::Access::read);
    if (!any_fault_waits(look, function)) {
      return {};
    }
  }
  storage::Transaction transaction(state, storage::Access::write);
  auto hits = count_call(transaction, function);
  transaction.commit();
  return hits;
}

void inject_faults(std::string_view function) {
  std::vector<Fault> hits;
  try {
    hits = hits_on(function);
  } catch (std::exception const &) {
    return;  // a state that cannot be read has no faults; a call that needs it will say so itself
  }
  inject(hits);
}

}  // namespace

Call::Call(char const *name) : name_(name) {
  inject_faults(name);
  this_host().lock().lock();
}

Call::Call(char const *name, Resumed /*unused*/) : name_(name) {
  this_host().lock().lock();
}

Call::~Call() {
  transaction_.reset();
  this_host().lock().unlock();
}

storage::Transaction &Call::reading() {
  transaction_ = std::make_unique<storage::Transaction>(this_host().state(), storage::Access::read);
  return *transaction_;
}

storage::Transaction &Call::changing() {
  transaction_ =
      std::make_unique<storage::Transaction>(this_host().state(), storage::Access::write);
  return *transaction_;
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

Call::Unlocked::Unlocked() {
  this_host().lock().unlock();
}

Call::Unlocked::~Unlocked() {
  this_host().lock().lock();
}

void Call::complete() {
  if (transaction_) {
    transaction_->commit();
  }
}

}  // namespace simhost
