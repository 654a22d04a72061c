#include "planes/openvswitch/ovsdb/configuration.h"

#include <algorithm>

namespace simhost::ovsdb {
namespace {

constexpr char const *kTable = "Open_vSwitch";
constexpr char const *kWanted = "next_cfg";
constexpr char const *kInForce = "cur_cfg";

std::int64_t number_in(Replica const &replica, char const *column) {
  std::int64_t number = 0;
  for (auto const &[id, row] : replica.rows(kTable)) {
    auto const &value = row.at(column);
    number = std::max(number, value.is_number_integer() ? value.get<std::int64_t>() : 0);
  }
  return number;
}

}  // namespace

void raise_configuration(Json &operations) {
  operations.push_back({{"op", "mutate"},
                        {"table", kTable},
                        {"where", Json::array()},
                        {"mutations", Json::array({Json::array({kWanted, "+=", 1})})}});
  operations.push_back({{"op", "select"},
                        {"table", kTable},
                        {"where", Json::array()},
                        {"columns", Json::array({kWanted})}});
}

std::int64_t raised_configuration(Json const &results) {
  if (results.is_array() && !results.empty() && results.back().is_object()) {
    auto const rows = results.back().value("rows", Json::array());
    auto const *const row = rows.is_array() && rows.size() == 1 ? &rows[0] : nullptr;
    if (row != nullptr && row->is_object() && row->contains(kWanted) &&
        (*row)[kWanted].is_number_integer()) {
      return (*row)[kWanted].get<std::int64_t>();
    }
  }
  throw Malformed("a transaction does not tell the number of the configuration");
}

void select_configuration(Selected &selected) {
  selected[kTable].insert(selected[kTable].end(), {kWanted, kInForce});
}

std::int64_t wanted_configuration(Replica const &replica) {
  return number_in(replica, kWanted);
}

void wait_for_configuration(Client &client, std::int64_t number, Deadline deadline) {
  while (number_in(client.replica(), kInForce) < number) {
    client.wait_for_news(deadline);
  }
}

}  // namespace simhost::ovsdb
