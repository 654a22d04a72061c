// The call trap of the process, where there is one.
#pragma once

#include <setjmp.h>

#include <string_view>

namespace recordings {

/// Where the trap leads. Plain memory, so that a jump may cross it.
struct SavedTrap {
  bool is_there;
  jmp_buf buffer;
};

void save_trap(SavedTrap &saved) noexcept;

/// Whether a caller has armed it.
bool is_armed(SavedTrap const &saved) noexcept;

/// Leads the trap there again, as it does before what calls back.
void restore_trap(SavedTrap const &saved) noexcept;

/// Keeps a text for the next trap of this thread; of a longer one its begin.
void keep_trap_text(std::string_view text) noexcept;
char *kept_trap_text() noexcept;

/// Jumps, with the class of that name: the interpreter's own, or one that is made for it, which may
/// wait for the interpreter. The name is null, and `has_text` false, for a trap that was recorded
/// without.
[[noreturn]] void spring_trap(SavedTrap const &saved, char const *class_name, bool has_text,
                              int value) noexcept;

}  // namespace recordings
