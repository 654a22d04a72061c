// Writes the reference of the properties, for the build: make_properties > properties.json
#include <cstdio>

#include "scenario/reference.h"

int main() {
  auto const text = simhost::scenario::reference();
  bool const is_written = std::fputs(text.c_str(), stdout) >= 0 && std::fflush(stdout) == 0;
  return is_written ? 0 : 1;
}
