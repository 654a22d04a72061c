// libnebPublic.so of the recording host: a line for each call.

#include "recording.h"
