// Which rows of a fabric a host has yet to follow.
#pragma once

#include <map>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "fabric/shared/records.h"
#include "planes/openvswitch/ovsdb/replica.h"

namespace simhost::fabric {

/// The switches and ports that are to be followed: what a fabric has of them costs only as much as
/// there is news of it.
class Touched {
 public:
  explicit Touched(std::string host) : host_(std::move(host)) {}

  /// Whatever there is, as after a time in which nobody looked.
  void add_all();
  /// What rows say now, or said.
  void add(ovsdb::Replica const &replica, std::vector<ovsdb::RowChange> const &changes);
  /// All of it is followed.
  void clear();

  [[nodiscard]] bool is_all() const { return is_all_; }
  [[nodiscard]] bool empty() const { return !has_others() && counted_.empty(); }
  /// Whether there is more than what ports have counted.
  [[nodiscard]] bool has_others() const { return is_all_ || !rows_.empty(); }
  [[nodiscard]] News news(ovsdb::Replica const &replica) const;

 private:
  void add_switch(ovsdb::Replica const &replica, ovsdb::RowChange const &change);
  void add_port(ovsdb::Replica const &replica, ovsdb::RowChange const &change);
  void add_counts(ovsdb::Row const &row, News &news) const;

  std::string host_;
  bool is_all_ = true;
  // By the name that a row has or had, its UUID. Of two rows of one name, one has gone.
  std::map<SharedName, std::string> rows_;
  std::set<std::string> counted_;  // UUIDs of ports that are connected here
};

}  // namespace simhost::fabric
