/**
 * Methods of the uplink lists: VSUplinks, VSUplinkPorts and VSUplinkPortIds.
 *
 * Indexes are checked against the count that the list itself holds, which a sized constructor sets
 * without making room to match: see `uplinks_new`.
 */
#ifndef HELPERS_UPLINKS_H
#define HELPERS_UPLINKS_H

#include "vswitch/uplinks.h"

#ifdef __cplusplus
extern "C" {
#endif

/**
 * A list that claims `count` uplinks; the caller frees it, nothing but `numEntries` is set.
 *
 * It has room for 32 bytes an entry, although an entry takes 36: filling all entries writes past
 * the end. This is what tools of the host have always been given; leave the last ones alone. Null
 * if there is no memory, which a negative count always gets.
 */
VSUplinks *uplinks_new(int count);

/** Lists of `count` names or identifiers, room for all; otherwise as `uplinks_new`. */
VSUplinkPorts *uplink_ports_new(int count);
VSUplinkPortIds *uplink_port_ids_new(int count);

/** The text of an entry, in the list; null and a notice for an index that is not below the count.
 */
char const *uplinks_name_at(VSUplinks *uplinks, int index);
char const *uplink_ports_name_at(VSUplinkPorts *ports, int index);
char const *uplink_port_ids_id_at(VSUplinkPortIds *ids, int index);

/** Fills an entry: 32, 81 or 48 chars, without a terminator if the text takes them all. */
void uplinks_set_name_at(VSUplinks *uplinks, int index, char const *name);
void uplink_ports_set_name_at(VSUplinkPorts *ports, int index, char const *name);
void uplink_port_ids_set_id_at(VSUplinkPortIds *ids, int index, char const *id);

#ifdef __cplusplus
}
#endif

#endif
