/**
 * Methods of the tables that queries return: multicast filters, MAC tables, mirror session
 * identifiers, destinations of promiscuous sessions.
 *
 * Warning: where no check is mentioned there is none; bound the index by the record's `numEntries`.
 */
#ifndef HELPERS_TABLES_H
#define HELPERS_TABLES_H

#include <Python.h>

#include "vswitch/mac_tables.h"
#include "vswitch/mcast_filters.h"
#include "vswitch/mirror.h"

#ifdef __cplusplus
extern "C" {
#endif

/** An entry as text, a new reference; the query's mode says which kind the entries are. */
PyObject *mcast_filters_mac_at(VSMcastFilters *filters, int index);
PyObject *mcast_filters_ipv4_at(VSMcastFilters *filters, int index);
PyObject *mcast_filters_ipv6_at(VSMcastFilters *filters, int index);

/** A source as text, a new reference. */
PyObject *mcast_filter_stats_ipv4_at(VSMcastFilterStats *stats, int index);
PyObject *mcast_filter_stats_ipv6_at(VSMcastFilterStats *stats, int index);

/** A MAC address of six bytes as text, a new reference. */
PyObject *mac_text(unsigned char const *address);

/** A copy of an entry of the array that starts at `entries`. */
VSMACEntry mac_entry_at(VSMACEntry *entries, int index);

/** Copies six bytes of `address` into the entry. */
void mac_entry_set_address(VSMACEntry *entry, unsigned char const *address);

/**
 * The 32 bytes of an identifier as `bytes`, a new reference, NULs included.
 *
 * For an index that is not below the count: a notice and null with no error set, which the
 * interpreter reports as a `SystemError`. Tools of the host rely on it.
 */
PyObject *mirror_session_ids_at(VSDVMirrorSessionIDs *ids, int index);

/** A destination, in the record; null and a notice for an index that is not below the count. */
qex_SwitchPortID *promisc_destination_at(VSPromiscSessionActiveDsts *destinations, int index);

/** Replaces a destination; a notice and no change for an index that is not below the count. */
void promisc_set_destination_at(VSPromiscSessionActiveDsts *destinations, int index,
                                qex_SwitchPortID const *port);

#ifdef __cplusplus
}
#endif

#endif
