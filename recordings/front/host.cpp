// The host's functions, which the libraries that forward have found.

#include <unistd.h>

#include <algorithm>
#include <cstdio>

#include "recordings/front/forward.h"

namespace recordings {

void *host_functions[number_of_calls];

void *host_function(std::size_t number) noexcept {
  if (host_functions[number] == nullptr) {
    if (std::ranges::all_of(host_functions, [](void *one) { return one == nullptr; })) {
      refuse_call(calls[number], "there is no host here, and no recording is played");
    }
    std::fprintf(stderr, "vswitch record: the host's %.*s lacks %.*s\n",
                 static_cast<int>(calls[number].library.size()), calls[number].library.data(),
                 static_cast<int>(calls[number].name.size()), calls[number].name.data());
    // What the loader ends a process with that calls such a function.
    _exit(127);
  }
  return host_functions[number];
}

}  // namespace recordings
