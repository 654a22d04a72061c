// simhostctl: looking at a simulated host and changing it, from a shell.
#include <CLI/CLI.hpp>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <string>

#include "control/commands.h"

namespace {

void add_commands(CLI::App &app) {
  // The environment is read at the first call, which is made by a subcommand.
  app.add_option_function<std::string>(
      "--state", [](std::string const &file) { setenv("SIMHOST_STATE", file.c_str(), 1); },
      "The file that holds the state of the host; SIMHOST_STATE in the environment unless given");
  app.require_subcommand(1);
  app.parse_complete_callback([&app] {
    char const *const state = std::getenv("SIMHOST_STATE");
    if ((state == nullptr || *state == '\0') && !app.got_subcommand("calls")) {
      throw simhost::control::Failure(
          "which host? name its state with --state FILE or SIMHOST_STATE");
    }
  });
  app.footer("'simhostctl COMMAND --help' explains a command.");
  simhost::control::add_world_commands(app);
  simhost::control::add_time_commands(app);
  simhost::control::add_call_commands(app);
}

}  // namespace

int main(int count, char **words) try {
  CLI::App app("Looks at a simulated host and changes it, while other processes use it.",
               "simhostctl");
  add_commands(app);
  CLI11_PARSE(app, count, words);
  return 0;
} catch (std::exception const &error) {
  std::fprintf(stderr, "simhostctl: %s\n", error.what());
  return 1;
}
