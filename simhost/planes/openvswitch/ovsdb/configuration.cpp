#include "planes/openvswitch/ovsdb/configuration.h"

#include <algorithm>

namespace simhost::ovsdb {
namespace {

constexpr char const *kTable = "Open_vSwitch";
constexpr char const *kWanted = "next_cfg";
constexpr char const *kInForce = "cur_cfg";

bool is_in_force(Replica const &replica, std::int64_t number) {
  auto const &rows = replica.rows(kTable);
  return std::any_of(rows.begin(), rows.end(), [&](auto const &row) {
    auto const &in_force = row.second.at(kInForce);
    return in_force.is_number_integer() && in_force >= number;
  });
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
  selected[kTable].emplace_back(kInForce);
}

void wait_for_configuration(Client &client, std::int64_t number, Deadline deadline) {
  while (!is_in_force(client.replica(), number)) {
    client.wait_for_news(deadline);
  }
}

}  // namespace simhost::ovsdb
