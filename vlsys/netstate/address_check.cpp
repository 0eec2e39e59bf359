// The validator of a setting for one interface: here a gateway must lie in the interface's own
// subnet, a server there or behind a gateway, and a DNS mode that cannot work is turned off.
#include "core/log.h"
#include "core/text.h"
#include "netconf/interfaces.h"
#include "netstate/address.h"
#include "netstate/mode_text.h"
#include "netstate/rules.h"

#include <cerrno>

namespace vlsys {

// `conversion`, here and below, is the result of the last address conversion; it is non-zero
// without being a fault only when the broadcast address has no text.
static int check_ipv4(vlsys_ifconf &nif, char *gw4, Subnet4 &subnet, int &conversion) {
    const bool is_static = nif.ipv4_mode == VLSYS_MODE_MANUAL;
    if (is_static) {
        const int fault = check_static_ipv4(Validator::single, nif, 0, subnet, conversion);
        if (fault != 0)
            return fault;
    }
    if (nif.ipv4_mode == VLSYS_MODE_OFF || gw4[0] == '\0')
        return 0;

    const int fieldcode = field_code(VLSYS_CHECK_FIELD_IPV4_GATEWAY);
    sockaddr_in sa = {};
    conversion = check_ipv4_text(&sa, gw4, VLSYS_ADDR4_SIZE, fieldcode);
    if (conversion != 0 || !is_static)
        return conversion;
    if (!subnet.contains(host_order(sa)))
        return unreachable("gateway", gw4, fieldcode);
    return check_not_reserved(subnet, host_order(sa), "gateway", gw4, fieldcode);
}

static int check_ipv6(vlsys_ifconf &nif, char *gw6, Subnet6 &subnet, int &conversion) {
    const bool is_static = nif.ipv6_mode == VLSYS_MODE_MANUAL;
    if (is_static) {
        conversion = 0;
        if (const int fault = check_static_ipv6(nif, 0, subnet))
            return fault;
    }
    if (nif.ipv6_mode == VLSYS_MODE_OFF || gw6[0] == '\0')
        return 0;

    const int fieldcode = field_code(VLSYS_CHECK_FIELD_IPV6_GATEWAY);
    sockaddr_in6 sa = {};
    conversion = check_ipv6_text(&sa, gw6, fieldcode);
    if (conversion != 0 || !is_static || IN6_IS_ADDR_LINKLOCAL(&sa.sin6_addr))
        return conversion;
    if (const int fault =
            check_not_reserved(subnet, host_order(sa), "IPv6 gateway", gw6, fieldcode))
        return fault;
    return subnet.contains(host_order(sa)) ? 0 : unreachable("IPv6 gateway", gw6, fieldcode);
}

// The two server checks: a subnet that is not set holds every server.
static int check_dns_server_ipv4(const DnsServer &server, const vlsys_ifconf &nif, const char *gw4,
                                 const Subnet4 &subnet) {
    sockaddr_in sa = {};
    if (const int error = check_ipv4_text(&sa, server.text, VLSYS_ADDR6_SIZE, server.fieldcode))
        return error;
    const uint32_t address = host_order(sa);
    if (subnet.has_no_host_bits(address))
        return same_as_network(server.label, server.text, server.fieldcode);
    if (subnet.is_broadcast(address))
        return same_as_broadcast(server.label, server.text, server.fieldcode);
    if (nif.ipv4_mode == VLSYS_MODE_OFF) {
        vlsys_log(LOG_ERR, "Although IPv4 is OFF, %s is IPv4 address: %s", server.label,
                  server.text);
        return server.fieldcode | VLSYS_CHECK_KIND_UNREACHABLE;
    }
    if (gw4[0] != '\0' || subnet.contains(address))
        return 0;
    return unreachable(server.label, server.text, server.fieldcode);
}

static int check_dns_server_ipv6(const DnsServer &server, const vlsys_ifconf &nif, const char *gw6,
                                 const Subnet6 &subnet) {
    sockaddr_in6 sa = {};
    if (const int error = check_ipv6_text(&sa, server.text, server.fieldcode))
        return error;
    const Address6 address = host_order(sa);
    if (subnet.is_network(address))
        return same_as_network(server.label, server.text, server.fieldcode);
    if (nif.ipv6_mode == VLSYS_MODE_OFF) {
        vlsys_log(LOG_ERR, "Although IPv6 is OFF, %s is IPv6 address: %s", server.label,
                  server.text);
        return server.fieldcode | VLSYS_CHECK_KIND_UNREACHABLE;
    }
    if (gw6[0] != '\0' || subnet.contains(address))
        return 0;
    return unreachable(server.label, server.text, server.fieldcode);
}

static void turn_dns_off(vlsys_dns &dns, const char *reason) {
    vlsys_log(LOG_WARNING, "%s", reason);
    dns.mode = VLSYS_MODE_OFF;
}

static void settle_dns_mode(const vlsys_ifconf &nif, vlsys_dns &dns) {
    if (nif.ipv4_mode == VLSYS_MODE_OFF && nif.ipv6_mode == VLSYS_MODE_OFF)
        turn_dns_off(dns, "Since both setup of IPv4 and IPv6 was OFF, DNS also turns OFF a setup.");
    else if (nif.ipv4_mode != VLSYS_MODE_DHCP && nif.ipv6_mode != VLSYS_MODE_DHCP &&
             dns.mode == VLSYS_MODE_DHCP)
        turn_dns_off(dns, "A setup of DNS was set to DHCP although neither of IPv4 and IPv6 of the "
                          "setup was DHCP. DNS setting is fallback to OFF.");
}

// What the DNS rules need to know of the interface.
struct Reach {
    const vlsys_ifconf &nif;
    const char *gw4;
    const char *gw6;
    Subnet4 subnet4;
    Subnet6 subnet6;
};

static int check_server(const Reach &reach, vlsys_dns &dns, int index) {
    const DnsServer server(dns, index);
    return server.is_ipv6() ? check_dns_server_ipv6(server, reach.nif, reach.gw6, reach.subnet6)
                            : check_dns_server_ipv4(server, reach.nif, reach.gw4, reach.subnet4);
}

static int check_static_dns(const Reach &reach, vlsys_dns &dns) {
    if (const int fault = check_domain(dns))
        return fault;
    if (dns.server[0][0] == '\0')
        return field_code(VLSYS_CHECK_FIELD_DNS_PRIMARY) | VLSYS_CHECK_KIND_INVALID;
    if (const int fault = check_server(reach, dns, 0))
        return fault;
    if (strncmp(dns.server[1], dns.server[0], VLSYS_ADDR6_SIZE) == 0)
        dns.server[1][0] = '\0';
    return dns.server[1][0] == '\0' ? 0 : check_server(reach, dns, 1);
}
} // namespace vlsys

