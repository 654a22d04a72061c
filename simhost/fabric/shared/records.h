// What a fabric says of switches and ports, and what this host has of them, row by row.
#pragma once

#include <map>
#include <nlohmann/json.hpp>
#include <optional>
#include <set>
#include <stdexcept>
#include <string>
#include <vector>

#include "fabric/shared/counts.h"
#include "storage/shared.h"

namespace simhost::fabric {

using Json = nlohmann::json;
using storage::Membership;
using storage::SharedName;

/// A row of the fabric: of a switch its "alias", "hosts" and "settings", of a port the "host" where
/// it is connected, or an empty text, and "settings"; these are members with their values as JSON.
using Records = std::map<SharedName, Json>;

/// What becomes of a row; null where there is none.
struct Change {
  SharedName name;
  Json was;
  Json now;
};

void to_json(Json &said, Change const &change);
void from_json(Json const &said, Change &change);

/// What a transaction made other than this host and the fabric agreed on, of what is touched. A
/// switch that is gone here is left to its other hosts. Refuses to change what the fabric has and
/// this host cannot bear (QEX_BUSY).
std::vector<Change> changes_of(storage::Transaction &transaction, Membership const &membership);
/// The fabric has them.
void agree(storage::ChangingTransaction &transaction, std::vector<Change> const &changes);

/// This host cannot bear a row; what() says why.
class Unborne : public std::runtime_error {
 public:
  Unborne(SharedName name, std::string const &why)
      : std::runtime_error(why), name_(std::move(name)) {}
  [[nodiscard]] SharedName const &name() const { return name_; }

 private:
  SharedName name_;
};

/// What a fabric has of the switches that the host belongs to.
struct News {
  /// Of the only ones that may have changed, whether there are records of them or not; none: any.
  std::optional<std::set<SharedName>> names;
  Records records;
  /// Of ports that are connected here.
  std::map<SharedName, CountsOfHosts> counts;
};

struct Followed {
  bool is_other = false;  ///< whether anything became other
  /// Whether the fabric has ports connected here that are not, as in a state that was restored: by
  /// changes_of they are connected nowhere.
  bool is_left = false;
};

/// Makes what is shared here what the fabric says, but for the rows that are known to be unborne.
/// Throws Unborne, and the transaction must not be committed then.
Followed follow(storage::ChangingTransaction &transaction, Membership const &membership,
                News const &news, std::map<SharedName, std::string> const &unborne);

}  // namespace simhost::fabric
