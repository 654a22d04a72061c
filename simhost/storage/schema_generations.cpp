// The table of generations, and the triggers that give a switch new ones. They make exact what
// processes keep of the state, whichever of them changes it and by whichever way.
#include "qexapi/switch_properties.h"
#include "storage/schema.h"
#include "vswitch/properties.h"

namespace simhost::storage {

// Macros, so that the schema is one literal: whether a row of "property" is one of a switch and its
// uplink ports on which its team depends, or one of a port on which its uplink does. They compare
// one by one, because SQLite makes a table of a list anew for each row that a trigger looks at,
// which takes longer than the write itself.
#define IS(row, name) row ".name = '" name "'"
#define OF_TEAM(row)                                                                   \
  "(" IS(row, VSPROP_SWITCH_TEAMING) " OR " IS(row, QEX_NEBPROP_PORT_BLOCK) " OR " IS( \
      row, QEX_NEBPROP_PORT_ALIAS) ")"
#define OF_PORT(row) \
  "(" IS(row, VSPROP_PORT_TEAMING_POLICY) " OR " IS(row, VSPROP_PORT_TEAMING_OVERRIDE) ")"
// What follows when a property is set or goes, which is then the `row` "new" or "old".
#define NEW_GENERATION(column, row, is_one) \
  " UPDATE generation SET " column " = random() WHERE switch = " row ".switch AND " is_one(row) ";"
#define BY_PROPERTY(row)                                                                 \
  "WHEN " OF_TEAM(row) " OR " OF_PORT(row) " BEGIN" NEW_GENERATION("team", row, OF_TEAM) \
      NEW_GENERATION("ports", row, OF_PORT) " END"

char const *const kGenerationSchema = R"sql(
  CREATE TABLE generation (
    switch      INTEGER PRIMARY KEY REFERENCES switch ON DELETE CASCADE,
    team        INTEGER NOT NULL DEFAULT (random()),
    ports       INTEGER NOT NULL DEFAULT (random())
  ) STRICT;
  INSERT INTO generation (switch) SELECT key FROM switch;
  CREATE TRIGGER generations_begin AFTER INSERT ON switch BEGIN
    INSERT INTO generation (switch) VALUES (new.key);
  END;

  CREATE TRIGGER generation_by_added_port AFTER INSERT ON port BEGIN
    UPDATE generation SET team = random() WHERE switch = new.switch AND new.is_uplink;
    UPDATE generation SET ports = random() WHERE switch = new.switch AND NOT new.is_uplink;
  END;
  CREATE TRIGGER generation_by_removed_port AFTER DELETE ON port BEGIN
    UPDATE generation SET team = random() WHERE switch = old.switch AND old.is_uplink;
    UPDATE generation SET ports = random() WHERE switch = old.switch AND NOT old.is_uplink;
  END;

  CREATE TRIGGER generation_by_moved_uplink AFTER UPDATE OF port ON uplink BEGIN
    UPDATE generation SET team = random()
      WHERE switch IN (SELECT switch FROM port WHERE number IN (old.port, new.port));
  END;

  -- A link is replaced, never updated; a group without uplinks is like none; uplinks go when no
  -- switch is left.
  CREATE TRIGGER generation_by_replaced_link AFTER INSERT ON link BEGIN
    UPDATE generation SET team = random() WHERE switch =
      (SELECT port.switch FROM uplink JOIN port ON port.number = uplink.port
         WHERE uplink.name = new.uplink);
  END;

  CREATE TRIGGER generation_by_joined_uplink AFTER INSERT ON lag_uplink BEGIN
    UPDATE generation SET team = random()
      WHERE switch = (SELECT switch FROM lag WHERE id = new.lag);
  END;
  CREATE TRIGGER generation_by_parted_uplink AFTER DELETE ON lag_uplink BEGIN
    UPDATE generation SET team = random()
      WHERE switch = (SELECT switch FROM lag WHERE id = old.lag);
  END;

  CREATE TRIGGER generation_by_set_property AFTER INSERT ON property
    )sql" BY_PROPERTY("new") R"sql(;
  CREATE TRIGGER generation_by_changed_property AFTER UPDATE ON property
    )sql" BY_PROPERTY("new") R"sql(;
  CREATE TRIGGER generation_by_removed_property AFTER DELETE ON property
    )sql" BY_PROPERTY("old") R"sql(;

  CREATE TRIGGER generation_by_added_setting AFTER INSERT ON host_setting BEGIN
    UPDATE generation SET team = random();
  END;
  CREATE TRIGGER generation_by_changed_setting AFTER UPDATE ON host_setting BEGIN
    UPDATE generation SET team = random();
  END;
  CREATE TRIGGER generation_by_removed_setting AFTER DELETE ON host_setting BEGIN
    UPDATE generation SET team = random();
  END;
)sql";

}  // namespace simhost::storage
