#include "core/log.h"
#include "core/paths.h"
#include "core/text.h"
#include "netconf/interfaces.h"
#include "netconf/keys.h"

#include <cstring>

namespace vlsys {

static int write_gateway(const char *key, const char *address) {
    edit_item array[1];
    ItemList list(array);
    if (address[0] != '\0')
        list.set(key, address);
    else
        list.remove(key);
    return edit_or_log(SystemPath(network_path).text, list.items());
}

// Whether the interface may have a default route of its own. The record is a vlsys_gw4 or
// vlsys_gw6.
template <class Gateway>
static bool has_default_route(const char *name, const Gateway &gw) {
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

static int set_route_keys(const char *name, bool default_route) {
    edit_item array[4];
    ItemList list(array);
    if (default_route) {
        vlsys_log(LOG_DEBUG, "%s: delete DEFROUTE", name);
        list.remove("DEFROUTE");
    } else {
        vlsys_log(LOG_DEBUG, "%s: DEFROUTE=no", name);
        list.set("DEFROUTE", "no");
    }
    for (const char *key : {"METRIC", "GATEWAY", "GATEWAYDEV"})
        list.remove(key);
    return edit_or_log(SystemPath(ifcfg_prefix, name).text, list.items());
}

static int set_gateway4(const vlsys_gw4 &gw) {
    const FieldText address(gw.addr);
    log_gateway4(gw, address.text);
    int result = write_gateway("GATEWAY", address.text);
    if (result != 0)
        return result;
    for (const auto &name : InterfaceList()) {
        result = set_route_keys(name, has_default_route(name, gw));
        if (result != 0)
            return result;
    }
    return 0;
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

// The switch says whether an interface takes a default route from router advertisements.
static void set_route_switch(const char *name, bool default_route, const char *key,
                             ItemList *list) {
    if (default_route) {
        vlsys_log(LOG_INFO, "IPv6 GW auto (%s)", name);
        vlsys_log(LOG_DEBUG, "%s 1", key);
        list->set(key, " 1");
    } else {
        vlsys_log(LOG_DEBUG, "%s 0", key);
        list->set(key, " 0");
    }
}

static int write_route_switches(const vlsys_gw6 &gw) {
    const InterfaceList interfaces;
    vlsys_log(LOG_DEBUG, "vlsys_get_ifname_list: %d", interfaces.count());
    const auto count = static_cast<size_t>(interfaces.count());
    if (count == 0)
        return 0;
    const Owned<SwitchKey[]> keys(static_cast<SwitchKey *>(calloc(count, sizeof(SwitchKey))));
    const Owned<edit_item[]> array(static_cast<edit_item *>(calloc(count, sizeof(edit_item))));
    if (!keys || !array)
        return log_errno("calloc(80, %d)", interfaces.count());
    ItemList list({array.get(), count});
    SwitchKey *key = keys.get();
    for (const auto &name : interfaces) {
        *key = switch_key(name, "accept_ra_defrtr");
        set_route_switch(name, has_default_route(name, gw), key->text, &list);
        ++key;
    }
    return edit_or_log(SystemPath(sysctl_path).text, list.items());
}

static int set_gateway6(const vlsys_gw6 &gw) {
    const FieldText address(gw.addr);
    log_gateway6(gw, address.text);
    const int result = write_gateway("IPV6_DEFAULTGW", address.text);
    return result != 0 ? result : write_route_switches(gw);
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

} // namespace vlsys

using namespace vlsys;

int vlsys_set_ipv4_default_gateway2(const vlsys_gw4 *gw) {
    return gw ? -set_gateway4(*gw) : EFAULT;
}

int vlsys_set_ipv6_default_gateway2(const vlsys_gw6 *gw) {
    return gw ? -set_gateway6(*gw) : EFAULT;
}

int vlsys_set_ipv4_default_gateway(const char *text) {
    const auto gw = make_gateway<vlsys_gw4>(text, VLSYS_MODE_DHCP);
    return vlsys_set_ipv4_default_gateway2(&gw);
}

int vlsys_set_ipv6_default_gateway(const char *text) {
    const auto gw = make_gateway<vlsys_gw6>(text, VLSYS_MODE_AUTO);
    return vlsys_set_ipv6_default_gateway2(&gw);
}
