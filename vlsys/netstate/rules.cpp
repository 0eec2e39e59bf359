#include "netstate/rules.h"

#include "core/log.h"
#include "core/text.h"
#include "netconf/hostname.h"
#include "netstate/address.h"

#include <bit>

namespace vlsys {

// Prefix lengths that an IPv4 netmask may be given as.
static constexpr int shortest_prefix = 8;
static constexpr int longest_prefix = 30;

static constexpr size_t longest_hostname = 64;

static void log_same_as(const char *label, const char *what, const char *text) {
    vlsys_log(LOG_ERR, "%s address is the same as %s address: %s", label, what, text);
}

int same_as_network(const char *label, const char *text, int fieldcode) {
    log_same_as(label, "network", text);
    return fieldcode | VLSYS_CHECK_KIND_NETWORK;
}

int same_as_broadcast(const char *label, const char *text, int fieldcode) {
    log_same_as(label, "broadcast", text);
    return fieldcode | VLSYS_CHECK_KIND_BROADCAST;
}

int unreachable(const char *label, const char *text, int fieldcode) {
    vlsys_log(LOG_ERR, "%s address is unreachable: %s", label, text);
    return fieldcode | VLSYS_CHECK_KIND_UNREACHABLE;
}

int check_not_reserved(const Subnet4 &subnet, uint32_t address, const char *label, const char *text,
                       int fieldcode) {
    if (subnet.is_network(address))
        return same_as_network(label, text, fieldcode);
    if (subnet.is_broadcast(address))
        return same_as_broadcast(label, text, fieldcode);
    return 0;
}

int check_not_reserved(const Subnet6 &subnet, const Address6 &address, const char *label,
                       const char *text, int fieldcode) {
    return subnet.is_network(address) ? same_as_network(label, text, fieldcode) : 0;
}

static bool is_prefix(int length) {
    return length >= shortest_prefix && length <= longest_prefix;
}

// A prefix length becomes a mask, in the hexadecimal form that the address conversion then makes
// dotted.
static void set_netmask(vlsys_ifconf *nif, int length) {
    if (!is_prefix(length))
        return;
    const uint32_t mask = UINT32_MAX << (32 - length);
    vlsys_log(LOG_DEBUG, "netmask: %d -> 0x%08x", length, mask);
    snprintf(nif->netmask, sizeof nif->netmask, "0x%08x", mask);
}

static int check_netmask(Validator validator, vlsys_ifconf *nif, int position, uint32_t *mask) {
    if (validator == Validator::multi)
        set_netmask(nif, nif->prefix);
    set_netmask(nif, parse_uint(FieldText(nif->netmask).text, 10));

    const int fieldcode = field_code(VLSYS_CHECK_FIELD_IPV4_NETMASK, position);
    sockaddr_in sa = {};
    if (const int error = check_netmask_text(&sa, nif->netmask, sizeof nif->netmask, fieldcode))
        return error;
    *mask = host_order(sa);

    const int length = std::countl_one(*mask);
    if (validator == Validator::multi) {
        if (!is_prefix(length))
            return fieldcode | VLSYS_CHECK_KIND_INVALID;
        nif->prefix = static_cast<uint8_t>(length);
    }
    if (length + std::countr_zero(*mask) < 32) {
        vlsys_log(LOG_ERR, "wrang bit pattern: %s(%08x)", nif->netmask, *mask);
        return fieldcode | VLSYS_CHECK_KIND_NETMASK;
    }
    return 0;
}

int check_static_ipv4(Validator validator, vlsys_ifconf *nif, int position, Subnet4 *subnet) {
    const int fieldcode = field_code(VLSYS_CHECK_FIELD_IPV4_ADDR, position);
    sockaddr_in sa = {};
    if (const int error = check_ipv4_text(&sa, nif->addr, sizeof nif->addr, fieldcode))
        return error;
    uint32_t mask = 0;
    if (const int error = check_netmask(validator, nif, position, &mask))
        return error;
    *subnet = Subnet4(host_order(sa), mask);
    return check_not_reserved(*subnet, subnet->address, "IP", nif->addr, fieldcode);
}

int set_broadcast(vlsys_ifconf *nif, const Subnet4 &subnet) {
    sockaddr_in sa = {};
    sa.sin_family = AF_INET;
    sa.sin_addr.s_addr = htonl(subnet.broadcast);
    return addr_to_text(reinterpret_cast<const sockaddr *>(&sa), sizeof sa, nif->broadaddr,
                        sizeof nif->broadaddr, "broadaddr");
}

int check_static_ipv6(vlsys_ifconf *nif, int position, Subnet6 *subnet) {
    vlsys_addr6 *const own = &nif->addr6[0];
    const int fieldcode = field_code(VLSYS_CHECK_FIELD_IPV6_ADDR, position);
    sockaddr_in6 sa = {};
    if (const int error = check_ipv6_text(&sa, own->addr, fieldcode))
        return error;
    if (own->prefix > 128)
        return field_code(VLSYS_CHECK_FIELD_IPV6_PREFIX, position) | VLSYS_CHECK_KIND_PREFIX;
    *subnet = Subnet6(host_order(sa), own->prefix);
    return check_not_reserved(*subnet, subnet->address, "IPv6", own->addr, fieldcode);
}

DnsServer::DnsServer(vlsys_dns *dns, int index)
    : text(dns->server[index]), field(VLSYS_CHECK_FIELD_DNS_PRIMARY + index),
      fieldcode(field_code(field)) {
    snprintf(label, sizeof label, "DNS server[%d]", index);
}

bool DnsServer::is_ipv6() const {
    return is_ipv6_text(text);
}

int check_domain(const vlsys_dns &dns) {
    if (check_hostname_format(FieldText(dns.domain).text) != 0)
        return field_code(VLSYS_CHECK_FIELD_DNS_DOMAIN) | VLSYS_CHECK_KIND_SYNTAX;
    return 0;
}

int check_hostname(char *hostname) {
    if (hostname[0] == '\0') {
        vlsys_log(LOG_WARNING, "%s", "Since hostname is empty, set \"localhost\"");
        vlsys_strlcpy(hostname, "localhost", 63);
    }
    if (check_hostname_format(hostname) != 0 || strlen(hostname) > longest_hostname)
        return field_code(VLSYS_CHECK_FIELD_HOSTNAME) | VLSYS_CHECK_KIND_SYNTAX;
    return 0;
}

} // namespace vlsys
