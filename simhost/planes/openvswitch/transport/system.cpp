#include "planes/openvswitch/transport/system.h"

#include <algorithm>
#include <system_error>

namespace simhost::openvswitch {

int milliseconds_until(Deadline deadline) {
  using std::chrono::milliseconds;
  constexpr milliseconds kLongest{60'000};
  auto const now = Deadline::clock::now();
  if (deadline - now > kLongest) {
    return static_cast<int>(kLongest.count());
  }
  auto const left = std::chrono::ceil<milliseconds>(deadline - now);
  return static_cast<int>(std::max(left, milliseconds(0)).count());
}

std::string error_words(int error) {
  return std::generic_category().message(error);
}

}  // namespace simhost::openvswitch
