// Scenario documents: any text is read or refused in words, and what the host then is can be
// described and read again.

#include <random>
#include <string>
#include <string_view>
#include <vector>

#include "model/options/host_settings.h"
#include "scenario/lifecycle.h"
#include "tests/fuzz/harness.h"
#include "tests/fuzz/host.h"

extern "C" std::size_t LLVMFuzzerMutate(std::uint8_t *data, std::size_t size, std::size_t most);

namespace {

using simhost::scenario::DocumentError;
using simhost::scenario::Json;
using simhost::storage::ChangingTransaction;

bool applies(ChangingTransaction &transaction, std::string_view document) {
  try {
    simhost::scenario::apply(transaction, document);
    return true;
  } catch (DocumentError const &error) {
    require(std::string_view(error.what()).size() > 2, "what is wrong is said");
    return false;
  }
}

void remove_observed(Json &value) {
  if (value.is_object()) {
    value.erase("observed");
  }
  for (auto &item : value) {
    if (item.is_structured()) {
      remove_observed(item);
    }
  }
}

/// The host as callers would describe it: without what follows from the rest.
Json description_of(ChangingTransaction &transaction) {
  auto described = simhost::scenario::parsed(simhost::scenario::description(transaction));
  remove_observed(described);
  return described;
}

/// Values of a document, for a mutation to pick from.
void collect(Json &value, std::vector<Json *> &all) {
  all.push_back(&value);
  if (value.is_structured()) {
    for (auto &item : value) {
      collect(item, all);
    }
  }
}

Json odd_value(std::mt19937 &chance) {
  static std::vector<Json> const odd{nullptr,
                                     true,
                                     false,
                                     0,
                                     1,
                                     -1,
                                     65536,
                                     4294967296,
                                     1e300,
                                     0.0005,
                                     "",
                                     Json::array(),
                                     Json::object(),
                                     "\u00e9",
                                     "nic0",
                                     "vswitch0",
                                     "uplink1",
                                     std::string(48, 'x'),
                                     std::string(128, 'x'),
                                     INT64_MIN,
                                     UINT64_MAX};
  return odd[chance() % odd.size()];
}

/// Changes one value of a document: another of its values in its place, an odd one, none, or two.
void change(Json &document, std::mt19937 &chance) {
  std::vector<Json *> all;
  collect(document, all);
  auto &value = *all[chance() % all.size()];
  switch (chance() % 4) {
    case 0:
      value = Json(*all[chance() % all.size()]);
      break;
    case 1:
      value = odd_value(chance);
      break;
    case 2:
      if (value.is_structured() && !value.empty()) {
        value.erase(std::next(value.begin(), static_cast<long>(chance() % value.size())));
      }
      break;
    default:
      if (value.is_array() && !value.empty()) {
        auto item = value[chance() % value.size()];
        value.push_back(std::move(item));
      }
      break;
  }
}

}  // namespace

/// Half of the mutations keep a document a document.
extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t *data, std::size_t size,
                                               std::size_t most, unsigned seed) {
  std::mt19937 chance(seed);
  auto document = Json::parse(data, data + size, nullptr, false);
  if (document.is_discarded() || chance() % 2 == 0) {
    return LLVMFuzzerMutate(data, size, most);
  }
  change(document, chance);
  auto const text = document.dump(-1, ' ', false, Json::error_handler_t::replace);
  if (text.size() > most) {
    return LLVMFuzzerMutate(data, size, most);
  }
  std::copy(text.begin(), text.end(), data);
  return text.size();
}

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  ChangingTransaction transaction(shared_host());
  if (!applies(transaction, {reinterpret_cast<char const *>(data), size})) {
    return 0;
  }
  simhost::stop_clock(transaction);
  auto const described = description_of(transaction);
  simhost::scenario::empty_host(transaction);
  require(applies(transaction, described.dump()), "the host reads its own description");
  require(description_of(transaction) == described, "a host of a description is described alike");
  return 0;
}
