// The tables of what runs: what the data plane knows, the clock, the faults that are waiting.
#include "store/schema.h"

namespace simhost::store {

// Times are milliseconds of the host's clock. A counter is 64 bits wide and unsigned, which SQLite
// keeps in a signed integer of that width.
char const *const kRunningSchema = R"sql(
  -- One row. A clock that is stopped shows `value`; one that runs is `value` ahead of real time.
  CREATE TABLE clock (
    stopped     INTEGER NOT NULL,
    value       INTEGER NOT NULL
  ) STRICT;
  INSERT INTO clock VALUES (0, 0);

  -- An uplink without a row has a link as it comes from the factory.
  CREATE TABLE link (
    uplink      TEXT PRIMARY KEY REFERENCES uplink (name) ON DELETE CASCADE,
    carrier     INTEGER NOT NULL,
    admin       INTEGER NOT NULL,
    partner     INTEGER NOT NULL,
    speed       INTEGER NOT NULL,
    full_duplex INTEGER NOT NULL,
    up_since    INTEGER NOT NULL
  ) STRICT;

  CREATE TABLE lag (
    id          INTEGER PRIMARY KEY AUTOINCREMENT CHECK (id <= 4294967295),
    switch      INTEGER NOT NULL REFERENCES switch ON DELETE CASCADE,
    name        TEXT NOT NULL,
    UNIQUE (switch, name)
  ) STRICT;

  -- An uplink is in one group at most.
  CREATE TABLE lag_uplink (
    position    INTEGER PRIMARY KEY,
    lag         INTEGER NOT NULL REFERENCES lag ON DELETE CASCADE,
    uplink      TEXT NOT NULL UNIQUE REFERENCES uplink (name) ON DELETE CASCADE
  ) STRICT;
  CREATE INDEX lag_uplink_by_lag ON lag_uplink (lag);
  CREATE TRIGGER uplink_moved AFTER UPDATE OF port ON uplink BEGIN
    DELETE FROM lag_uplink WHERE uplink = new.name;
  END;

  -- Without a port, the address is reached through the switch's team of uplinks.
  CREATE TABLE address (
    switch      INTEGER NOT NULL REFERENCES switch ON DELETE CASCADE,
    port        INTEGER REFERENCES port ON DELETE CASCADE,
    mac         BLOB NOT NULL CHECK (length(mac) = 6),
    vid         INTEGER NOT NULL,
    vni         INTEGER NOT NULL,
    type        INTEGER NOT NULL,
    ages        INTEGER NOT NULL,
    seen        INTEGER NOT NULL,
    UNIQUE (switch, mac, vid, vni)
  ) STRICT;
  CREATE INDEX address_by_place ON address (port, switch);

  -- The length of the address is its family: 6, 4 or 16 bytes.
  CREATE TABLE mcast_group (
    key         INTEGER PRIMARY KEY,
    port        INTEGER NOT NULL REFERENCES port ON DELETE CASCADE,
    address     BLOB NOT NULL,
    version     INTEGER NOT NULL,
    source_mode INTEGER NOT NULL,
    vni         INTEGER NOT NULL,
    updated     INTEGER NOT NULL,
    UNIQUE (port, address)
  ) STRICT;

  CREATE TABLE mcast_source (
    position    INTEGER PRIMARY KEY,
    mcast_group INTEGER NOT NULL REFERENCES mcast_group ON DELETE CASCADE,
    address     BLOB NOT NULL
  ) STRICT;
  CREATE INDEX mcast_source_by_group ON mcast_source (mcast_group);

  -- Of a switch, of one of its ports, or of one of its mirror sessions.
  CREATE TABLE counter (
    switch      INTEGER NOT NULL REFERENCES switch ON DELETE CASCADE,
    port        INTEGER REFERENCES port ON DELETE CASCADE,
    session     TEXT NOT NULL,
    name        TEXT NOT NULL,
    value       INTEGER NOT NULL
  ) STRICT;
  CREATE UNIQUE INDEX counter_by_owner ON counter (switch, ifnull(port, 0), session, name);
  CREATE INDEX counter_by_port ON counter (port);

  -- Settings of the host as a whole that differ from their defaults.
  CREATE TABLE host_setting (
    name        TEXT PRIMARY KEY,
    value       ANY NOT NULL
  ) STRICT;

  -- What is to happen to calls `first` to `last` of a function; `seen` of them have been made.
  CREATE TABLE fault (
    key         INTEGER PRIMARY KEY,
    function    TEXT NOT NULL,
    first       INTEGER NOT NULL,
    last        INTEGER NOT NULL,
    seen        INTEGER NOT NULL DEFAULT 0,
    delay       INTEGER NOT NULL,
    status      INTEGER NOT NULL,
    exception   TEXT NOT NULL,
    message     TEXT NOT NULL
  ) STRICT;
  CREATE INDEX fault_by_function ON fault (function);
)sql";

}  // namespace simhost::store
