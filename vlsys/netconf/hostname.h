// Host and domain names.
#pragma once

namespace vlsys {

// 0 when the name is a well-formed host or domain name (the empty text is), else -1. Logs a name or
// label that is too long; silent for a null name and for a character that is out of place.
int check_hostname_format(const char *name);

} // namespace vlsys
