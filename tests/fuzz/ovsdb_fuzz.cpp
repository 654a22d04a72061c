// What a database may send: any stream is split into messages or refused, however it is cut, and a
// replica takes any change over or refuses it.

#include <optional>
#include <string>
#include <vector>

#include "planes/openvswitch/ovsdb/replica.h"
#include "tests/fuzz/harness.h"

namespace {

using namespace simhost::ovsdb;

/// Columns of each kind, of a table that the seeds have.
Schema const &followed() {
  static Columns const columns{
      {"name", {Column::Kind::single, false, ""}},
      {"ofport_request", {Column::Kind::set, true, set({})}},
      {"trunks", {Column::Kind::set, false, set({})}},
      {"external_ids", {Column::Kind::map, false, map({})}},
  };
  static Schema const schema{{"Interface", columns}, {"Port", columns}, {"Bridge", columns}};
  return schema;
}

struct Outcome {
  std::vector<Json> messages;
  bool is_refused = false;

  bool operator==(Outcome const &) const = default;
};

Outcome split(std::uint8_t const *data, std::size_t size, std::size_t step) {
  Outcome outcome;
  Splitter splitter;
  try {
    for (std::size_t place = 0; place < size; place += step) {
      splitter.append({data + place, std::min(step, size - place)});
      while (auto message = splitter.next()) {
        outcome.messages.push_back(std::move(*message));
      }
    }
  } catch (Malformed const &error) {
    require(*error.what() != '\0', "what is wrong is said");
    outcome.is_refused = true;
  }
  return outcome;
}

void follow(std::vector<Json> const &messages) {
  Replica replica(followed());
  try {
    for (auto const &message : messages) {
      auto const params = message.value("params", Json());
      auto const update = params.is_array() && params.size() == 2;
      replica.apply(update ? params[1] : message.value("result", Json()));
    }
  } catch (Malformed const &error) {
    require(*error.what() != '\0', "what is wrong is said");
  }
  for (auto const *const table : {"Interface", "Port", "Bridge"}) {
    for (auto const &[uuid, row] : replica.rows(table)) {
      require(row.size() == followed().at(table).size(), "a row has all columns");
      for (auto const &[name, column] : followed().at(table)) {
        if (column.kind == Column::Kind::set) {
          auto const &value = row.at(name);
          require(set(atoms_of(value)) == value, "a set is one, and in order");
        }
      }
    }
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  auto const whole = split(data, size, std::max<std::size_t>(size, 1));
  constexpr std::size_t kStep = 7;
  require(split(data, size, kStep) == whole, "a stream is split alike however it is cut");
  follow(whole.messages);
  return 0;
}
