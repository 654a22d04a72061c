// A fresh host is a document like any other: the one that SIMHOST_SCENARIO names, or our own.
#include "abi/fresh_host.h"

#include <cstdlib>
#include <fstream>
#include <string>

#include "scenario/scenario.h"
#include "storage/store.h"

namespace simhost {
namespace {

constexpr char const *kDefaultHost =
#include "default_host.inc"
    ;

void apply_file(storage::ChangingTransaction &transaction, std::string const &name) {
  std::ifstream file(name);
  std::string const document(std::istreambuf_iterator<char>(file), {});
  try {
    if (!file) {
      throw scenario::DocumentError("it cannot be read");
    }
    scenario::apply_to_own(transaction, document);
  } catch (scenario::DocumentError const &error) {
    throw scenario::DocumentError("the scenario " + name + " cannot be used: " + error.what());
  }
}

}  // namespace

void populate_fresh_host(storage::ChangingTransaction &transaction) {
  char const *const named = std::getenv("SIMHOST_SCENARIO");
  if (named != nullptr && *named != '\0') {
    apply_file(transaction, named);
  } else {
    scenario::apply_to_own(transaction, kDefaultHost);
  }
}

}  // namespace simhost
