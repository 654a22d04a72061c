// A call's hold on the host.
#include "core/call.h"

#include "core/faults.h"
#include "core/host.h"

namespace simhost {

Call::Call(char const *name) : Call((meet_faults(name), name), Resumed{}) {}

Call::Call(char const *name, Resumed /*unused*/) : name_(name) {
  this_host().lock().lock();
}

Call::~Call() {
  transaction_.reset();
  this_host().lock().unlock();
}

store::Transaction &Call::reading() {
  transaction_ = std::make_unique<store::Transaction>(this_host().state(), store::Access::read);
  return *transaction_;
}

store::Transaction &Call::changing() {
  transaction_ = std::make_unique<store::Transaction>(this_host().state(), store::Access::write);
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

Call::Aside::Aside() {
  this_host().lock().unlock();
}

Call::Aside::~Aside() {
  this_host().lock().lock();
}

void Call::complete() {
  if (transaction_) {
    transaction_->commit();
  }
}

}  // namespace simhost
