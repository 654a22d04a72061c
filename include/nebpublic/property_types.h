#ifndef NEBPUBLIC_PROPERTY_TYPES_H
#define NEBPUBLIC_PROPERTY_TYPES_H

/**
 * @file
 * Types of the properties of switches and ports.
 */

/** How long a property lives and who may set it; a list call takes several as a mask. */
enum {
  CONFIG_PROP_TYPE = 16,
  RUNTIME_PROP_TYPE = 32,
  VOLATILE_PROP_TYPE = 4,
  POLICY_PROP_TYPE = 8,
  ALL_PROP_TYPE = 60, /**< the four of them */
};

#endif  // NEBPUBLIC_PROPERTY_TYPES_H
