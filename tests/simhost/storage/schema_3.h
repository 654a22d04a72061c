// A state file of schema version 3 with the switch "old", as SQL that makes one: what the host has
// to read for as long as there are such files. It is written out here and changes with nothing.
#pragma once

inline constexpr char const *kSchema3 = R"sql(
  PRAGMA application_id = 1448307053;
  PRAGMA user_version = 3;
  PRAGMA journal_mode = WAL;
  CREATE TABLE switch (
    key         INTEGER PRIMARY KEY AUTOINCREMENT,
    alias       TEXT NOT NULL UNIQUE,
    identifier  TEXT NOT NULL UNIQUE,
    portset     TEXT NOT NULL UNIQUE,
    max_ports   INTEGER NOT NULL,
    version     INTEGER NOT NULL,
    persistent  INTEGER NOT NULL,
    associated  INTEGER NOT NULL DEFAULT 1,
    clients     INTEGER NOT NULL DEFAULT 0
  ) STRICT;
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
  CREATE TABLE clock (
    stopped     INTEGER NOT NULL,
    value       INTEGER NOT NULL
  ) STRICT;
  INSERT INTO clock VALUES (0, 0);
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
  CREATE TABLE lag_uplink (
    position    INTEGER PRIMARY KEY,
    lag         INTEGER NOT NULL REFERENCES lag ON DELETE CASCADE,
    uplink      TEXT NOT NULL UNIQUE REFERENCES uplink (name) ON DELETE CASCADE
  ) STRICT;
  CREATE INDEX lag_uplink_by_lag ON lag_uplink (lag);
  CREATE TRIGGER uplink_moved AFTER UPDATE OF port ON uplink BEGIN
    DELETE FROM lag_uplink WHERE uplink = new.name;
  END;
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
  CREATE TABLE counter (
    switch      INTEGER NOT NULL REFERENCES switch ON DELETE CASCADE,
    port        INTEGER REFERENCES port ON DELETE CASCADE,
    session     TEXT NOT NULL,
    name        TEXT NOT NULL,
    value       INTEGER NOT NULL
  ) STRICT;
  CREATE UNIQUE INDEX counter_by_owner ON counter (switch, ifnull(port, 0), session, name);
  CREATE INDEX counter_by_port ON counter (port);
  CREATE TABLE host_setting (
    name        TEXT PRIMARY KEY,
    value       ANY NOT NULL
  ) STRICT;
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
  INSERT INTO switch (alias, identifier, portset, max_ports, version, persistent)
    VALUES ('old', 'old-id', 'old-ports', 128, 200, 1);
  INSERT INTO port (switch, identifier, is_uplink) VALUES (1, 'p', 0);
  INSERT INTO uplink (name) VALUES ('nic0');
  INSERT INTO property (switch, scope, name, type, value)
    VALUES (1, 0, 'com.quorix.vswitch.mtu', 1, x'28230000');
)sql";
