// Marks what libsimhost.so offers to the host's two libraries; nothing else of C++ leaves it.
#pragma once

#define SIMHOST_API __attribute__((visibility("default")))
