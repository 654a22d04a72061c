// Code of the caller's that the host runs: callbacks of walks, and allocators of lists.
#pragma once

#include <type_traits>

#include "abi/call.h"
#include "abi/trap.h"

namespace simhost {

/// Runs a function of the caller's: the only way in which the host does. It may call the host, for
/// which the trap is armed anew, and take as long as it likes; afterwards the trap leads again to
/// where it led before. Ends the process if this thread holds the host's lock, which no code of a
/// caller's may find taken.
template <typename Result, typename... Parameters>
Result call_back(Result (*function)(Parameters...), std::type_identity_t<Parameters>... arguments) {
  static_assert((std::is_trivially_destructible_v<Parameters> && ...),
                "the function may jump over the arguments");
  require_no_call();
  SavedTrap saved;
  save_trap(saved);
  if constexpr (std::is_void_v<Result>) {
    function(arguments...);
    restore_trap(saved);
  } else {
    Result const result = function(arguments...);
    restore_trap(saved);
    return result;
  }
}

}  // namespace simhost
