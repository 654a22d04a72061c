// State files to try, and what the host says of those that it does not take.
#pragma once

#include <filesystem>
#include <fstream>
#include <string>

#include "named_switch.h"
#include "storage/state_file.h"
#include "storage/store.h"
#include "storage/switches.h"
#include "temporary_folder.h"

inline void populate_nothing(simhost::storage::ChangingTransaction &) {}

// What `work` says is wrong with a state; empty if nothing is.
template <typename Work>
std::string refusal_by(Work const &work) {
  try {
    work();
    return "";
  } catch (simhost::storage::UnusableState const &error) {
    return error.what();
  }
}

inline std::string refusal_of(simhost::storage::StateFile const &file) {
  return refusal_by([&] { simhost::storage::Store const store(file, populate_nothing); });
}

inline std::string refused(std::filesystem::path const &file, std::string const &why) {
  return "the state file " + file.string() + " cannot be used: " + why;
}

inline void write_file(std::filesystem::path const &file, std::string const &text) {
  std::ofstream(file, std::ios::binary) << text;
}

inline void add(simhost::storage::Store &store, std::string const &name) {
  simhost::storage::ChangingTransaction transaction(store);
  simhost::storage::add_switch(transaction, named(name));
  transaction.commit();
}

inline bool has(simhost::storage::Store &store, std::string const &name) {
  simhost::storage::ReadingTransaction transaction(store);
  return simhost::storage::find_switch(transaction, simhost::storage::SwitchName::alias, name)
      .has_value();
}

/// A state with the switch "a", closed.
inline std::filesystem::path made(TemporaryFolder const &folder) {
  auto file = folder.file("host.db");
  simhost::storage::Store store(file, populate_nothing);
  add(store, "a");
  return file;
}
