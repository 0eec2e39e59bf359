// The record layouts are part of the library's contract with programs built earlier.
#include "vlsys.h"

static_assert(sizeof(vlsys_addr6) == 60);
static_assert(offsetof(vlsys_addr6, prefix) == 48);
static_assert(offsetof(vlsys_addr6, scope) == 52);

static_assert(sizeof(vlsys_ifconf) == 340);
static_assert(offsetof(vlsys_ifconf, index) == 0);
static_assert(offsetof(vlsys_ifconf, name) == 1);
static_assert(offsetof(vlsys_ifconf, lower_up) == 17);
static_assert(offsetof(vlsys_ifconf, mac) == 18);
static_assert(offsetof(vlsys_ifconf, up) == 36);
static_assert(offsetof(vlsys_ifconf, addr) == 37);
static_assert(offsetof(vlsys_ifconf, broadaddr) == 53);
static_assert(offsetof(vlsys_ifconf, netmask) == 69);
static_assert(offsetof(vlsys_ifconf, prefix) == 85);
static_assert(offsetof(vlsys_ifconf, ipv4_mode) == 88);
static_assert(offsetof(vlsys_ifconf, has_ipv6) == 92);
static_assert(offsetof(vlsys_ifconf, addr6) == 96);
static_assert(offsetof(vlsys_ifconf, ipv6_mode) == 336);

static_assert(sizeof(vlsys_dns) == 1184);
static_assert(offsetof(vlsys_dns, server) == 1025);
static_assert(offsetof(vlsys_dns, iface) == 1163);
static_assert(offsetof(vlsys_dns, mode) == 1180);

static_assert(sizeof(vlsys_gw4) == 36);
static_assert(offsetof(vlsys_gw4, addr) == 16);
static_assert(offsetof(vlsys_gw4, mode) == 32);

static_assert(sizeof(vlsys_gw6) == 68);
static_assert(offsetof(vlsys_gw6, addr) == 16);
static_assert(offsetof(vlsys_gw6, mode) == 64);
