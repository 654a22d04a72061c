// A fresh host is a document like any other: the one that SIMHOST_SCENARIO names, or our own.
#include "core/fresh_host.h"

#include <cstdlib>
#include <fstream>
#include <string>

#include "control/scenario.h"

namespace simhost {
namespace {

constexpr char const *kDefaultHost =
#include "default_host.inc"
    ;

void apply_file(store::Transaction &transaction, std::string const &name) {
  std::ifstream file(name);
  std::string const document(std::istreambuf_iterator<char>(file), {});
  try {
    if (!file) {
      throw control::DocumentError("it cannot be read");
    }
    control::apply(transaction, document);
  } catch (control::DocumentError const &error) {
    throw control::DocumentError("the scenario " + name + " cannot be used: " + error.what());
  }
}

}  // namespace

void furnish_fresh_host(store::Transaction &transaction) {
  char const *const named = std::getenv("SIMHOST_SCENARIO");
  if (named != nullptr && *named != '\0') {
    apply_file(transaction, named);
  } else {
    control::apply(transaction, kDefaultHost);
  }
}

}  // namespace simhost
