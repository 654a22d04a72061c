// Names of network devices in a file, for the next process that has it.
#pragma once

#include <set>
#include <string>

namespace simhost::daemon {

class KeptNames {
 public:
  /// Of an open file, which outlives this. What is no name in it is passed over.
  explicit KeptNames(int file);

  [[nodiscard]] std::set<std::string> const &all() const { return names_; }
  // These throw std::system_error if the file cannot be written, and nothing has changed.
  void add(std::string const &name);
  void remove(std::string const &name);

 private:
  void put(std::set<std::string> names);

  int file_;
  std::set<std::string> names_;
};

}  // namespace simhost::daemon
