/**
 * Marks what the module exports besides its entry point. Everything else stays hidden; the linker
 * script of the module names the exported symbols once more, so that neither can grow by accident.
 */
#ifndef HELPERS_EXPORTED_H
#define HELPERS_EXPORTED_H

#define EXPORTED __attribute__((visibility("default")))

#endif
