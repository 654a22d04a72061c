// What a host gets in place of the functions that a tool gave it: each tells Python of the
// callback.
#pragma once

#include <cstddef>

namespace recordings {

/// Told of a callback, as JSON; what a visit returns to the host.
using Visitor = int (*)(char const *callback);

/// Whom callbacks are told for as long as it lives; a call within a callback has its own.
class Visiting {
 public:
  explicit Visiting(Visitor visitor) noexcept;
  Visiting(Visiting const &) = delete;
  Visiting &operator=(Visiting const &) = delete;
  ~Visiting();

 private:
  Visitor before_;
};

char visit(void *reached, void *context);
void *allocate(std::size_t size);
void release(void *memory);

}  // namespace recordings
