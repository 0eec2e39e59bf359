// How an interface is configured, read back.
#pragma once

#include <cstdint>

namespace vlsys {

// The configured modes of an interface, from the kernel's IPv6 switches and the interface's file.
// IPv6 that is on with no way to an address (no autoconfiguration, DHCPv6 or IPV6ADDR) is Off, and
// so is IPv6 whose switch disable_ipv6 cannot be opened.
// Returns 0, or the positive errno of a failed step, logged. No mode is written when a switch
// cannot be read; when the interface's file cannot be opened or read, the IPv6 mode is that of the
// switches and the IPv4 mode is not written. Blocks for 11 seconds for each of two switch files
// that is missing.
int get_mode(const char *name, uint32_t *ipv4_mode, uint32_t *ipv6_mode);

// 1 when the kernel switch file begins with "1", 0 when not, -1 when it cannot be opened, the
// negated errno when it is open and cannot be read; both are logged. A missing file is waited for,
// 11 tries 1 second apart, each logged at LOG_DEBUG.
int is_sysctl_on(const char *path);

} // namespace vlsys
