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

namespace {

// What is asked for, and what the checks find in it.
struct Request {
    vlsys_ifconf *nif;
    char *gw4;
    char *gw6;
    vlsys_dns *dns;
    Subnet4 subnet4; // not set without a fixed address
    Subnet6 subnet6;
    int broadcast_result = 0; // that of set_broadcast
};

} // namespace

static bool has_gateway4(const Request &request) {
    return request.nif->ipv4_mode != VLSYS_MODE_OFF && request.gw4[0] != '\0';
}

static bool has_gateway6(const Request &request) {
    return request.nif->ipv6_mode != VLSYS_MODE_OFF && request.gw6[0] != '\0';
}

// Here and in the server checks, a subnet that is not set holds every address.
static int check_gateway4(const Request &request) {
    const int fieldcode = field_code(VLSYS_CHECK_FIELD_IPV4_GATEWAY);
    sockaddr_in sa = {};
    if (const int error = check_ipv4_text(&sa, request.gw4, VLSYS_ADDR4_SIZE, fieldcode))
        return error;
    if (!request.subnet4.contains(host_order(sa)))
        return unreachable("gateway", request.gw4, fieldcode);
    return check_not_reserved(request.subnet4, host_order(sa), "gateway", request.gw4, fieldcode);
}

static int check_gateway6(const Request &request) {
    const int fieldcode = field_code(VLSYS_CHECK_FIELD_IPV6_GATEWAY);
    sockaddr_in6 sa = {};
    if (const int error = check_ipv6_text(&sa, request.gw6, fieldcode))
        return error;
    if (IN6_IS_ADDR_LINKLOCAL(&sa.sin6_addr))
        return 0;
    if (const int fault = check_not_reserved(request.subnet6, host_order(sa), "IPv6 gateway",
                                             request.gw6, fieldcode))
        return fault;
    if (!request.subnet6.contains(host_order(sa)))
        return unreachable("IPv6 gateway", request.gw6, fieldcode);
    return 0;
}

static int check_ipv4(Request *request) {
    if (request->nif->ipv4_mode == VLSYS_MODE_MANUAL) {
        if (const int fault =
                check_static_ipv4(Validator::single, request->nif, 0, &request->subnet4))
            return fault;
        request->broadcast_result = set_broadcast(request->nif, request->subnet4);
    }
    return has_gateway4(*request) ? check_gateway4(*request) : 0;
}

static int check_ipv6(Request *request) {
    if (request->nif->ipv6_mode == VLSYS_MODE_MANUAL)
        if (const int fault = check_static_ipv6(request->nif, 0, &request->subnet6))
            return fault;
    return has_gateway6(*request) ? check_gateway6(*request) : 0;
}

static int check_dns_server_ipv4(const DnsServer &server, const Request &request) {
    sockaddr_in sa = {};
    if (const int error = check_ipv4_text(&sa, server.text, sizeof server.text, server.fieldcode))
        return error;
    const uint32_t address = host_order(sa);
    if (request.subnet4.has_no_host_bits(address))
        return same_as_network(server.label, server.text, server.fieldcode);
    if (request.subnet4.is_broadcast(address))
        return same_as_broadcast(server.label, server.text, server.fieldcode);
    if (request.nif->ipv4_mode == VLSYS_MODE_OFF) {
        vlsys_log(LOG_ERR, "Although IPv4 is OFF, %s is IPv4 address: %s", server.label,
                  server.text);
        return server.fieldcode | VLSYS_CHECK_KIND_UNREACHABLE;
    }
    if (request.gw4[0] != '\0' || request.subnet4.contains(address))
        return 0;
    return unreachable(server.label, server.text, server.fieldcode);
}

static int check_dns_server_ipv6(const DnsServer &server, const Request &request) {
    sockaddr_in6 sa = {};
    if (const int error = check_ipv6_text(&sa, server.text, server.fieldcode))
        return error;
    const Address6 address = host_order(sa);
    if (request.subnet6.is_network(address))
        return same_as_network(server.label, server.text, server.fieldcode);
    if (request.nif->ipv6_mode == VLSYS_MODE_OFF) {
        vlsys_log(LOG_ERR, "Although IPv6 is OFF, %s is IPv6 address: %s", server.label,
                  server.text);
        return server.fieldcode | VLSYS_CHECK_KIND_UNREACHABLE;
    }
    if (request.gw6[0] != '\0' || request.subnet6.contains(address))
        return 0;
    return unreachable(server.label, server.text, server.fieldcode);
}

