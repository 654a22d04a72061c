// The plane without frames.
#pragma once

#include "model/plane.h"

namespace simhost::stored {

/// Lives as long as the process.
Plane &plane();

}  // namespace simhost::stored
