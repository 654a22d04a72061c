// The tables. Every name by which a call looks something up is unique here, and so has an index.
#include "storage/schema.h"

namespace simhost::storage {

char const *const kSchema = R"sql(
  CREATE TABLE switch (
    key         INTEGER PRIMARY KEY AUTOINCREMENT,
    alias       TEXT NOT NULL UNIQUE,
    identifier  TEXT NOT NULL UNIQUE,
    portset     TEXT NOT NULL UNIQUE,
    max_ports   INTEGER NOT NULL,
    version     INTEGER NOT NULL,
    persistent  INTEGER NOT NULL,
    associated  INTEGER NOT NULL DEFAULT 1,
    -- Kept by the triggers below: counting the rows would make each new port dearer than the last.
    clients     INTEGER NOT NULL DEFAULT 0
  ) STRICT;

  -- The number is what callers see as a numeric port id: never used twice, except that a reset of
  -- the host begins anew, and 32 bits wide.
  CREATE TABLE port (
    number      INTEGER PRIMARY KEY AUTOINCREMENT CHECK (number <= 4294967295),
    switch      INTEGER NOT NULL REFERENCES switch ON DELETE CASCADE,
    identifier  TEXT NOT NULL,
    is_uplink   INTEGER NOT NULL,
    external_id TEXT,
    UNIQUE (switch, identifier),
    UNIQUE (switch, external_id)
  ) STRICT;
  CREATE INDEX port_by_switch ON port (switch, number);
  CREATE INDEX uplink_port ON port (switch) WHERE is_uplink;
  CREATE TRIGGER client_added AFTER INSERT ON port WHEN NOT new.is_uplink BEGIN
    UPDATE switch SET clients = clients + 1 WHERE key = new.switch;
  END;
  CREATE TRIGGER client_removed AFTER DELETE ON port WHEN NOT old.is_uplink BEGIN
    UPDATE switch SET clients = clients - 1 WHERE key = old.switch;
  END;

  -- An uplink belongs to the host; it is free while it is at no port.
  CREATE TABLE uplink (
    position    INTEGER PRIMARY KEY,
    name        TEXT NOT NULL UNIQUE,
    port        INTEGER UNIQUE REFERENCES port ON DELETE SET NULL
  ) STRICT;

  CREATE TABLE property (
    switch      INTEGER NOT NULL REFERENCES switch ON DELETE CASCADE,
    scope       INTEGER NOT NULL,
    port        INTEGER REFERENCES port ON DELETE CASCADE,
    name        TEXT NOT NULL,
    type        INTEGER NOT NULL,
    value       BLOB NOT NULL
  ) STRICT;
  CREATE UNIQUE INDEX property_by_owner ON property (switch, scope, ifnull(port, 0), name);
  CREATE INDEX property_by_port ON property (port);
  CREATE INDEX property_by_name ON property (switch, name, port);
)sql";

}  // namespace simhost::storage
