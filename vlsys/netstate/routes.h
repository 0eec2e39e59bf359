// The default gateways in the kernel's routing tables.
#pragma once

#include "vlsys.h"

#include <cstdio>

namespace vlsys {

// The first default route of the table, read from its stream; without one the record stays as it
// is. Returns 0; or, with the record as it was and after a message, the positive errno of a table
// that cannot be read, the errno or negative resolver code of an address without a text.

// Of /proc/net/ipv6_route, a default route with a gateway: fills the whole record.
int read_ipv6_gateway(FILE *table, vlsys_gw6 *gw);
// Of /proc/net/route, a default route with or without a gateway: fills `addr` and `iface`.
int read_ipv4_gateway(FILE *table, vlsys_gw4 *gw);

} // namespace vlsys
