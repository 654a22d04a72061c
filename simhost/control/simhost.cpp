// simhost_*: looking into the host of this process.
#include "control/simhost.h"

#include <mutex>
#include <span>

#include "core/api.h"
#include "core/host.h"

extern "C" {

SIMHOST_API char const *simhost_version() {
  return SIMHOST_VERSION;
}

SIMHOST_API size_t simhost_ledger_count() {
  auto &host = simhost::this_host();
  std::scoped_lock const held(host.lock());
  return host.ledger().count();
}

SIMHOST_API size_t simhost_ledger_report(char *text, size_t size) {
  auto &host = simhost::this_host();
  std::scoped_lock const held(host.lock());
  return host.ledger().report(std::span(text, size));
}

}  // extern "C"
