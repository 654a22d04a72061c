#ifndef QEXAPI_REVISION_H
#define QEXAPI_REVISION_H

/**
 * @file
 * The revision of the host kernel interface that these headers describe.
 */

/** The parts of the revision, and all four in one qex_revnum. */
#define QEXAPI_REVISION_MAJOR 2
#define QEXAPI_REVISION_MINOR 5
#define QEXAPI_REVISION_UPDATE 0
#define QEXAPI_REVISION_PATCH_LEVEL 0
#define QEXAPI_REVISION 0x2050000

#endif  // QEXAPI_REVISION_H
