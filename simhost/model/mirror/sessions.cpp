// Each change is one of the whole table.
#include "model/mirror/sessions.h"

#include <algorithm>
#include <vector>

#include "base/outcomes.h"
#include "model/lookup.h"
#include "model/properties/properties.h"
#include "storage/store.h"

namespace simhost::mirror {

void append_sessions(storage::ChangingTransaction &transaction, storage::Port const &port,
                     BytesView table) {
  auto added = Table::from(table);
  auto const owner = owner_of(port);
  if (auto const old = find_value(transaction, sessions, owner)) {
    added.version = std::max(added.version, old->version);
    added.sessions.insert(added.sessions.begin(), old->sessions.begin(), old->sessions.end());
  }
  set(transaction, sessions, owner, added);
}

void remove_session(storage::ChangingTransaction &transaction, storage::Port const &port,
                    std::string_view sid) {
  auto const owner = owner_of(port);
  auto table = effective(transaction, sessions, owner);
  if (std::erase_if(table.sessions, [&](Session const &session) {
        return text_in(session.record.sid) == sid;
      }) == 0) {
    throw Refused(QEX_NOT_FOUND);
  }
  if (table.sessions.empty()) {
    clear(transaction, sessions, owner);
  } else {
    set(transaction, sessions, owner, table);
  }
}

}  // namespace simhost::mirror
