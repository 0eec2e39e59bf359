// The log, as the library's own sources call it.
//
// Message texts are an interface: people search for them, and programs match them. That goes for
// misspellings ("parant", "wrang", "defautl", "unspected") and for calls that have another name by
// now ("fputs" for a write, "asprintf" for any formatting), too. None is ever mended.
#pragma once

#include "vlsys.h"

namespace vlsys {

// Logs "<text>: <reason>" at LOG_ERR, the reason being that of errno, which stays as it is. Returns
// the negated errno.
[[gnu::format(printf, 1, 2)]] int log_errno(const char *format, ...);

} // namespace vlsys