using namespace vlsys;

int vlsys_address_check(vlsys_ifconf *nif, char *gw4, char *gw6, vlsys_dns *dns, char *hostname) {
    if (!nif || !gw4 || !gw6 || !dns || !hostname)
        return EFAULT;
    vlsys_log(LOG_INFO, "%s: start (%s, %s, %s)", "vlsys_address_check", mode_name(nif->ipv4_mode),
              mode_name(dns->mode), mode_name(nif->ipv6_mode));
    const int missing = find_interface(FieldText(nif->name).text);
    if (missing == -ENXIO)
        return field_code(VLSYS_CHECK_FIELD_IFNAME) | VLSYS_CHECK_KIND_NO_IFACE;
    if (missing != 0)
        return -missing;

    Reach reach = {*nif, gw4, gw6, {}, {}};
    int conversion = 0;
    if (const int fault = check_ipv4(*nif, gw4, reach.subnet4, conversion))
        return fault;
    if (const int fault = check_ipv6(*nif, gw6, reach.subnet6, conversion))
        return fault;
    settle_dns_mode(*nif, *dns);
    if (dns->mode == VLSYS_MODE_MANUAL) {
        if (const int fault = check_static_dns(reach, *dns))
            return fault;
        conversion = 0;
    }
    vlsys_strlcpy(dns->iface, nif->name, sizeof(dns->iface));
    if (const int fault = check_hostname(hostname))
        return fault;

    vlsys_log(LOG_INFO, "%s: OK (%s, %s, %s)", "vlsys_address_check", mode_name(nif->ipv4_mode),
              mode_name(dns->mode), mode_name(nif->ipv6_mode));
    return conversion;
}
