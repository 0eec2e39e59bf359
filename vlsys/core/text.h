// Text allocated to its exact length.
#pragma once

#include "core/owners.h"

namespace vlsys {

// asprintf with an owner; null when there is no memory (errno says so).
[[gnu::format(printf, 1, 2)]] Text format_text(const char *format, ...);

} // namespace vlsys
