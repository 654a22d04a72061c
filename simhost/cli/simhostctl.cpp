// simhostctl: looking at a simulated host and changing it, from a shell.
#include <fmt/format.h>

#include <CLI/CLI.hpp>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <string>
#include <string_view>
#include <vector>

#include "cli/commands.h"

namespace {

void add_commands(CLI::App &app) {
  app.option_defaults()->disable_flag_override();
  // The environment is read at the first call, which is made by a subcommand.
  app.add_option_function<std::string>(
      "--state", [](std::string const &file) { setenv("SIMHOST_STATE", file.c_str(), 1); },
      "The file that holds the state of the host; SIMHOST_STATE in the environment unless given");
  app.set_version_flag("--version", std::string("simhostctl ") + simhost_version(),
                       "Print the version of the simulated host and exit");
  app.require_subcommand(1);
  app.parse_complete_callback([&app] {
    char const *const state = std::getenv("SIMHOST_STATE");
    if ((state == nullptr || *state == '\0') && !app.got_subcommand("calls") &&
        !app.got_subcommand("lab")) {
      throw simhost::cli::Failure("which host? name its state with --state FILE or SIMHOST_STATE");
    }
  });
  app.footer("'simhostctl COMMAND --help' explains a command.");
  simhost::cli::add_world_commands(app);
  simhost::cli::add_frame_commands(app);
  simhost::cli::add_fabric_commands(app);
  simhost::cli::add_time_commands(app);
  simhost::cli::add_call_commands(app);
  simhost::cli::add_lab_commands(app);
}

// Whether a command is still to come after the words that were understood.
bool lacks_command(CLI::App const &app) {
  auto const chosen = app.get_subcommands();
  return chosen.empty() ? app.get_require_subcommand_min() > 0 : lacks_command(*chosen.back());
}

// The parser says only in its text which option it is about, and says it first.
std::string option_of(CLI::ParseError const &error) {
  std::string const text = error.what();
  return "'" + text.substr(0, text.find_first_of(": ")) + "'";
}

// The parser's errors in words of our own.
std::string wrong_option(CLI::ParseError const &error) {
  if (dynamic_cast<CLI::RequiredError const *>(&error) != nullptr) {
    return option_of(error) + " is missing";
  }
  if (dynamic_cast<CLI::ExcludesError const *>(&error) != nullptr) {
    std::string const text = error.what();
    return option_of(error) + " does not go with '" + text.substr(text.rfind(' ') + 1) + "'";
  }
  if (dynamic_cast<CLI::ArgumentMismatch const *>(&error) != nullptr) {
    std::string_view const text = error.what();
    if (text.ends_with("flag override")) {
      return fmt::format("'--{}' takes no value", text.substr(0, text.find(' ')));
    }
    return option_of(error) +
           (text.ends_with("missing") ? " needs a value" : " takes one value, once");
  }
  if (dynamic_cast<CLI::ValidationError const *>(&error) != nullptr) {
    return error.what();  // what a check of ours said, after the option
  }
  return "the words cannot be understood";
}

// The parser asks for a command that is missing before it looks at the words that it did not know.
std::string complaint(CLI::App const &app, CLI::ParseError const &error) {
  bool const lacks = dynamic_cast<CLI::RequiredError const *>(&error) != nullptr;
  bool const has_more = dynamic_cast<CLI::ExtrasError const *>(&error) != nullptr;
  auto unknown = app.remaining(true);
  // It ends the options, and is understood.
  bool const options_ended = !unknown.empty() && unknown.front() == "--";
  std::erase(unknown, "--");
  if (unknown.empty() || !(lacks || has_more)) {
    return lacks && lacks_command(app) ? "a command is missing" : wrong_option(error);
  }
  auto const &word = unknown.front();
  auto const *const what = word.starts_with('-') && !options_ended ? "there is no option"
                           : lacks_command(app)                    ? "there is no command"
                                                                   : "there is no use for";
  return std::string(what) + " '" + word + "'";
}

int run(CLI::App &app, int count, char **words) {
  constexpr int kWrongUsage = 2;
  try {
    app.parse(count, words);
    return 0;
  } catch (CLI::Success const &help_or_version) {
    return app.exit(help_or_version);
  } catch (CLI::ParseError const &error) {
    std::fprintf(stderr, "simhostctl: %s\nRun with --help for more information.\n",
                 simhost::cli::printable(complaint(app, error)).c_str());
    return kWrongUsage;
  }
}

// A command whose output was lost, on a full disk say, has not done what it was asked for.
void write_out() {
  if (std::fflush(stdout) != 0 || std::ferror(stdout) != 0) {
    throw simhost::cli::Failure("the output cannot be written");
  }
}

}  // namespace

int main(int count, char **words) try {
  CLI::App app("Looks at a simulated host and changes it, while other processes use it.",
               "simhostctl");
  add_commands(app);
  int const status = run(app, count, words);
  write_out();
  return status;
} catch (std::exception const &error) {
  std::fprintf(stderr, "simhostctl: %s\n", simhost::cli::printable(error.what()).c_str());
  return 1;
}
