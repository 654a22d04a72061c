// What the libraries that forward use of the one that they share.
#pragma once

#define RECORDINGS_API [[gnu::visibility("default")]]
