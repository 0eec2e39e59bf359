// A whole network setting, from the check to the last file.
#include "core/log.h"
#include "core/text.h"
#include "netconf/interfaces.h"
#include "netstate/subnet.h"

#include <arpa/inet.h>
#include <cerrno>
#include <cstring>
#include <netdb.h>
#include <span>

namespace vlsys {

namespace {

struct NetworkSetting {
    std::span<vlsys_ifconf> nifs;
    vlsys_gw4 &gw4;
    vlsys_gw6 &gw6;
    vlsys_dns &dns;
    const char *hostname;
};

} // namespace

// ---- What the check lets pass and no setter can serve

static bool is_given_before(std::span<const vlsys_ifconf> nifs, const vlsys_ifconf &nif) {
    for (const vlsys_ifconf &other : nifs.first(static_cast<size_t>(&nif - nifs.data())))
        if (strncmp(other.name, nif.name, sizeof nif.name) == 0)
            return true;
    return false;
}

// Of one that is given twice only the later setting would stay, and no DNS setting is written for a
// virtual bridge.
static bool has_usable_names(const NetworkSetting &setting) {
    for (const vlsys_ifconf &nif : setting.nifs) {
        const FieldText name(nif.name);
        if (is_virtual_bridge(name.text) || is_given_before(setting.nifs, nif)) {
            vlsys_log(LOG_ERR, "%s: %s: a virtual bridge, or given twice", "vlsys_set_network",
                      name.text);
            return false;
        }
    }
    return true;
}

static bool has_mode(const char *field, uint32_t mode, uint32_t highest) {
    if (mode <= highest)
        return true;
    vlsys_log(LOG_ERR, "%s: %s: no such mode: %u", "vlsys_set_network", field, mode);
    return false;
}

// The setters take a mode that they do not know for one that they do.
static bool has_known_modes(const NetworkSetting &setting) {
    for (const vlsys_ifconf &nif : setting.nifs)
        if (!has_mode("IPv4", nif.ipv4_mode, VLSYS_MODE_DHCP) ||
            !has_mode("IPv6", nif.ipv6_mode, VLSYS_MODE_AUTO))
            return false;
    return has_mode("IPv4 gateway", setting.gw4.mode, VLSYS_MODE_DHCP) &&
           has_mode("IPv6 gateway", setting.gw6.mode, VLSYS_MODE_AUTO) &&
           has_mode("DNS", setting.dns.mode, VLSYS_MODE_DHCP);
}

// ---- Check

// 0, a check code or a positive errno.
static int check_setting(const NetworkSetting &setting, char *hostname) {
    if (!has_usable_names(setting) || !has_known_modes(setting))
        return EINVAL;
    const int fault =
        vlsys_address_check2(setting.nifs.data(), static_cast<int>(setting.nifs.size()),
                             &setting.gw4, &setting.gw6, &setting.dns, hostname);
    if (fault >= 0)
        return fault;
    return fault == EAI_MEMORY ? ENOMEM : EINVAL; // the resolver's reason has been logged
}

// ---- What no check has looked at

static void clear_unread_addresses(vlsys_ifconf *nif) {
    if (nif->ipv4_mode != VLSYS_MODE_MANUAL) {
        memset(nif->addr, 0, sizeof nif->addr);
        memset(nif->netmask, 0, sizeof nif->netmask);
        memset(nif->broadaddr, 0, sizeof nif->broadaddr);
        nif->prefix = 0;
    }
    if (nif->ipv6_mode != VLSYS_MODE_MANUAL)
        nif->addr6[0] = {};
}

// The check empties a server that is given again later; the setter wants the first.
static void close_server_gaps(vlsys_dns *dns) {
    int given = 0;
    for (int i = 0; i < VLSYS_DNS_COUNT; i++)
        if (dns->server[i][0] != '\0')
            memmove(dns->server[given++], dns->server[i], VLSYS_ADDR6_SIZE);
    for (; given < VLSYS_DNS_COUNT; given++)
        memset(dns->server[given], 0, VLSYS_ADDR6_SIZE);
}

static void clear_unread_dns(vlsys_dns *dns) {
    if (dns->mode == VLSYS_MODE_MANUAL) {
        close_server_gaps(dns);
        return;
    }
    memset(dns->domain, 0, sizeof dns->domain);
    memset(dns->server, 0, sizeof dns->server);
    if (dns->mode == VLSYS_MODE_OFF)
        memset(dns->iface, 0, sizeof dns->iface);
}

static void clear_unread(const NetworkSetting &setting) {
    for (vlsys_ifconf &nif : setting.nifs)
        clear_unread_addresses(&nif);
    if (setting.gw4.mode != VLSYS_MODE_MANUAL)
        memset(setting.gw4.addr, 0, sizeof setting.gw4.addr);
    if (setting.gw6.mode != VLSYS_MODE_MANUAL)
        memset(setting.gw6.addr, 0, sizeof setting.gw6.addr);
    clear_unread_dns(&setting.dns);
}

// ---- What the network scripts do not serve

// In host byte order.
static uint32_t parse_ipv4(const char *text) {
    sockaddr_in result = {};
    inet_pton(AF_INET, text, &result.sin_addr);
    return host_order(result);
}

// Without its "%interface".
static sockaddr_in6 parse_ipv6(const char *text) {
    char address[VLSYS_ADDR6_SIZE];
    vlsys_strlcpy(address, text, sizeof address);
    address[strcspn(address, "%")] = '\0';
    sockaddr_in6 result = {};
    inet_pton(AF_INET6, address, &result.sin6_addr);
    return result;
}

static bool is_link_local(const char *text) {
    const sockaddr_in6 address = parse_ipv6(text);
    return IN6_IS_ADDR_LINKLOCAL(&address.sin6_addr);
}

static bool is_in_fixed_subnet4(const NetworkSetting &setting, const char *text) {
    const uint32_t address = parse_ipv4(text);
    for (const vlsys_ifconf &nif : setting.nifs) {
        if (nif.ipv4_mode != VLSYS_MODE_MANUAL)
            continue;
        const Subnet4 subnet(parse_ipv4(nif.addr), parse_ipv4(nif.netmask));
        if (subnet.contains(address))
            return true;
    }
    return false;
}

static bool is_in_fixed_subnet6(const NetworkSetting &setting, const char *text) {
    const Address6 address = host_order(parse_ipv6(text));
    for (const vlsys_ifconf &nif : setting.nifs) {
        if (nif.ipv6_mode != VLSYS_MODE_MANUAL)
            continue;
        const Subnet6 subnet(host_order(parse_ipv6(nif.addr6[0].addr)), nif.addr6[0].prefix);
        if (subnet.contains(address))
            return true;
    }
    return false;
}

static void warn_of_unserved(const NetworkSetting &setting) {
    for (const vlsys_ifconf &nif : setting.nifs)
        if (nif.ipv6_mode == VLSYS_MODE_MANUAL && is_link_local(nif.addr6[0].addr))
            vlsys_log(LOG_WARNING, "%s: the network scripts refuse a link-local IPv6 address: %s",
                      FieldText(nif.name).text, FieldText(nif.addr6[0].addr).text);
    const FieldText gateway4(setting.gw4.addr);
    if (!gateway4.is_empty() && !is_in_fixed_subnet4(setting, gateway4.text))
        vlsys_log(LOG_WARNING,
                  "the network scripts set an IPv4 gateway outside the fixed subnets only where a "
                  "lease's subnet holds it: %s",
                  gateway4.text);
    const FieldText gateway6(setting.gw6.addr);
    if (!gateway6.is_empty() && !is_link_local(gateway6.text) &&
        !is_in_fixed_subnet6(setting, gateway6.text))
        vlsys_log(LOG_WARNING,
                  "the network scripts set a global IPv6 gateway outside the fixed subnets only "
                  "where its prefix is known before: %s",
                  gateway6.text);
}

// ---- Setters

static int set_interfaces(std::span<const vlsys_ifconf> nifs) {
    for (const vlsys_ifconf &nif : nifs) {
        const int error = vlsys_set_netif(FieldText(nif.name).text, &nif);
        if (error != 0)
            return error;
    }
    return 0;
}

static int write_setting(const NetworkSetting &setting, int *step) {
    *step = VLSYS_STEP_NETIF;
    if (const int error = set_interfaces(setting.nifs))
        return error;
    *step = VLSYS_STEP_IPV4_GATEWAY;
    if (const int error = vlsys_set_ipv4_default_gateway2(&setting.gw4))
        return error;
    *step = VLSYS_STEP_IPV6_GATEWAY;
    if (const int error = vlsys_set_ipv6_default_gateway2(&setting.gw6))
        return error;
    *step = VLSYS_STEP_DNS;
    if (const int error = vlsys_set_dns_settings(&setting.dns))
        return error;
    *step = VLSYS_STEP_HOSTNAME;
    if (const int error = vlsys_set_hostname(setting.hostname))
        return error;
    *step = VLSYS_STEP_NONE;
    return 0;
}

} // namespace vlsys

using namespace vlsys;

int vlsys_set_network(vlsys_ifconf *nifs, int count, vlsys_gw4 *gw4, vlsys_gw6 *gw6, vlsys_dns *dns,
                      char *hostname, int *step) {
    int unwanted = 0;
    if (!step)
        step = &unwanted;
    *step = VLSYS_STEP_CHECK;
    if (!nifs || count < 1 || !gw4 || !gw6 || !dns || !hostname)
        return EFAULT;
    const NetworkSetting setting = {
        .nifs = {nifs, static_cast<size_t>(count)},
        .gw4 = *gw4,
        .gw6 = *gw6,
        .dns = *dns,
        .hostname = hostname,
    };
    const int fault = check_setting(setting, hostname);
    if (fault != 0)
        return fault;
    clear_unread(setting);
    warn_of_unserved(setting);
    return write_setting(setting, step);
}
