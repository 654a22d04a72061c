// The tables of a host that shares switches with others.
#include "storage/schema.h"

namespace simhost::storage {

char const *const kSharedSchema = R"sql(
  -- One row from the day on which the host became a member of a fabric.
  CREATE TABLE membership (
    host        TEXT NOT NULL,
    state       TEXT NOT NULL
  ) STRICT;

  -- Switches, and with a port their ports, by the names that they have on all hosts. A row stays when
  -- its switch or port goes, so that this is told to the fabric.
  CREATE TABLE shared (
    switch      TEXT NOT NULL,
    port        TEXT NOT NULL,
    fabric      TEXT NOT NULL,
    image       BLOB,
    fits        INTEGER NOT NULL,
    PRIMARY KEY (switch, port)
  ) STRICT, WITHOUT ROWID;
)sql";

char const *const kCountedSchema = R"sql(
  -- What counts at several hosts, host by host: counters as a text, as far as those of the port
  -- here have them. A host without a name stands for what those of the port were at the last look.
  CREATE TABLE counted (
    port        INTEGER NOT NULL REFERENCES port ON DELETE CASCADE,
    host        TEXT NOT NULL,
    counters    TEXT NOT NULL,
    PRIMARY KEY (port, host)
  ) STRICT, WITHOUT ROWID;
)sql";

}  // namespace simhost::storage
