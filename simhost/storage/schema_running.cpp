// The tables of the runtime state: what the data plane knows, the clock, the faults that are
// waiting.
#include "storage/schema.h"

namespace simhost::storage {

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
    beacons     INTEGER NOT NULL,
    errors      INTEGER NOT NULL,
    driver      INTEGER NOT NULL,
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
  CREATE INDEX address_by_port ON address (port);
  CREATE INDEX address_by_place ON address (switch, ifnull(port, 0), mac, vid, vni);
  CREATE INDEX address_by_age ON address (switch, seen) WHERE ages;

  -- How many addresses are learned (type 2) at a place, a port's number or 0 for the team, and under
  -- -1 at all places of a switch: counting the rows would make each new address dearer than the last.
  CREATE TABLE learned (
    switch      INTEGER NOT NULL REFERENCES switch ON DELETE CASCADE,
    place       INTEGER NOT NULL,
    addresses   INTEGER NOT NULL,
    PRIMARY KEY (switch, place)
  ) STRICT, WITHOUT ROWID;
  CREATE TRIGGER address_added AFTER INSERT ON address WHEN new.type = 2 BEGIN
    INSERT INTO learned VALUES (new.switch, ifnull(new.port, 0), 1), (new.switch, -1, 1)
      ON CONFLICT DO UPDATE SET addresses = addresses + 1;
  END;
  CREATE TRIGGER address_removed AFTER DELETE ON address WHEN old.type = 2 BEGIN
    UPDATE learned SET addresses = addresses - 1
      WHERE switch = old.switch AND place IN (ifnull(old.port, 0), -1);
    DELETE FROM learned
      WHERE switch = old.switch AND place = ifnull(old.port, 0) AND addresses = 0;
  END;
  CREATE TRIGGER address_changed AFTER UPDATE OF port, type ON address
    WHEN new.port IS NOT old.port OR new.type <> old.type BEGIN
    UPDATE learned SET addresses = addresses - 1
      WHERE old.type = 2 AND switch = old.switch AND place IN (ifnull(old.port, 0), -1);
    INSERT INTO learned
      SELECT new.switch, value, 1 FROM json_each(json_array(ifnull(new.port, 0), -1))
      WHERE new.type = 2
      ON CONFLICT DO UPDATE SET addresses = addresses + 1;
  END;

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

}  // namespace simhost::storage
