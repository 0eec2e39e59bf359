// Every fixed system path, and the way to build one under the root path.
#pragma once

#include "vlsys.h"

namespace vlsys {

// Makes the root, prefix and data paths of the environment. Returns 0 or the negated errno, logged;
// what was made before the failure stays until drop_paths.
int set_up_paths();
void drop_paths();

// Under the root path.
inline constexpr char localtime_path[] = "/etc/localtime";   // link to the zone file
inline constexpr char clock_path[] = "/etc/sysconfig/clock"; // ZONE
inline constexpr char network_path[] =
    "/etc/sysconfig/network"; // HOSTNAME, GATEWAY, IPV6_DEFAULTGW
inline constexpr char ifcfg_prefix[] = "/etc/sysconfig/network-scripts/ifcfg-"; // + interface name
inline constexpr char sysctl_path[] = "/etc/sysctl.d/velmora"; // IPv6 kernel switches

// Of the running system, whatever the root path is.
inline constexpr char zoneinfo_prefix[] = "/usr/share/zoneinfo/"; // + zone name
inline constexpr char resolv_path[] = "/etc/resolv.conf";
inline constexpr char ipv6_conf_path[] = "/proc/sys/net/ipv6/conf";
inline constexpr char route_path[] = "/proc/net/route"; // IPv4 routing table
inline constexpr char ipv6_route_path[] = "/proc/net/ipv6_route";
inline constexpr char avio_status_path[] = "/proc/driver/VlAvio/status";
inline constexpr char serial_number_command[] = "/usr/bin/Tovrin version -d krd";
inline constexpr char version_path[] = "/etc/velmora-version";
inline constexpr char block_path[] = "/sys/block";

// A path under the root path, cut to 4095 bytes.
struct SystemPath {
    explicit SystemPath(const char *fixed, const char *name = "");

    char text[VLSYS_PATH_SIZE];
};

} // namespace vlsys
