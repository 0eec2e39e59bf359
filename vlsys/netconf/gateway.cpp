#include "core/log.h"
#include "core/paths.h"
#include "core/text.h"
#include "netconf/interfaces.h"
#include "netconf/keys.h"

#include <cstring>

namespace vlsys {

static int write_gateway(const char *key, const char *address) {
    const edit_item items[] = {{address[0] == '\0', key, address}};
    return edit_or_log(SystemPath(network_path).text, items);
}

// Whether the interface may have a default route of its own. The record is a vlsys_gw4 or
// vlsys_gw6.
template <class Gateway>
static bool has_default_route(const Gateway &gw, const char *name) {
    return gw.mode == VLSYS_MODE_MANUAL || gw.addr[0] != '\0' ||
           strncmp(name, gw.iface, sizeof gw.iface) == 0;
}

static void log_gateway4(const vlsys_gw4 &gw, const char *address) {
    if (address[0] != '\0')
        vlsys_log(LOG_INFO, "IPv4 GW %s", address);
    else if (gw.mode == VLSYS_MODE_OFF || gw.mode == VLSYS_MODE_MANUAL)
        vlsys_log(LOG_INFO, "IPv4 GW none");
    else
        vlsys_log(LOG_INFO, "IPv4 GW dhcp");
}

static int set_defroute(const char *name, bool default_route) {
    if (default_route)
        vlsys_log(LOG_DEBUG, "%s: delete DEFROUTE", name);
    else
        vlsys_log(LOG_DEBUG, "%s: DEFROUTE=no", name);
    const edit_item items[] = {
        {default_route, "DEFROUTE", default_route ? "" : "no"},
        {1, "METRIC", ""},
        {1, "GATEWAY", ""},
        {1, "GATEWAYDEV", ""},
    };
    return edit_or_log(SystemPath(ifcfg_prefix, name).text, items);
}

static void log_gateway6(const vlsys_gw6 &gw, const char *address) {
    if (address[0] != '\0')
        vlsys_log(LOG_INFO, "IPv6 GW %s", address);
    else if (gw.mode == VLSYS_MODE_OFF || gw.mode == VLSYS_MODE_MANUAL)
        vlsys_log(LOG_INFO, "IPv6 GW none");
    else if (gw.mode == VLSYS_MODE_DHCP)
        vlsys_log(LOG_INFO, "IPv6 GW dhcp");
    else
        vlsys_log(LOG_INFO, "IPv6 GW auto");
}

// The drop-in's line that says whether an interface takes a default route from advertisements.
static edit_item make_switch(const char *name, bool default_route, SwitchKey *key) {
    key->set(name, "accept_ra_defrtr");
    if (default_route) {
        vlsys_log(LOG_INFO, "IPv6 GW auto (%s)", name);
        vlsys_log(LOG_DEBUG, "%s 1", key->text);
    } else {
        vlsys_log(LOG_DEBUG, "%s 0", key->text);
    }
    return {0, key->text, default_route ? " 1" : " 0"};
}

static int write_defrtr_switches(const vlsys_gw6 &gw) {
    const InterfaceList interfaces;
    vlsys_log(LOG_DEBUG, "vlsys_get_ifname_list: %d", interfaces.count());
    const auto count = static_cast<size_t>(interfaces.count());
    if (count == 0)
        return 0;
    const Owned<SwitchKey[]> keys(static_cast<SwitchKey *>(calloc(count, sizeof(SwitchKey))));
    const Owned<edit_item[]> items(static_cast<edit_item *>(calloc(count, sizeof(edit_item))));
    if (!keys || !items) {
        vlsys_log(LOG_ERR, "calloc(80, %d): %m", interfaces.count());
        return errno;
    }
    size_t i = 0;
    for (const auto &name : interfaces) {
        items[i] = make_switch(name, has_default_route(gw, name), &keys[i]);
        i++;
    }
    return edit_or_log(SystemPath(sysctl_path).text, {items.get(), count});
}

} // namespace vlsys

using namespace vlsys;

int vlsys_set_ipv4_default_gateway2(const vlsys_gw4 *gw) {
    if (!gw)
        return EFAULT;
    const FieldText address(gw->addr);
    log_gateway4(*gw, address.text);
    int result = write_gateway("GATEWAY", address.text);
    if (result != 0)
        return result;
    for (const auto &name : InterfaceList()) {
        result = set_defroute(name, has_default_route(*gw, name));
        if (result != 0)
            return result;
    }
    return 0;
}

int vlsys_set_ipv6_default_gateway2(const vlsys_gw6 *gw) {
    if (!gw)
        return EFAULT;
    const FieldText address(gw->addr);
    log_gateway6(*gw, address.text);
    const int result = write_gateway("IPV6_DEFAULTGW", address.text);
    return result != 0 ? result : write_defrtr_switches(*gw);
}

// The record that an address text, or none, stands for.
template <class Gateway>
static Gateway make_gateway(const char *text, uint32_t mode_without) {
    Gateway gw = {};
    gw.mode = mode_without;
    if (text && text[0] != '\0') {
        vlsys_strlcpy(gw.addr, text, sizeof gw.addr);
        gw.mode = VLSYS_MODE_MANUAL;
    }
    return gw;
}

int vlsys_set_ipv4_default_gateway(const char *text) {
    const auto gw = make_gateway<vlsys_gw4>(text, VLSYS_MODE_DHCP);
    return vlsys_set_ipv4_default_gateway2(&gw);
}

int vlsys_set_ipv6_default_gateway(const char *text) {
    const auto gw = make_gateway<vlsys_gw6>(text, VLSYS_MODE_AUTO);
    return vlsys_set_ipv6_default_gateway2(&gw);
}
