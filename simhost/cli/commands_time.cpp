// The host's clock, and its ends and beginnings.
#include <cstdio>

#include "cli/commands.h"

namespace simhost::cli {
namespace {

void show_clock() {
  auto const now = simhost_clock_now();
  if (now < 0) {
    throw Failure(simhost_error());
  }
  std::printf("%lld.%03lld\n", static_cast<long long>(now / 1000),
              static_cast<long long>(now % 1000));
}

void add_clock(CLI::App &app) {
  auto *const clock = app.add_subcommand("clock", "The host's clock, by which everything ages");
  clock->require_subcommand(1);
  clock->footer(
      "Real time until it is stopped, stepped or set; stopped and stepped, ageing is exact:\n"
      "  simhostctl clock stop\n"
      "  simhostctl clock step 299.999");
  auto const seconds = words_of_command<double>();
  clock->add_subcommand("show", "Show what it shows, in seconds since the beginning of 1970")
      ->callback(show_clock);
  clock->add_subcommand("stop", "Stop it")->callback([] { check(simhost_clock_stop()); });
  clock->add_subcommand("run", "Let it run on")->callback([] { check(simhost_clock_run()); });
  auto *const step = clock->add_subcommand("step", "Move it forward, whether or not it runs");
  step->add_option("seconds", *seconds, "with up to three decimals")
      ->required()
      ->check(decimal_number());
  step->callback([seconds] { check(simhost_clock_step(milliseconds(*seconds))); });
  auto *const set = clock->add_subcommand("set", "Set it");
  set->add_option("seconds", *seconds, "since the beginning of 1970")
      ->required()
      ->check(decimal_number());
  set->callback([seconds] { check(simhost_clock_set(milliseconds(*seconds))); });
}

}  // namespace

void add_time_commands(CLI::App &app) {
  add_clock(app);
  auto *const restart =
      app.add_subcommand("restart", "Restart the host: what is volatile, learned or counted goes");
  restart->footer(
      "Switches that are not persistent go, and runtime and volatile properties, learned\n"
      "addresses, groups, counters, runtime options and the global MAC learning. Configuration\n"
      "and policies stay, and so do cables, the clock and faults.");
  restart->callback([] { check(simhost_restart()); });
  auto *const reset = app.add_subcommand("reset", "Make the host as it was when its state was new");
  reset->footer("That is the document that SIMHOST_SCENARIO names, or the default host.");
  reset->callback([] { check(simhost_reset()); });
}

}  // namespace simhost::cli
