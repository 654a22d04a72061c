/**
 * The mirror session table: its allocator, and the methods that walk and edit a table in place.
 *
 * Whatever a method returns lies in the table and ends with it.
 */
#ifndef HELPERS_MIRROR_H
#define HELPERS_MIRROR_H

#include "vswitch/mirror.h"

#ifdef __cplusplus
extern "C" {
#endif

/**
 * A zero-filled table with its magic number and counts set; `version` stays 0.
 *
 * `free_dvmirror_session_table` takes it back. The size is computed in 32 signed bits, so counts
 * that overflow them get less than they ask for. Null if there is no memory.
 */
DVMirrorSessionTable *alloc_dvmirror_session_table(int numSessions, int numEntities);

/** Frees a table of `alloc_dvmirror_session_table`; null is nothing to free. */
void free_dvmirror_session_table(DVMirrorSessionTable *table);

/** The first session, whether or not the table has one. */
DVMirrorSession *mirror_first_session(DVMirrorSessionTable *table);

/** A session; null and a notice for an index that is not below the count. */
DVMirrorSession *mirror_session_at(DVMirrorSessionTable *table, int index);

/** Copies `session` over the one at `index`; a notice and no change for an index out of range. */
void mirror_set_session_at(DVMirrorSessionTable *table, int index, DVMirrorSession const *session);

/**
 * An entity of the array after the sessions.
 *
 * Warning: the index is not checked; pass a session's `startIdx`.
 */
DVMirrorEntity *mirror_entity_at(DVMirrorSessionTable *table, int index);

/** The next entity. Warning: nothing tells the last one; count them. */
DVMirrorEntity *mirror_next_entity(DVMirrorEntity *entity);

/** What an entity of any kind names, NUL-terminated. */
typedef struct MirrorEntityText {
  char text[52];
} MirrorEntityText;

/** The value that `type` selects as text: numbers in signed decimal; empty for an unknown type. */
MirrorEntityText mirror_entity_text(DVMirrorEntity const *entity);

/**
 * Sets the value that `type` selects. Numbers are read in decimal and cut to their width, what is
 * no number is 0; what is no address changes nothing; an unknown type changes nothing.
 */
void mirror_set_entity_text(DVMirrorEntity *entity, char const *text);

/** Stand for macros of the host that have no effect at run time. */
void MIRROR_ENCAP_TYPE(void);
void MIRROR_ASSERT(void);

#ifdef __cplusplus
}
#endif

#endif