static int check_server(const Request &request, int index) {
    const DnsServer server(request.dns, index);
    return server.is_ipv6() ? check_dns_server_ipv6(server, request)
                            : check_dns_server_ipv4(server, request);
}

static int check_static_dns(const Request &request) {
    vlsys_dns *const dns = request.dns;
    if (const int fault = check_domain(*dns))
        return fault;
    if (dns->server[0][0] == '\0')
        return field_code(VLSYS_CHECK_FIELD_DNS_PRIMARY) | VLSYS_CHECK_KIND_INVALID;
    if (const int fault = check_server(request, 0))
        return fault;
    if (strncmp(dns->server[1], dns->server[0], VLSYS_ADDR6_SIZE) == 0)
        dns->server[1][0] = '\0';
    return dns->server[1][0] == '\0' ? 0 : check_server(request, 1);
}

static void turn_dns_off(vlsys_dns *dns, const char *reason) {
    vlsys_log(LOG_WARNING, "%s", reason);
    dns->mode = VLSYS_MODE_OFF;
}

static void settle_dns_mode(const vlsys_ifconf &nif, vlsys_dns *dns) {
    if (nif.ipv4_mode == VLSYS_MODE_OFF && nif.ipv6_mode == VLSYS_MODE_OFF)
        turn_dns_off(dns, "Since both setup of IPv4 and IPv6 was OFF, DNS also turns OFF a setup.");
    else if (nif.ipv4_mode != VLSYS_MODE_DHCP && nif.ipv6_mode != VLSYS_MODE_DHCP &&
             dns->mode == VLSYS_MODE_DHCP)
        turn_dns_off(dns, "A setup of DNS was set to DHCP although neither of IPv4 and IPv6 of the "
                          "setup was DHCP. DNS setting is fallback to OFF.");
}

static int check_dns(const Request &request) {
    settle_dns_mode(*request.nif, request.dns);
    return request.dns->mode == VLSYS_MODE_MANUAL ? check_static_dns(request) : 0;
}

// A setting without a fault has the result of its last address conversion. A failure of any
// conversion is a fault and ends the checks, but not that of the broadcast address: its result
// stands unless another conversion came after it.
static int result_without_fault(const Request &request) {
    const bool converted_later = has_gateway4(request) ||
                                 request.nif->ipv6_mode == VLSYS_MODE_MANUAL ||
                                 has_gateway6(request) || request.dns->mode == VLSYS_MODE_MANUAL;
    return converted_later ? 0 : request.broadcast_result;
}

static int check_name(const vlsys_ifconf &nif) {
    const int missing = find_interface(FieldText(nif.name).text);
    if (missing == -ENXIO)
        return field_code(VLSYS_CHECK_FIELD_IFNAME) | VLSYS_CHECK_KIND_NO_IFACE;
    return -missing;
}

static int check_request(Request *request, char *hostname) {
    if (const int fault = check_name(*request->nif))
        return fault;
    if (const int fault = check_ipv4(request))
        return fault;
    if (const int fault = check_ipv6(request))
        return fault;
    if (const int fault = check_dns(*request))
        return fault;
    vlsys_strlcpy(request->dns->iface, request->nif->name, sizeof request->dns->iface);
    return check_hostname(hostname);
}

} // namespace vlsys

using namespace vlsys;

int vlsys_address_check(vlsys_ifconf *nif, char *gw4, char *gw6, vlsys_dns *dns, char *hostname) {
    if (!nif || !gw4 || !gw6 || !dns || !hostname)
        return EFAULT;
    vlsys_log(LOG_INFO, "%s: start (%s, %s, %s)", "vlsys_address_check", mode_name(nif->ipv4_mode),
              mode_name(dns->mode), mode_name(nif->ipv6_mode));
    Request request = {};
    request.nif = nif;
    request.gw4 = gw4;
    request.gw6 = gw6;
    request.dns = dns;
    if (const int fault = check_request(&request, hostname))
        return fault;
    vlsys_log(LOG_INFO, "%s: OK (%s, %s, %s)", "vlsys_address_check", mode_name(nif->ipv4_mode),
              mode_name(dns->mode), mode_name(nif->ipv6_mode));
    return result_without_fault(request);
}
