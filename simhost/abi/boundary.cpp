// What each kind of failure looks like from outside.
#include "abi/boundary.h"

#include <SQLiteCpp/Exception.h>
#include <sqlite3.h>

#include <new>
#include <optional>

#include "storage/store.h"

namespace simhost {
namespace {

// The status for a failure of the state file that a caller may wait out or put right.
std::optional<QEX_ReturnStatus> status_of(SQLite::Exception const &error) {
  switch (error.getErrorCode()) {
    case SQLITE_BUSY:
      return QEX_BUSY;
    case SQLITE_FULL:
      return QEX_NO_SPACE;
    case SQLITE_IOERR:
      return QEX_IO_ERROR;
    case SQLITE_NOMEM:
      return QEX_NO_MEMORY;
    case SQLITE_READONLY:
      return QEX_READ_ONLY;
    default:
      return std::nullopt;
  }
}

void answer_with(Outcome &ending, QEX_ReturnStatus status) {
  ending.status = status;
  ending.traps = false;
}

void give_up(Outcome &ending, TrapKind kind, char const *call, char const *message) {
  ending.traps = true;
  describe(ending.report, kind, call, message);
}

void give_up(Outcome &ending, Trapped const &panic, char const *call) {
  give_up(ending, panic.kind(), panic.text() == TrapText::verbatim ? "" : call, panic.what());
}

}  // namespace

void end_with_status(Outcome &ending, char const *call) noexcept {
  try {
    throw;
  } catch (Refused const &refused) {
    answer_with(ending, refused.status());
  } catch (Trapped const &panic) {
    give_up(ending, panic, call);
  } catch (storage::UnusableState const &error) {
    give_up(ending, TrapKind::os_error, call, error.what());
  } catch (SQLite::Exception const &error) {
    if (auto const status = status_of(error)) {
      answer_with(ending, *status);
    } else {
      give_up(ending, TrapKind::os_error, call, error.what());
    }
  } catch (std::bad_alloc const &) {
    answer_with(ending, QEX_NO_MEMORY);
  } catch (std::exception const &error) {
    give_up(ending, TrapKind::runtime_error, call, error.what());
  } catch (...) {
    give_up(ending, TrapKind::runtime_error, call, "the simulated host failed");
  }
}

void end_without_status(Outcome &ending, char const *call) noexcept {
  try {
    throw;
  } catch (Trapped const &panic) {
    give_up(ending, panic, call);
  } catch (storage::UnusableState const &error) {
    give_up(ending, TrapKind::os_error, call, error.what());
  } catch (std::exception const &error) {
    give_up(ending, TrapKind::runtime_error, call, error.what());
  } catch (...) {
    give_up(ending, TrapKind::runtime_error, call, "the simulated host failed");
  }
}

}  // namespace simhost
