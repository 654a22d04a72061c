// The row of a switch of which nothing but the name matters.
#pragma once

#include <string>

#include "storage/switches.h"

inline simhost::storage::Switch named(std::string const &name) {
  return {.alias = name,
          .identifier = name,
          .portset = name,
          .max_ports = 8,
          .version = 200,
          .persistent = true};
}
