#include "core/log.h"
#include "core/paths.h"
#include "core/text.h"
#include "netconf/interfaces.h"
#include "netconf/keys.h"

#include <cerrno>
#include <cstdio>
#include <iterator>

namespace vlsys {

namespace {

// The texts that the interface's file may get from the record.
struct AddressTexts {
    const char *address, *netmask, *address6;
};

// Of the IPv4 keys; those of the IPv6 keys are the modes.
enum class Ipv4Column : uint8_t { both_off, off, manual, dhcp };

} // namespace

using enum Action;
static constexpr auto address = &AddressTexts::address;
static constexpr auto netmask = &AddressTexts::netmask;
static constexpr auto address6 = &AddressTexts::address6;

// clang-format off
static constexpr KeyRow<AddressTexts, 4> ipv4_keys[] = {
    // IPv4             Off, IPv6 too  Off      Manual   DHCP
    {"GATEWAY",        {removed,       removed, removed, removed}},
    {"PREFIX",         {removed,       removed, removed, removed}},
    {"UUID",           {removed,       removed, removed, removed}},
    {"HWADDR",         {removed,       removed, removed, removed}},
    {"NM_CONTROLLED",  {"no",          "no",    "no",    "no"}},
    {"ONBOOT",         {"no",          "yes",   "yes",   "yes"}},
    {"BOOTPROTO",      {kept,          "none",  "none",  "dhcp"}},
    {"IPADDR",         {kept,          removed, address, removed}},
    {"NETMASK",        {kept,          removed, netmask, removed}},
};

static constexpr KeyRow<AddressTexts, 4> ipv6_keys[] = {
    // IPv6             Off      Manual    DHCP     Auto
    {"IPV6FORWARDING", {removed, removed,  removed, removed}},
    {"IPV6_ROUTER",    {removed, removed,  removed, removed}},
    {"IPV6INIT",       {"no",    "yes",    "yes",   "yes"}},
    {"IPV6_AUTOCONF",  {"no",    "no",     "yes",   "yes"}},
    {"IPV6ADDR",       {removed, address6, removed, removed}},
    {"DHCPV6C",        {removed, removed,  "yes",   removed}},
};

static constexpr KeyRow<AddressTexts, 4> ipv6_switches[] = {
    // IPv6              Off   Manual DHCP  Auto
    {"disable_ipv6",    {" 1", " 0",  " 0", " 0"}},
    {"autoconf",        {kept, " 0",  " 1", " 1"}},
    {"accept_ra_pinfo", {kept, " 0",  " 1", " 1"}},
};
// clang-format on

static Ipv4Column ipv4_column(const vlsys_ifconf &conf) {
    switch (conf.ipv4_mode) {
    case VLSYS_MODE_OFF:
        return conf.ipv6_mode == VLSYS_MODE_OFF ? Ipv4Column::both_off : Ipv4Column::off;
    case VLSYS_MODE_MANUAL:
        return Ipv4Column::manual;
    default:
        return Ipv4Column::dhcp;
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

    const AddressTexts texts = {
        .address = address_text.text,
        .netmask = netmask_text.text,
        .address6 = address6_prefix,
    };
    edit_item array[std::size(ipv4_keys) + std::size(ipv6_keys)];
    ItemList list(array);
    list.add_column(ipv4_keys, ipv4_column(conf), texts);
    list.add_column(ipv6_keys, ipv6_column(conf), texts);
    return edit_or_log(SystemPath(ifcfg_prefix, name).text, list.items());
}

static int write_switches(const char *name, const vlsys_ifconf &conf) {
    edit_item array[std::size(ipv6_switches)];
    SwitchKey keys[std::size(ipv6_switches)];
    ItemList list(array);
    SwitchKey *key = keys;
    for (const auto &row : ipv6_switches) {
        *key = switch_key(name, row.key);
        list.add_cell(key->text, row.cells[ipv6_column(conf)], {});
        ++key;
    }
    return edit_or_log(SystemPath(sysctl_path).text, list.items());
}

static int set_addressing(const char *name, const vlsys_ifconf &conf) {
    int result = find_interface(name);
    if (result == 0)
        result = write_interface_file(name, conf);
    if (result == 0)
        result = write_switches(name, conf);
    return result;
}

} // namespace vlsys

using namespace vlsys;

int vlsys_set_netif(const char *name, const vlsys_ifconf *conf) {
    return name && conf ? -set_addressing(name, *conf) : EFAULT;
}
