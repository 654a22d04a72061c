// A network of a test's own.
#pragma once

#include <gtest/gtest.h>
#include <sched.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <string>

/// Takes this thread to a new namespace of networks: and of users as well, unless the test may make
/// one of networks without.
inline void enter_own_network() {
  int const kinds = geteuid() == 0 ? CLONE_NEWNET : CLONE_NEWNET | CLONE_NEWUSER;
  auto const user = geteuid();
  ASSERT_EQ(unshare(kinds), 0) << "namespaces are not allowed here";
  if (user != 0) {
    std::ofstream("/proc/self/uid_map") << "0 " << user << " 1";
  }
}

/// Runs ip(8) in there.
inline void ip(std::string const &words) {
  ASSERT_EQ(std::system(("ip " + words).c_str()), 0) << words;
}
