// A row for each exception that the layers below throw.
#include "abi/outcome.h"

#include <new>

#include "abi/pause.h"
#include "scenario/document.h"
#include "scenario/texts.h"
#include "storage/store.h"

namespace simhost {
namespace {

Outcome returns(QEX_ReturnStatus status, std::string reason,
                TrapKind without_status = TrapKind::runtime_error) {
  return {.status = status,
          .traps = false,
          .kind = without_status,
          .text = TrapText::after_call,
          .reason = std::move(reason)};
}

Outcome traps(TrapKind kind, QEX_ReturnStatus status, std::string reason,
              TrapText text = TrapText::after_call) {
  return {.status = status, .traps = true, .kind = kind, .text = text, .reason = std::move(reason)};
}

// A status is for what a caller may wait out or put right.
Outcome outcome_of(storage::StateFailure const &failure) {
  switch (failure.kind()) {
    case storage::FailureKind::busy:
      return returns(QEX_BUSY, failure.what(), TrapKind::os_error);
    case storage::FailureKind::full:
      return returns(QEX_NO_SPACE, failure.what(), TrapKind::os_error);
    case storage::FailureKind::io:
      return returns(QEX_IO_ERROR, failure.what(), TrapKind::os_error);
    case storage::FailureKind::memory:
      return returns(QEX_NO_MEMORY, failure.what(), TrapKind::memory_error);
    case storage::FailureKind::read_only:
      return returns(QEX_READ_ONLY, failure.what(), TrapKind::os_error);
  }
  return traps(TrapKind::os_error, QEX_IO_ERROR, failure.what());
}

Outcome table() {
  try {
    throw;
  } catch (Refused const &refused) {
    return returns(refused.status(), scenario::refusal_text(refused));
  } catch (Interrupted const &interrupted) {
    auto outcome =
        traps(TrapKind::runtime_error, QEX_FAILURE, interrupted.what(), TrapText::verbatim);
    outcome.type = interrupted.type();
    return outcome;
  } catch (Trapped const &trapped) {
    return traps(trapped.kind(), QEX_FAILURE, trapped.what(), trapped.text());
  } catch (scenario::DocumentError const &error) {
    return traps(TrapKind::runtime_error, QEX_BAD_PARAM, error.what());
  } catch (storage::UnusableState const &error) {
    return traps(TrapKind::os_error, QEX_IO_ERROR, error.what());
  } catch (storage::StateFailure const &failure) {
    return outcome_of(failure);
  } catch (std::bad_alloc const &) {
    return returns(QEX_NO_MEMORY, "there is no memory left", TrapKind::memory_error);
  } catch (std::exception const &error) {
    return traps(TrapKind::runtime_error, QEX_FAILURE, error.what());
  } catch (...) {
    return traps(TrapKind::runtime_error, QEX_FAILURE, "the simulated host failed");
  }
}

}  // namespace

Outcome current_outcome() noexcept {
  try {
    return table();
  } catch (std::bad_alloc const &) {
    // Short enough to need no memory itself.
    return returns(QEX_NO_MEMORY, "no memory left", TrapKind::memory_error);
  }
}

}  // namespace simhost
