// The log, as the library's own sources call it.
#pragma once

#include "vlsys.h"

// GCC's -Wpedantic refuses "%m", which this library's messages live on; the arguments stay checked.
#define vlsys_log(...) __extension__ vlsys_log(__VA_ARGS__)
