// Runs the tests of this program as root: for another user, in a user namespace of its own.
#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <iostream>
#include <string>
#include <vector>

namespace {

// Returns only if it fails.
void run_as_root_of_a_namespace(std::vector<std::string> const &program) {
  std::vector<std::string> words{"unshare", "--user", "--map-root-user", "--map-auto", "--"};
  words.insert(words.end(), program.begin(), program.end());
  std::vector<char *> arguments(words.size() + 1);  // the last one stays null
  std::transform(words.begin(), words.end(), arguments.begin(),
                 [](std::string &word) { return word.data(); });
  execvp(arguments.front(), arguments.data());
}

}  // namespace

int main(int argc, char **argv) {
  // The test framework removes its own words from the arguments.
  std::vector<std::string> const program(argv, argv + argc);
  testing::InitGoogleTest(&argc, argv);
  if (geteuid() == 0 || testing::GTEST_FLAG(list_tests)) {
    return RUN_ALL_TESTS();
  }
  std::cerr
      << "Only root can make files of other users, so these tests run in a user namespace. That"
         " takes newuidmap, which is in Debian's uidmap, and a range of users in /etc/subuid and"
         " /etc/subgid.\n";
  run_as_root_of_a_namespace(program);
  std::cerr << "unshare: " << std::strerror(errno) << '\n';
  return EXIT_FAILURE;
}
