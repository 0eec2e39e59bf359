#include "core/log.h"
#include "core/paths.h"
#include "core/text.h"
#include "netconf/keys.h"

#include <cerrno>
#include <cstdio>
#include <iterator>
#include <net/if.h>

namespace vlsys {

static constexpr Cell address = field_1;
static constexpr Cell netmask = field_2;
static constexpr Cell address6 = field_3;

enum Ipv4Column { both_off, ipv4_off, ipv4_manual, ipv4_dhcp };

static constexpr KeyRow<4> ipv4_keys[] = {
    // IPv4 and IPv6 Off, IPv4 Off, Manual, DHCP
    {"GATEWAY", {removed, removed, removed, removed}},
    {"PREFIX", {removed, removed, removed, removed}},
    {"UUID", {removed, removed, removed, removed}},
    {"HWADDR", {removed, removed, removed, removed}},
    {"NM_CONTROLLED", {no, no, no, no}},
    {"ONBOOT", {no, yes, yes, yes}},
    {"BOOTPROTO", {kept, none, none, dhcp}},
    {"IPADDR", {kept, removed, address, removed}},
    {"NETMASK", {kept, removed, netmask, removed}},
};

// The columns of the IPv6 tables are the modes.
static constexpr KeyRow<4> ipv6_keys[] = {
    // Off, Manual, DHCP, Auto
    {"IPV6FORWARDING", {removed, removed, removed, removed}},
    {"IPV6_ROUTER", {removed, removed, removed, removed}},
    {"IPV6INIT", {no, yes, yes, yes}},
    {"IPV6_AUTOCONF", {no, no, yes, yes}},
    {"IPV6ADDR", {removed, address6, removed, removed}},
    {"DHCPV6C", {removed, removed, yes, removed}},
};

static constexpr KeyRow<4> ipv6_switches[] = {
    // Off, Manual, DHCP, Auto
    {"disable_ipv6", {one, zero, zero, zero}},
    {"autoconf", {kept, zero, one, one}},
    {"accept_ra_pinfo", {kept, zero, one, one}},
};

static Ipv4Column ipv4_column(const vlsys_ifconf &conf) {
    switch (conf.ipv4_mode) {
    case VLSYS_MODE_OFF:
        return conf.ipv6_mode == VLSYS_MODE_OFF ? both_off : ipv4_off;
    case VLSYS_MODE_MANUAL:
        return ipv4_manual;
    default:
        return ipv4_dhcp;
    }
}

static uint32_t ipv6_column(const vlsys_ifconf &conf) {
    return conf.ipv6_mode < VLSYS_MODE_AUTO ? conf.ipv6_mode : VLSYS_MODE_AUTO;
}

static void log_ipv4(const char *name, const vlsys_ifconf &conf, const char *text) {
    switch (conf.ipv4_mode) {
    case VLSYS_MODE_OFF:
        vlsys_log(LOG_INFO, "IPv4 (%s): OFF", name);
        break;
    case VLSYS_MODE_MANUAL:
        vlsys_log(LOG_INFO, "IPv4 (%s): %s/%d", name, text, conf.prefix);
        break;
    default:
        vlsys_log(LOG_INFO, "IPv4 (%s): DHCP", name);
    }
}

static void log_ipv6(const char *name, const vlsys_ifconf &conf, const char *text) {
    switch (conf.ipv6_mode) {
    case VLSYS_MODE_OFF:
        vlsys_log(LOG_INFO, "IPv6 (%s): OFF", name);
        break;
    case VLSYS_MODE_MANUAL:
        vlsys_log(LOG_INFO, "IPv6 (%s): %s/%d", name, text, static_cast<int>(conf.addr6[0].prefix));
        break;
    case VLSYS_MODE_DHCP:
        vlsys_log(LOG_INFO, "IPv6 (%s): DHCP", name);
        break;
    default:
        vlsys_log(LOG_INFO, "IPv6 (%s): AUTO", name);
    }
}

static int write_interface_file(const char *name, const vlsys_ifconf &conf) {
    const FieldText address_text(conf.addr);
    const FieldText netmask_text(conf.netmask);
    const FieldText address6_text(conf.addr6[0].addr);
    char address6_prefix[50];
    snprintf(address6_prefix, sizeof address6_prefix, "%s/%d", address6_text.text,
             static_cast<int>(conf.addr6[0].prefix));
    log_ipv4(name, conf, address_text.text);
    log_ipv6(name, conf, address6_text.text);

    ItemList list;
    const Fields fields = {{address_text.text, netmask_text.text, address6_prefix}};
    list.add(ipv4_keys, ipv4_column(conf), fields);
    list.add(ipv6_keys, ipv6_column(conf), fields);
    return edit_or_log(SystemPath(ifcfg_prefix, name).text, list.items());
}

static int write_switches(const char *name, const vlsys_ifconf &conf) {
    ItemList list;
    SwitchKey keys[std::size(ipv6_switches)];
    SwitchKey *key = keys;
    for (const auto &row : ipv6_switches) {
        key->set(name, row.key);
        list.add(key->text, row.cells[ipv6_column(conf)], {});
        ++key;
    }
    return edit_or_log(SystemPath(sysctl_path).text, list.items());
}

} // namespace vlsys

using namespace vlsys;

int vlsys_set_netif(const char *name, const vlsys_ifconf *conf) {
    if (!name || !conf)
        return EFAULT;
    if (if_nametoindex(name) == 0)
        return ENXIO;
    const int result = write_interface_file(name, *conf);
    return result != 0 ? result : write_switches(name, *conf);
}
