// The tables of a host that shares switches with others, and the triggers that tell what of that a
// transaction touches, by whichever way and process.
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

char const *const kTouchedSchema = R"sql(
  -- The names of what is shared that may have become other since its row of "shared" was put. The
  -- triggers say ON CONFLICT, as the OR of a statement that sets them off takes the place of theirs.
  CREATE TABLE touched (
    switch      TEXT NOT NULL,
    port        TEXT NOT NULL,
    PRIMARY KEY (switch, port)
  ) STRICT, WITHOUT ROWID;

  CREATE VIEW shared_switch AS
    SELECT switch.key, shared.switch FROM switch
      CROSS JOIN shared ON shared.switch = switch.identifier AND shared.port = '';
  CREATE VIEW shared_port AS
    SELECT port.number, shared.switch, port.identifier AS port FROM port
      CROSS JOIN switch ON switch.key = port.switch
      CROSS JOIN shared ON shared.switch = switch.identifier AND shared.port = ''
      WHERE NOT port.is_uplink;

  -- Whoever puts a place here, which is a switch or a port of it, has it noted if it is shared.
  CREATE VIEW touched_place AS SELECT NULL AS switch, NULL AS port WHERE false;
  CREATE TRIGGER touched_at_place INSTEAD OF INSERT ON touched_place BEGIN
    INSERT INTO touched SELECT switch, port FROM shared_port WHERE number = new.port
      ON CONFLICT DO NOTHING;
    INSERT INTO touched SELECT switch, '' FROM shared_switch
      WHERE key = new.switch AND new.port IS NULL
      ON CONFLICT DO NOTHING;
  END;

  -- What was committed before there were triggers is looked at once.
  INSERT INTO touched SELECT switch, port FROM shared;
  INSERT INTO touched SELECT switch, port FROM shared_port WHERE true ON CONFLICT DO NOTHING;

  CREATE TRIGGER touched_by_added_switch AFTER INSERT ON switch
    WHEN EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched SELECT switch, port FROM shared WHERE switch = new.identifier
      ON CONFLICT DO NOTHING;
  END;
  CREATE TRIGGER touched_by_removed_switch AFTER DELETE ON switch
    WHEN EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched SELECT switch, port FROM shared WHERE switch = old.identifier
      ON CONFLICT DO NOTHING;
  END;
  CREATE TRIGGER touched_by_changed_switch AFTER UPDATE OF alias, max_ports, version ON switch
    WHEN EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched_place VALUES (new.key, NULL);
  END;

  CREATE TRIGGER touched_by_added_port AFTER INSERT ON port
    WHEN EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched SELECT switch, new.identifier FROM shared_switch
      WHERE key = new.switch AND NOT new.is_uplink
      ON CONFLICT DO NOTHING;
  END;
  CREATE TRIGGER touched_by_removed_port AFTER DELETE ON port
    WHEN EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched SELECT switch, old.identifier FROM shared_switch
      WHERE key = old.switch AND NOT old.is_uplink
      ON CONFLICT DO NOTHING;
  END;
  CREATE TRIGGER touched_by_changed_port AFTER UPDATE OF external_id ON port
    WHEN EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched_place VALUES (new.switch, new.number);
  END;

  CREATE TRIGGER touched_by_connected_port AFTER INSERT ON device
    WHEN EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched_place VALUES (NULL, new.port);
  END;
  CREATE TRIGGER touched_by_disconnected_port AFTER DELETE ON device
    WHEN EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched_place VALUES (NULL, old.port);
  END;

  CREATE TRIGGER touched_by_set_property AFTER INSERT ON property
    WHEN EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched_place VALUES (new.switch, new.port);
  END;
  CREATE TRIGGER touched_by_changed_property AFTER UPDATE ON property
    WHEN EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched_place VALUES (new.switch, new.port);
  END;
  CREATE TRIGGER touched_by_removed_property AFTER DELETE ON property
    WHEN EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched_place VALUES (old.switch, old.port);
  END;

  -- Addresses that were learned (type 2) are not shared.
  CREATE TRIGGER touched_by_added_address AFTER INSERT ON address
    WHEN new.type <> 2 AND EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched_place VALUES (new.switch, new.port);
  END;
  CREATE TRIGGER touched_by_changed_address AFTER UPDATE OF port, type ON address
    WHEN (new.type <> 2 OR old.type <> 2) AND EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched_place VALUES (new.switch, new.port);
    INSERT INTO touched_place VALUES (old.switch, old.port);
  END;
  CREATE TRIGGER touched_by_removed_address AFTER DELETE ON address
    WHEN old.type <> 2 AND EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched_place VALUES (old.switch, old.port);
  END;
)sql";

char const *const kTouchedTunnelsSchema = R"sql(
  -- What the uplink of a fabric is called is each host's own.
  INSERT INTO touched_place SELECT switch, NULL FROM fabric;

  CREATE TRIGGER touched_by_added_fabric AFTER INSERT ON fabric
    WHEN EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched_place VALUES (new.switch, NULL);
  END;
  CREATE TRIGGER touched_by_changed_fabric AFTER UPDATE OF encapsulation, key ON fabric
    WHEN EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched_place VALUES (new.switch, NULL);
  END;
  CREATE TRIGGER touched_by_removed_fabric AFTER DELETE ON fabric
    WHEN EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched_place VALUES (old.switch, NULL);
  END;
  CREATE TRIGGER touched_by_added_peer AFTER INSERT ON tunnel
    WHEN EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched_place VALUES (new.switch, NULL);
  END;
  CREATE TRIGGER touched_by_removed_peer AFTER DELETE ON tunnel
    WHEN EXISTS (SELECT 1 FROM shared) BEGIN
    INSERT INTO touched_place VALUES (old.switch, NULL);
  END;
)sql";

}  // namespace simhost::storage
