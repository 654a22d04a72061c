// Choices by load in SQL.
#include "storage/load/chosen.h"

#include "storage/query.h"

namespace simhost::storage {

ChosenShares chosen_shares(Transaction &transaction, SwitchKey key) {
  Query select(transaction,
               "SELECT port, share FROM chosen JOIN port ON port.number = chosen.port"
               " WHERE port.switch = ?");
  ChosenShares shares;
  select.with(key);
  while (select.next()) {
    shares.emplace(select.port_number(0), select.number<std::uint32_t>(1));
  }
  return shares;
}

void put_chosen_share(ChangingTransaction &transaction, PortNumber port, std::uint32_t share) {
  Change(transaction, "INSERT OR REPLACE INTO chosen SELECT number, ? FROM port WHERE number = ?")
      .with(std::int64_t{share})
      .with(port)
      .run();
}

void remove_chosen_shares(ChangingTransaction &transaction) {
  Change(transaction, "DELETE FROM chosen").run();
}

}  // namespace simhost::storage
