// How an interface is configured, read back.
#pragma once

#include <cstdint>

namespace vlsys {

// The configured modes of an interface, from the kernel's IPv6 switches and the interface's file.
// IPv6 that is on with no way to an address (no autoconfiguration, DHCPv6 or IPV6ADDR) is Off.
// Returns 0, or the positive errno of a failed step, logged; when the file cannot be opened, the
// IPv6 mode is the one of the switches and the IPv4 mode is not written.
// Blocks for 11 seconds for each of two switch files that is missing.
int get_mode(const char *name, uint32_t *ipv4_mode, uint32_t *ipv6_mode);

// 1 when the kernel switch file begins with "1", 0 when not, -1 when it cannot be opened (logged).
// A missing file is waited for, 11 tries 1 second apart, each logged at LOG_DEBUG.
int is_sysctl_on(const char *path);

} // namespace vlsys
