// A line for each.
#include "daemon/underlay/kept_names.h"

#include <net/if.h>
#include <unistd.h>

#include <array>
#include <sstream>
#include <utility>

#include "events/descriptor.h"

namespace simhost::daemon {

KeptNames::KeptNames(int file) : file_(file) {
  std::array<char, 4096> content{};
  auto const size = pread(file_, content.data(), content.size(), 0);
  std::istringstream in(std::string(content.data(), size > 0 ? static_cast<std::size_t>(size) : 0));
  for (std::string name; std::getline(in, name);) {
    if (!name.empty() && name.size() < IFNAMSIZ) {
      names_.insert(name);
    }
  }
}

void KeptNames::add(std::string const &name) {
  auto names = names_;
  if (names.insert(name).second) {
    put(std::move(names));
  }
}

void KeptNames::remove(std::string const &name) {
  auto names = names_;
  if (names.erase(name) != 0) {
    put(std::move(names));
  }
}

void KeptNames::put(std::set<std::string> names) {
  std::string content;
  for (auto const &name : names) {
    content += name + "\n";
  }
  if (pwrite(file_, content.data(), content.size(), 0) != static_cast<ssize_t>(content.size()) ||
      ftruncate(file_, static_cast<off_t>(content.size())) != 0) {
    events::fail_with_errno("the file of the daemon's lock");
  }
  names_ = std::move(names);
}

}  // namespace simhost::daemon
