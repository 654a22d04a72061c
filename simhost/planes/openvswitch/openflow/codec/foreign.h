// What a switch may have that this host never asks it for.
#pragma once

#include <stdexcept>

namespace simhost::openflow {

/// A field or an action that the values here cannot say. what() names it.
class Foreign : public std::runtime_error {
 public:
  using runtime_error::runtime_error;
};

}  // namespace simhost::openflow
