// Functions that the host gets in place of those that the tool gives, so that what is called back
// is recorded; each goes on to the tool's own.
#pragma once

#include "recordings/core/api.h"
#include "recordings/core/signatures.h"
#include "recordings/recorder/frames.h"

namespace recordings {

RECORDINGS_API Visit stand_in(Frame &frame, Visit given) noexcept;

/// A list keeps these beyond the call that it gets them with, so each different one has a stand-in
/// for good; there are only so many, and after those the tool's own are passed on.
RECORDINGS_API Allocate stand_in(Frame &frame, Allocate given) noexcept;
RECORDINGS_API Release stand_in(Frame &frame, Release given) noexcept;

/// Anything else is passed on.
template <typename T>
T stand_in(Frame & /*frame*/, T given) noexcept {
  return given;
}

}  // namespace recordings

extern "C" {

/// What the tool gave where the host has this function; the function itself if no tool gave it.
RECORDINGS_API void *recorder_given_for(void *function);
}
