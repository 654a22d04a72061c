#ifndef QEXAPI_LISTS_H
#define QEXAPI_LISTS_H

/**
 * @file
 * Linked lists of the kernel.
 */

/** Links of a doubly linked list, held in its elements; the list owns none of them. */
typedef struct qex_ListLinks {
  struct qex_ListLinks *prevPtr;
  struct qex_ListLinks *nextPtr;
} qex_ListLinks;

#endif  // QEXAPI_LISTS_H
