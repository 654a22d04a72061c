// A host for reading, from the document that describes it.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace simhost::cli {

/// Switches, ports and uplinks with what is going on there, a line each.
std::string tree(std::string_view document);

/// A fault as the command line gives it; empty texts and 0 are no effect.
struct FaultWords {
  std::string function = {};
  std::uint32_t nth = 1;
  std::uint32_t times = 1;
  std::string status = {};
  std::string exception = {};
  std::string message = {};
  double delay = 0;  ///< seconds
};

/// The scenario document that adds a fault.
std::string fault_document(FaultWords const &words);
/// The faults of a host, a line each.
std::string fault_list(std::string_view document);

}  // namespace simhost::cli
