// The tables of a host whose frames a daemon moves: its devices, and what the daemon is to bring
// into force.
#include "storage/schema.h"

namespace simhost::storage {

char const *const kFramesSchema = R"sql(
  -- A network device is one uplink's or one port's. Its number is what the data path knows it by,
  -- which has 16 bits, where the numbers of ports have 32 and are used once.
  CREATE TABLE device (
    number      INTEGER PRIMARY KEY CHECK (number BETWEEN 1 AND 65279),
    name        TEXT NOT NULL UNIQUE,
    uplink      TEXT UNIQUE REFERENCES uplink (name) ON DELETE CASCADE,
    port        INTEGER UNIQUE REFERENCES port ON DELETE CASCADE,
    mac         BLOB CHECK (length(mac) = 6),
    CHECK ((uplink IS NULL) <> (port IS NULL))
  ) STRICT;

  -- One row from the day on which a daemon first took the host. The change that was committed last is
  -- the one to bring into force.
  CREATE TABLE frames (
    change      INTEGER NOT NULL
  ) STRICT;
)sql";

char const *const kReadingSchema = R"sql(
  -- What the data path had counted when its counters were last added to those of the host: what it
  -- counted since is what is above. The source 0, which counts nothing, is there from the first
  -- reading until the counters go.
  CREATE TABLE reading (
    switch      INTEGER NOT NULL REFERENCES switch ON DELETE CASCADE,
    source      INTEGER NOT NULL,
    frames      INTEGER NOT NULL,
    bytes       INTEGER NOT NULL,
    PRIMARY KEY (switch, source)
  ) STRICT, WITHOUT ROWID;
)sql";

char const *const kRememberedSchema = R"sql(
  -- The addresses that the data path has learned, in a VLAN or in all (-1). What it learned at a port
  -- goes with the port's device.
  CREATE TABLE remembered (
    switch      INTEGER NOT NULL REFERENCES switch ON DELETE CASCADE,
    kind        INTEGER NOT NULL,
    vlan        INTEGER NOT NULL,
    mac         BLOB NOT NULL CHECK (length(mac) = 6),
    port        INTEGER REFERENCES device (port) ON DELETE CASCADE,
    PRIMARY KEY (switch, kind, vlan, mac)
  ) STRICT, WITHOUT ROWID;
  CREATE INDEX remembered_by_port ON remembered (port);
)sql";

// In milliseconds since the beginning of 1970.
char const *const kSeenSchema = "ALTER TABLE remembered ADD COLUMN seen INTEGER";

char const *const kChosenSchema = R"sql(
  -- Which uplink of a team that goes by load was chosen for a port, as a remainder.
  CREATE TABLE chosen (
    port        INTEGER PRIMARY KEY REFERENCES port ON DELETE CASCADE,
    share       INTEGER NOT NULL
  ) STRICT;
)sql";

// Whether the partner is asked to tell of itself each second, not each 30 seconds.
char const *const kLacpSchema = "ALTER TABLE lag ADD COLUMN is_fast INTEGER NOT NULL DEFAULT 0";

}  // namespace simhost::storage
