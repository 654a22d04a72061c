// simhostctl: looking at a simulated host and changing it, from a shell. It does everything through
// the functions that any program has.
#include <CLI/CLI.hpp>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iostream>
#include <iterator>
#include <optional>
#include <sstream>
#include <stdexcept>
#include <string>

#include "control/simhost.h"
#include "control/tree.h"

namespace {

// The host or the caller's input stands against what was asked for; what() says how.
class Failure : public std::runtime_error {
  using std::runtime_error::runtime_error;
};

void check(int status) {
  if (status != 0) {
    throw Failure(simhost_error());
  }
}

char const *or_null(std::string const &text) {
  return text.empty() ? nullptr : text.c_str();
}

std::int64_t milliseconds(double seconds) {
  return std::llround(seconds * 1000);
}

std::string description() {
  auto const size = simhost_describe(nullptr, 0);
  if (size == 0) {
    throw Failure(simhost_error());
  }
  // Between the two calls another process may have changed the host.
  std::string text(size * 2, '\0');
  text.resize(std::min(simhost_describe(text.data(), text.size()), text.size() - 1));
  return text;
}

std::string content(std::string const &file) {
  if (file == "-") {
    return {std::istreambuf_iterator<char>(std::cin), {}};
  }
  std::ifstream stream(file);
  if (!stream) {
    throw Failure(file + ": cannot be read");
  }
  return {std::istreambuf_iterator<char>(stream), {}};
}

void add_show(CLI::App &app) {
  auto *const show = app.add_subcommand("show", "Show the host as a tree");
  static bool json = false;
  show->add_flag("--json", json, "as a scenario document, which apply reads");
  show->callback([] {
    auto const document = description();
    std::cout << (json ? document + "\n" : simhost::control::tree(document));
  });
}

void add_apply(CLI::App &app) {
  auto *const apply =
      app.add_subcommand("apply", "Change the host as scenario documents say: each whole or not");
  static std::vector<std::string> files;
  apply->add_option("document", files, "JSON files; - is standard input")->required();
  apply->callback([] {
    for (auto const &file : files) {
      if (simhost_apply(content(file).c_str()) != 0) {
        throw Failure(file + ": " + simhost_error());
      }
    }
  });
}

void add_link(CLI::App &app) {
  auto *const link = app.add_subcommand("link", "Plug the cable of an uplink in, or pull it");
  static std::string uplink;
  static std::string state;
  link->add_option("uplink", uplink)->required();
  link->add_option("state", state)->required()->check(CLI::IsMember({"up", "down"}));
  link->callback([] { check(simhost_set_link(uplink.c_str(), state == "up" ? 1 : 0)); });
}

void add_learn(CLI::App &app) {
  auto *const learn = app.add_subcommand("learn", "Let a frame from an address arrive");
  static std::string switch_name;
  static std::string mac;
  static std::string port;
  static std::uint16_t vlan = 0;
  static std::uint32_t vni = 0;
  learn->add_option("switch", switch_name, "alias of the switch")->required();
  learn->add_option("mac", mac, "such as 02:00:00:00:00:01")->required();
  learn->add_option("--port", port, "where it arrives; the team of uplinks unless given");
  learn->add_option("--vlan", vlan, "0 unless given");
  learn->add_option("--vni", vni, "0 unless given");
  learn->callback(
      [] { check(simhost_learn(switch_name.c_str(), or_null(port), mac.c_str(), vlan, vni)); });
}

void add_counter(CLI::App &app) {
  auto *const counter = app.add_subcommand("counter", "Set a counter");
  static std::string switch_name;
  static std::string port;
  static std::string session;
  static std::string name;
  static std::uint64_t value = 0;
  counter->add_option("switch", switch_name, "alias of the switch")->required();
  counter->add_option("name", name, "the field in which callers see it")->required();
  counter->add_option("value", value)->required();
  auto *const of_port = counter->add_option("--port", port, "of this port");
  counter->add_option("--session", session, "of this mirror session")->excludes(of_port);
  counter->callback([] {
    check(simhost_set_counter(switch_name.c_str(), or_null(port), or_null(session), name.c_str(),
                              value));
  });
}

void add_clock(CLI::App &app) {
  auto *const clock = app.add_subcommand("clock", "The host's clock");
  clock->require_subcommand(1);
  static double seconds = 0;
  clock->add_subcommand("show", "Show what it shows, in seconds since the beginning of 1970")
      ->callback([] {
        auto const now = simhost_clock_now();
        if (now < 0) {
          throw Failure(simhost_error());
        }
        std::printf("%lld.%03lld\n", static_cast<long long>(now / 1000),
                    static_cast<long long>(now % 1000));
      });
  clock->add_subcommand("stop", "Stop it")->callback([] { check(simhost_clock_stop()); });
  clock->add_subcommand("run", "Let it run on")->callback([] { check(simhost_clock_run()); });
  auto *const step = clock->add_subcommand("step", "Move it forward");
  step->add_option("seconds", seconds)->required()->check(CLI::Range(0.0, 1e12));
  step->callback([] { check(simhost_clock_step(milliseconds(seconds))); });
  auto *const set = clock->add_subcommand("set", "Set it");
  set->add_option("seconds", seconds)->required()->check(CLI::Range(0.0, 1e12));
  set->callback([] { check(simhost_clock_set(milliseconds(seconds))); });
}

void add_fault(CLI::App &app) {
  auto *const fault = app.add_subcommand("fault", "Let chosen calls of a function fail");
  fault->require_subcommand(1);
  static std::string function;
  static std::uint32_t nth = 1;
  static std::uint32_t times = 1;
  static std::string status;
  static std::string exception;
  static std::string message;
  static double delay = 0;
  auto *const add = fault->add_subcommand("add", "Add a fault");
  add->add_option("function", function, "such as VSDVS_SetMTU")->required();
  add->add_option("--nth", nth, "the first call that is hit; 1, the next, unless given")
      ->check(CLI::PositiveNumber);
  add->add_option("--times", times, "how many are hit; 0 for all that follow, 1 unless given");
  auto *const answers = add->add_option("--status", status, "answer this, such as QEX_BUSY");
  add->add_option("--exception", exception, "spring the trap with this type, such as OSError")
      ->excludes(answers);
  add->add_option("--message", message, "the text of the exception");
  add->add_option("--delay", delay, "wait so many seconds first")->check(CLI::Range(0.0, 1e6));
  add->callback([] {
    // Through a document, because that knows statuses by their names and reads several effects.
    check(simhost_apply(simhost::control::fault_document({.function = function,
                                                          .nth = nth,
                                                          .times = times,
                                                          .status = status,
                                                          .exception = exception,
                                                          .message = message,
                                                          .delay = delay})
                            .c_str()));
  });
  fault->add_subcommand("list", "List the faults that are waiting")->callback([] {
    std::cout << simhost::control::fault_list(description());
  });
  auto *const clear = fault->add_subcommand("clear", "Remove faults");
  clear->add_option("function", function, "of this function; all unless given");
  clear->callback([] { check(simhost_clear_faults(or_null(function))); });
}

void add_lifecycle(CLI::App &app) {
  app.add_subcommand("restart", "Restart the host: what is volatile, learned or counted goes")
      ->callback([] { check(simhost_restart()); });
  app.add_subcommand("reset", "Make the host as it was when its state was new")->callback([] {
    check(simhost_reset());
  });
}

void add_commands(CLI::App &app) {
  // The environment is read at the first call, which is made by a subcommand.
  app.add_option_function<std::string>(
      "--state", [](std::string const &file) { setenv("SIMHOST_STATE", file.c_str(), 1); },
      "The file that holds the state of the host; SIMHOST_STATE in the environment unless given");
  app.require_subcommand(1);
  app.parse_complete_callback([] {
    char const *const state = std::getenv("SIMHOST_STATE");
    if (state == nullptr || *state == '\0') {
      throw Failure("which host? name its state with --state FILE or SIMHOST_STATE");
    }
  });
  add_show(app);
  add_apply(app);
  add_link(app);
  add_learn(app);
  add_counter(app);
  add_clock(app);
  add_fault(app);
  add_lifecycle(app);
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
