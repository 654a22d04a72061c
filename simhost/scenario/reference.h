// What there is to set, for programs and pages that know no more of the host than that.
#pragma once

#include <string>

#include "base/api.h"

namespace simhost::scenario {

/// All properties, runtime options and objects of documents that are no settings, with their forms,
/// bounds, defaults and words, in JSON.
SIMHOST_API std::string reference();

}  // namespace simhost::scenario
