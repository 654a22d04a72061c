// The functions that programs call: letting them fail, and which of them are modelled.
#include <fmt/format.h>

#include <iostream>
#include <limits>
#include <nlohmann/json.hpp>
#include <string_view>

#include "cli/commands.h"
#include "cli/tree.h"

namespace simhost::cli {
namespace {

constexpr std::string_view kCallTable =
#include "call_table.inc"
    ;

void add_fault_options(CLI::App &add, FaultWords &fault) {
  constexpr auto kMost = std::numeric_limits<std::uint32_t>::max();
  add.add_option("function", fault.function, "such as VSDVS_SetMTU")->required();
  add.add_option("--nth", fault.nth, "the first call that is hit; 1, the next, unless given")
      ->check(whole_number(1, kMost));
  add.add_option("--times", fault.times, "how many are hit; 0 for all that follow, 1 unless given")
      ->check(whole_number(0, kMost));
  auto *const status = add.add_option("--status", fault.status, "return this, such as QEX_BUSY");
  add.add_option("--exception", fault.exception, "trap with this type, such as OSError")
      ->excludes(status);
  add.add_option("--message", fault.message, "the text of the exception");
  add.add_option("--delay", fault.delay, "wait so many seconds first")->check(decimal_number());
}

void add_fault(CLI::App &app) {
  auto *const fault = app.add_subcommand("fault", "Let chosen calls of a function fail");
  fault->require_subcommand(1);
  fault->footer(
      "Faults wait in the state and hit every process:\n"
      "  simhostctl fault add VSDVS_SetMTU --nth 2 --status QEX_BUSY\n"
      "  simhostctl fault add VSQEX_GetUplinks --exception OSError --message 'it is gone'");
  auto *const add = fault->add_subcommand("add", "Add a fault");
  auto const given = words_of_command<FaultWords>();
  add_fault_options(*add, *given);
  // Through a document, because that knows statuses by their names and reads several effects.
  add->callback([given] { check(simhost_apply(fault_document(*given).c_str())); });
  fault->add_subcommand("list", "List the faults that are waiting")->callback([] {
    std::cout << fault_list(description());
  });
  auto *const clear = fault->add_subcommand("clear", "Remove faults");
  auto const function = words_of_command<std::string>();
  clear->add_option("function", *function, "of this function; all unless given");
  clear->callback([function] { check(simhost_clear_faults(or_null(*function))); });
}

void show_calls() {
  for (auto const &call : nlohmann::json::parse(kCallTable)) {
    auto told = call["answer"].get<std::string>();
    if (call.contains("status")) {
      told += ": " + call["status"].get<std::string>();
    }
    std::cout << fmt::format("{:<36} {:<16} {}\n", call["call"].get<std::string>(),
                             call["library"].get<std::string>(), told);
  }
}

void add_calls(CLI::App &app) {
  auto *const calls = app.add_subcommand("calls", "List the host's calls, modelled or not");
  auto const json = words_of_command<bool>();
  calls->add_flag("--json", *json, "as a list of objects");
  calls->footer("Needs no host. The table is made from the libraries when they are built.");
  calls->callback([json] {
    if (*json) {
      std::cout << kCallTable;
    } else {
      show_calls();
    }
  });
}

}  // namespace

void add_call_commands(CLI::App &app) {
  add_fault(app);
  add_calls(app);
}

}  // namespace simhost::cli
