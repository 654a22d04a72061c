// The tables of what joins this host to others: tunnels that are a switch's uplink, and what
// carries them.
#include "storage/schema.h"

namespace simhost::storage {

char const *const kFabricSchema = R"sql(
  -- One row at most: the device over which tunnels leave the host, and the address they leave from.
  CREATE TABLE underlay (
    device      TEXT NOT NULL,
    address     BLOB NOT NULL,
    prefix      INTEGER NOT NULL,
    gateway     BLOB
  ) STRICT;

  CREATE TABLE fabric (
    switch      INTEGER PRIMARY KEY REFERENCES switch ON DELETE CASCADE,
    uplink      TEXT NOT NULL UNIQUE REFERENCES uplink (name) ON DELETE CASCADE,
    encapsulation INTEGER NOT NULL,
    key         INTEGER NOT NULL,
    UNIQUE (encapsulation, key)
  ) STRICT;
  -- The uplink of a fabric goes with it; that it leaves its port is told first.
  CREATE TRIGGER fabric_removed AFTER DELETE ON fabric BEGIN
    UPDATE uplink SET port = NULL WHERE name = old.uplink;
    DELETE FROM uplink WHERE name = old.uplink;
  END;

  -- A tunnel keeps its place while others come and go: what was learned beyond it names the place.
  CREATE TABLE tunnel (
    switch      INTEGER NOT NULL REFERENCES fabric ON DELETE CASCADE,
    place       INTEGER NOT NULL CHECK (place BETWEEN 0 AND 63),
    peer        BLOB NOT NULL,
    PRIMARY KEY (switch, place),
    UNIQUE (switch, peer)
  ) STRICT, WITHOUT ROWID;
)sql";

}  // namespace simhost::storage
