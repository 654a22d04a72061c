// libnebPublic.so of the null host.

#include "returns_at_once.h"

#include "nebpublic_calls.inc"
