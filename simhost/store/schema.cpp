// The tables. Every name by which a call looks something up is unique here, and so has an index.
#include "store/schema.h"

namespace simhost::store {

char const *const kSchema = R"sql(
  CREATE TABLE switch (
    key         INTEGER PRIMARY KEY AUTOINCREMENT,
    alias       TEXT NOT NULL UNIQUE,
    identifier  TEXT NOT NULL UNIQUE,
    portset     TEXT NOT NULL UNIQUE,
    max_ports   INTEGER NOT NULL,
    version     INTEGER NOT NULL,
    persistent  INTEGER NOT NULL
  ) STRICT;

  -- The number is what callers see as a numeric port id: never used twice, and 32 bits wide.
  CREATE TABLE port (
    number      INTEGER PRIMARY KEY AUTOINCREMENT CHECK (number <= 4294967295),
    switch      INTEGER NOT NULL REFERENCES switch ON DELETE CASCADE,
    identifier  TEXT NOT NULL,
    is_uplink   INTEGER NOT NULL,
    UNIQUE (switch, identifier)
  ) STRICT;

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
)sql";

}  // namespace simhost::store
