// Labs are a program of Python's, beside the pytest plug-in with which it has its wires in common.
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string>
#include <vector>

#include "cli/commands.h"

namespace simhost::cli {
namespace {

// In the folder of a build; packages have put it where Python looks anyway.
void let_python_find_it() {
  std::error_code none;
  auto const program = std::filesystem::read_symlink("/proc/self/exe", none);
  auto const beside = program.parent_path().parent_path() / "python";
  if (std::filesystem::exists(beside / "simhost" / "lab.py", none)) {
    auto const *const others = std::getenv("PYTHONPATH");
    auto const path = others == nullptr ? beside.string() : beside.string() + ":" + others;
    setenv("PYTHONPATH", path.c_str(), 1);
  }
}

[[noreturn]] void run_lab(std::vector<std::string> words) {
  let_python_find_it();
  auto const *const chosen = std::getenv("SIMHOST_PYTHON");
  std::string python = chosen == nullptr ? "python3" : chosen;
  words.insert(words.begin(), {python, "-m", "simhost.lab"});
  std::vector<char *> pointers;
  for (auto &word : words) {
    pointers.push_back(word.data());
  }
  pointers.push_back(nullptr);
  execvp(python.c_str(), pointers.data());
  throw Failure(python + ": " + std::strerror(errno));
}

void add_up(CLI::App &lab) {
  auto *const up = lab.add_subcommand("up", "Start a lab, and return when it is up");
  auto const file = words_of_command<std::string>();
  up->add_option("file", *file, "the document of the lab")->required();
  up->callback([file] { run_lab({"up", *file}); });
}

void add_down(CLI::App &lab) {
  auto *const down = lab.add_subcommand("down", "End a lab, and leave nothing of it");
  auto const name = words_of_command<std::string>();
  auto const all = words_of_command<bool>();
  auto *const named = down->add_option("lab", *name, "its name");
  down->add_flag("--all", *all, "all labs of this user")->excludes(named);
  down->callback([name, all] {
    if (name->empty() && !*all) {
      throw CLI::RequiredError("lab");
    }
    run_lab({"down", *all ? "--all" : *name});
  });
}

void add_exec(CLI::App &lab) {
  auto *const exec = lab.add_subcommand("exec", "Run a command on a machine of a lab");
  auto const machine = words_of_command<std::string>();
  exec->add_option("machine", *machine, "a host, a client, a router or a network, or LAB/MACHINE")
      ->required();
  exec->prefix_command();
  exec->footer(
      "On a host the command finds its state; without a command there is a shell:\n"
      "  simhostctl lab exec h1 simhostctl show\n"
      "  simhostctl lab exec web ping -c 1 10.9.0.2");
  exec->callback([exec, machine] {
    std::vector<std::string> words{"exec", *machine};
    auto const command = exec->remaining();
    words.insert(words.end(), command.begin(), command.end());
    run_lab(words);
  });
}

}  // namespace

void add_lab_commands(CLI::App &app) {
  auto *const lab = app.add_subcommand(
      "lab", "Hosts whose frames are real, with networks, routers and clients, from one document");
  lab->require_subcommand(1);
  add_up(*lab);
  add_down(*lab);
  lab->add_subcommand("list", "List the labs of this user, and their machines")->callback([] {
    run_lab({"list"});
  });
  add_exec(*lab);
}

}  // namespace simhost::cli
