// The validator of a setting for several interfaces: here their subnets must not overlap, a gateway
// or server must lie in the subnet of any of them or be within reach of one that learns its routes,
// and a mode that no interface can serve is a fault.
#include "core/log.h"
#include "core/owners.h"
#include "core/text.h"
#include "netconf/interfaces.h"
#include "netstate/address.h"
#include "netstate/mode_text.h"
#include "netstate/rules.h"

#include <cerrno>
#include <span>

namespace vlsys {

static_assert(sizeof(Subnet4) == 16 && sizeof(Subnet6) == 48); // as their messages have it

namespace {

// All interfaces, and what the rules that follow theirs need to know of them.
struct Network {
    std::span<vlsys_ifconf> nifs;
    std::span<Subnet4> subnets4; // by position; not set without a fixed address
    std::span<Subnet6> subnets6;
    int ipv4_on = 0;
    int ipv4_dhcp = 0;
    int ipv6_on = 0;
    int ipv6_dhcp = 0;
    int ipv6_auto = 0;
    bool gw4_accepted = false;
    bool gw6_accepted = false;
};

// Where an address lies among the fixed subnets.
struct Place {
    int position; // of the last subnet that contains it, or -1
    int fault;    // code when it is the network or broadcast address of that one, or 0
};

// Two interfaces by position: the second one's address lies in the first one's subnet.
struct Overlap {
    bool found;
    size_t first;
    size_t second;
};

} // namespace

static int check_name(const vlsys_ifconf &nif, int position) {
    const FieldText name(nif.name);
    // The second port may be set before it is there, so it is not looked up.
    if (strcmp(name.text, "eth1") == 0)
        return 0;
    const int missing = strcmp(name.text, "lo") == 0 ? -ENXIO : find_interface(name.text);
    if (missing != -ENXIO)
        return -missing;
    vlsys_log(LOG_DEBUG, "nif->name: %s", name.text);
    return field_code(VLSYS_CHECK_FIELD_IFNAME, position) | VLSYS_CHECK_KIND_NO_IFACE;
}

static int check_interfaces_ipv4(Network *network) {
    for (size_t i = 0; i < network->nifs.size(); i++) {
        vlsys_ifconf *const nif = &network->nifs[i];
        const int position = static_cast<int>(i);
        if (const int fault = check_name(*nif, position))
            return fault;
        network->ipv4_on += nif->ipv4_mode != VLSYS_MODE_OFF;
        network->ipv4_dhcp += nif->ipv4_mode == VLSYS_MODE_DHCP;
        if (nif->ipv4_mode != VLSYS_MODE_MANUAL)
            continue;
        Subnet4 *const subnet = &network->subnets4[i];
        if (const int fault = check_static_ipv4(Validator::multi, nif, position, subnet))
            return fault;
        set_broadcast(nif, *subnet);
    }
    return 0;
}

static int check_interfaces_ipv6(Network *network) {
    for (size_t i = 0; i < network->nifs.size(); i++) {
        vlsys_ifconf *const nif = &network->nifs[i];
        network->ipv6_on += nif->ipv6_mode != VLSYS_MODE_OFF;
        network->ipv6_dhcp += nif->ipv6_mode == VLSYS_MODE_DHCP;
        network->ipv6_auto += nif->ipv6_mode == VLSYS_MODE_AUTO;
        if (nif->ipv6_mode != VLSYS_MODE_MANUAL)
            continue;
        if (const int fault = check_static_ipv6(nif, static_cast<int>(i), &network->subnets6[i]))
            return fault;
    }
    return 0;
}

// The first pair, in list order.
template <class Subnet>
static Overlap find_overlap(std::span<const Subnet> subnets) {
    for (size_t i = 0; i < subnets.size(); i++) {
        if (!subnets[i].is_set())
            continue;
        for (size_t j = 0; j < subnets.size(); j++)
            if (subnets[i].contains(subnets[j].address) && j != i && subnets[j].is_set())
                return {.found = true, .first = i, .second = j};
    }
    return {};
}

static int check_overlap4(const Network &network) {
    const Overlap overlap = find_overlap<Subnet4>(network.subnets4);
    if (!overlap.found)
        return 0;
    const vlsys_ifconf &a = network.nifs[overlap.first];
    const vlsys_ifconf &b = network.nifs[overlap.second];
    const Subnet4 &subnet = network.subnets4[overlap.first];
    const uint32_t address = network.subnets4[overlap.second].address;
    if (address == subnet.address) {
        vlsys_log(LOG_ERR, "%s and %s is same address: %s", a.name, b.name, a.addr);
    } else {
        vlsys_log(LOG_DEBUG, "(%08x & %08x) == %08x", address, subnet.mask, address & subnet.mask);
        vlsys_log(LOG_ERR, "%s/%d and %s/%d have overlapped", b.addr, b.prefix, a.addr, a.prefix);
    }
    return field_code(VLSYS_CHECK_FIELD_IPV4_ADDR) | VLSYS_CHECK_KIND_OVERLAP;
}

static int check_overlap6(const Network &network) {
    if (!find_overlap<Subnet6>(network.subnets6).found)
        return 0;
    return field_code(VLSYS_CHECK_FIELD_IPV6_ADDR) | VLSYS_CHECK_KIND_OVERLAP;
}

// Looks for the subnets that contain the address of a field; ends at a fault.
template <class Subnet, class Address>
static Place find_place(std::span<const Subnet> subnets, const Address &address, int field,
                        const char *label, const char *text) {
    Place place = {.position = -1, .fault = 0};
    for (size_t i = 0; i < subnets.size() && place.fault == 0; i++) {
        if (!subnets[i].is_set() || !subnets[i].contains(address))
            continue;
        place.position = static_cast<int>(i);
        place.fault =
            check_not_reserved(subnets[i], address, label, text, field_code(field, place.position));
    }
    return place;
}

static int check_static_gateway4(Network *network, vlsys_gw4 *gw) {
    const int fieldcode = field_code(VLSYS_CHECK_FIELD_IPV4_GATEWAY);
    if (network->ipv4_on == 0)
        return fieldcode | VLSYS_CHECK_KIND_MODE;
    sockaddr_in sa = {};
    if (const int error = check_ipv4_text(&sa, gw->addr, sizeof gw->addr, fieldcode))
        return error;

    const Place place = find_place<Subnet4>(network->subnets4, host_order(sa),
                                            VLSYS_CHECK_FIELD_IPV4_GATEWAY, "gateway", gw->addr);
    if (place.position >= 0)
        vlsys_strlcpy(gw->iface, network->nifs[static_cast<size_t>(place.position)].name,
                      sizeof gw->iface);
    if (place.fault != 0)
        return place.fault;
    network->gw4_accepted = place.position >= 0 || network->ipv4_dhcp > 0;
    return network->gw4_accepted ? 0 : unreachable("gateway", gw->addr, fieldcode);
}

static int check_static_gateway6(Network *network, vlsys_gw6 *gw) {
    const int fieldcode = field_code(VLSYS_CHECK_FIELD_IPV6_GATEWAY);
    if (network->ipv6_on == 0)
        return fieldcode | VLSYS_CHECK_KIND_MODE;
    sockaddr_in6 sa = {};
    if (const int error = check_ipv6_text(&sa, gw->addr, fieldcode))
        return error;

    network->gw6_accepted = IN6_IS_ADDR_LINKLOCAL(&sa.sin6_addr);
    if (network->gw6_accepted)
        return 0;
    const Place place =
        find_place<Subnet6>(network->subnets6, host_order(sa), VLSYS_CHECK_FIELD_IPV6_GATEWAY,
                            "IPv6 gateway", gw->addr);
    if (place.fault != 0)
        return place.fault;
    network->gw6_accepted = place.position >= 0 || network->ipv6_dhcp > 0 || network->ipv6_auto > 0;
    return network->gw6_accepted ? 0 : unreachable("IPv6 gateway", gw->addr, fieldcode);
}

// A gateway that is learnt must name an interface that can learn it, or one that is not listed.
static int check_learnt_gateway(const Network &network, uint32_t vlsys_ifconf::*mode,
                                const char *iface, int fieldcode) {
    if (iface[0] == '\0')
        return fieldcode | VLSYS_CHECK_KIND_INVALID;
    for (const vlsys_ifconf &nif : network.nifs)
        if (strncmp(nif.name, iface, sizeof nif.name) == 0 && nif.*mode <= VLSYS_MODE_MANUAL)
            return fieldcode | VLSYS_CHECK_KIND_MODE;
    return 0;
}

static int check_gateway4(Network *network, vlsys_gw4 *gw) {
    if (gw->mode == VLSYS_MODE_MANUAL && gw->addr[0] != '\0')
        return check_static_gateway4(network, gw);
    if (gw->mode == VLSYS_MODE_DHCP)
        return check_learnt_gateway(*network, &vlsys_ifconf::ipv4_mode, gw->iface,
                                    field_code(VLSYS_CHECK_FIELD_IPV4_GATEWAY));
    *gw = {};
    return 0;
}

static int check_gateway6(Network *network, vlsys_gw6 *gw) {
    if (gw->mode == VLSYS_MODE_MANUAL && gw->addr[0] != '\0')
        return check_static_gateway6(network, gw);
    if (gw->mode == VLSYS_MODE_DHCP || gw->mode == VLSYS_MODE_AUTO)
        return check_learnt_gateway(*network, &vlsys_ifconf::ipv6_mode, gw->iface,
                                    field_code(VLSYS_CHECK_FIELD_IPV6_GATEWAY));
    *gw = {};
    return 0;
}

static int unreachable_server(const DnsServer &server) {
    return unreachable(server.label, FieldText(server.text).text, server.fieldcode);
}

static int check_server4(const Network &network, const DnsServer &server) {
    if (network.ipv4_on == 0)
        return unreachable_server(server);
    sockaddr_in sa = {};
    if (const int error = check_ipv4_text(&sa, server.text, sizeof server.text, server.fieldcode))
        return error;
    const Place place = find_place<Subnet4>(network.subnets4, host_order(sa), server.field,
                                            server.label, server.text);
    if (place.fault != 0)
        return place.fault;
    const bool accepted = place.position >= 0 || network.ipv4_dhcp > 0 || network.gw4_accepted;
    return accepted ? 0 : unreachable_server(server);
}

static int check_server6(const Network &network, const DnsServer &server) {
    if (network.ipv6_on == 0)
        return unreachable_server(server);
    sockaddr_in6 sa = {};
    if (const int error = check_ipv6_text(&sa, server.text, server.fieldcode))
        return error;
    const Place place = find_place<Subnet6>(network.subnets6, host_order(sa), server.field,
                                            server.label, server.text);
    if (place.fault != 0)
        return place.fault;
    const bool accepted = place.position >= 0 || network.ipv6_dhcp > 0 || network.ipv6_auto > 0 ||
                          network.gw6_accepted;
    return accepted ? 0 : unreachable_server(server);
}

static bool is_repeated_later(const vlsys_dns &dns, int index) {
    for (int later = index + 1; later < VLSYS_DNS_COUNT; later++)
        if (strncmp(dns.server[index], dns.server[later], VLSYS_ADDR6_SIZE) == 0)
            return true;
    return false;
}

static int check_static_dns(const Network &network, vlsys_dns *dns) {
    vlsys_log(LOG_DEBUG, "domain: %s", FieldText(dns->domain).text);
    for (int k = 0; k < 2; k++)
        vlsys_log(LOG_DEBUG, "server[%d]: %s", k, FieldText(dns->server[k]).text);
    if (const int fault = check_domain(*dns))
        return fault;

    bool given = false;
    for (int k = 0; k < VLSYS_DNS_COUNT; k++) {
        const DnsServer server(dns, k);
        if (server.text[0] == '\0')
            continue;
        given = true;
        if (is_repeated_later(*dns, k)) {
            server.text[0] = '\0';
            continue;
        }
        const int fault =
            server.is_ipv6() ? check_server6(network, server) : check_server4(network, server);
        if (fault != 0)
            return fault;
    }
    return given ? 0 : field_code(VLSYS_CHECK_FIELD_DNS_PRIMARY) | VLSYS_CHECK_KIND_INVALID;
}

static int refuse_dns_mode(const char *reason) {
    vlsys_log(LOG_ERR, "%s", reason);
    return field_code(VLSYS_CHECK_FIELD_DNS_DOMAIN) | VLSYS_CHECK_KIND_MODE;
}

static int check_dns_mode(const Network &network, uint32_t mode) {
    if (mode != VLSYS_MODE_OFF && network.ipv4_on == 0 && network.ipv6_on == 0)
        return refuse_dns_mode("DNS is enable although all the network interfaces are OFF.");
    if (mode == VLSYS_MODE_DHCP && network.ipv4_dhcp == 0 && network.ipv6_dhcp == 0)
        return refuse_dns_mode(
            "A setup of DNS is DHCP although no setup of a network interface is DHCP.");
    return 0;
}

// The first interface that is on carries a fixed setting, the first one with DHCP a learnt one.
static void set_dns_iface(const Network &network, vlsys_dns *dns) {
    for (const vlsys_ifconf &nif : network.nifs) {
        const bool carries =
            dns->mode == VLSYS_MODE_DHCP
                ? nif.ipv4_mode == VLSYS_MODE_DHCP || nif.ipv6_mode == VLSYS_MODE_DHCP
                : nif.ipv4_mode != VLSYS_MODE_OFF || nif.ipv6_mode != VLSYS_MODE_OFF;
        if (carries) {
            vlsys_strlcpy(dns->iface, nif.name, sizeof dns->iface);
            return;
        }
    }
}

static int check_dns(const Network &network, vlsys_dns *dns) {
    if (const int fault = check_dns_mode(network, dns->mode))
        return fault;
    vlsys_log(LOG_DEBUG, "dns->mode: %d", static_cast<int>(dns->mode));
    if (dns->mode == VLSYS_MODE_MANUAL)
        if (const int fault = check_static_dns(network, dns))
            return fault;
    if (dns->mode == VLSYS_MODE_MANUAL || dns->mode == VLSYS_MODE_DHCP)
        set_dns_iface(network, dns);
    vlsys_log(LOG_DEBUG, "dns->iface: %s", FieldText(dns->iface).text);
    return 0;
}

static int check_network(Network *network, vlsys_gw4 *gw4, vlsys_gw6 *gw6, vlsys_dns *dns,
                         char *hostname) {
    if (const int fault = check_interfaces_ipv4(network))
        return fault;
    if (const int fault = check_overlap4(*network))
        return fault;
    if (const int fault = check_gateway4(network, gw4))
        return fault;
    if (const int fault = check_interfaces_ipv6(network))
        return fault;
    if (const int fault = check_overlap6(*network))
        return fault;
    if (const int fault = check_gateway6(network, gw6))
        return fault;
    if (const int fault = check_dns(*network, dns))
        return fault;
    return check_hostname(hostname);
}

template <class Subnet>
static Owned<Subnet[]> allocate(const char *name, int count) {
    void *const table = calloc(static_cast<size_t>(count), sizeof(Subnet));
    if (!table)
        log_errno("%s = calloc(%d, %d", name, static_cast<int>(sizeof(Subnet)), count);
    return Owned<Subnet[]>(static_cast<Subnet *>(table));
}

} // namespace vlsys

using namespace vlsys;

int vlsys_address_check2(vlsys_ifconf *nifs, int count, vlsys_gw4 *gw4, vlsys_gw6 *gw6,
                         vlsys_dns *dns, char *hostname) {
    if (!nifs || count < 1 || !gw4 || !gw6 || !dns || !hostname)
        return EFAULT;
    const auto size = static_cast<size_t>(count);
    vlsys_log(LOG_INFO, "%s: mode: %s", "start checking",
              summarize_modes({nifs, size}, *gw4, *gw6, *dns).text);
    const auto subnets4 = allocate<Subnet4>("v4", count);
    if (!subnets4)
        return errno;
    const auto subnets6 = allocate<Subnet6>("v6", count);
    if (!subnets6)
        return errno;

    Network network = {
        .nifs = {nifs, size},
        .subnets4 = {subnets4.get(), size},
        .subnets6 = {subnets6.get(), size},
    };
    const int result = check_network(&network, gw4, gw6, dns, hostname);
    if (result == 0)
        vlsys_log(LOG_INFO, "%s: OK", "vlsys_address_check2");
    else
        vlsys_log(LOG_INFO, "%s: NG (%#x)", "vlsys_address_check2", static_cast<unsigned>(result));
    return result;
}
