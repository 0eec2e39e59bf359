#include "netstate/routes.h"

#include "core/lines.h"
#include "core/log.h"
#include "core/owners.h"
#include "core/paths.h"
#include "core/text.h"
#include "netconf/interfaces.h"
#include "netstate/address.h"

#include <cerrno>
#include <cstring>
#include <net/route.h>
#include <netdb.h>
#include <string_view>

namespace vlsys {

static constexpr size_t line_size = 160;

namespace {

// The words of a line, null from the first that is missing on.
template <size_t Count>
struct Words {
    Words(char *line, const char *separators) {
        char *rest = nullptr;
        for (const char *&word : text) {
            word = strtok_r(line, separators, &rest);
            line = nullptr;
            if (!word)
                return;
        }
    }

    uint32_t hex(size_t index, uint32_t missing) const {
        return text[index] ? static_cast<uint32_t>(parse_uint(text[index], 16)) : missing;
    }

    const char *text[Count] = {};
};

// What is read of a line of each table. The texts lie in the line's buffer, null when missing.
struct Ipv6Route {
    const char *destination;
    const char *next_hop;
    uint32_t references;
    uint32_t flags;
    const char *device;
};

struct Ipv4Route {
    const char *interface;
    uint32_t destination;
    uint32_t gateway;
    uint32_t mask;
};

} // namespace

static Ipv6Route parse_ipv6_route(char *line) {
    const Words<10> words(line, " \t\n");
    return {.destination = words.text[0],
            .next_hop = words.text[4],
            .references = words.hex(6, 0),
            .flags = words.hex(8, 0),
            .device = words.text[9]};
}

static Ipv4Route parse_ipv4_route(char *line) {
    const Words<8> words(line, " \t");
    return {.interface = words.text[0],
            .destination = words.hex(1, UINT32_MAX),
            .gateway = words.hex(2, UINT32_MAX),
            .mask = words.hex(7, UINT32_MAX)};
}

static bool is_default_gateway(const Ipv6Route &route) {
    constexpr std::string_view any = "00000000000000000000000000000000";
    constexpr uint32_t needed = RTF_UP | RTF_GATEWAY;
    return route.next_hop && route.destination == any && (route.flags & needed) == needed;
}

// With or without a gateway.
static bool is_default_route(const Ipv4Route &route) {
    return route.mask == 0 && route.destination == 0;
}

// 32 hexadecimal digits; a group of eight that is missing counts as 0.
static in6_addr parse_next_hop(const char *word) {
    char digits[33] = {};
    vlsys_strlcpy(digits, word, sizeof digits);
    in6_addr address;
    for (size_t i = 0; i < 4; i++) {
        char group[9];
        vlsys_strlcpy(group, digits + 8 * i, sizeof group);
        address.s6_addr32[i] = htonl(static_cast<uint32_t>(parse_uint(group, 16)));
    }
    return address;
}

static int refuse_cut(vlsys_gw6 *gw) {
    gw->addr[0] = '\0';
    vlsys_log(LOG_ERR, "%s: getnameinfo: %s", "v6gateway", gai_strerror(EAI_OVERFLOW));
    return EAI_OVERFLOW;
}

static int take_gateway(const Ipv6Route &route, vlsys_gw6 *gw) {
    sockaddr_in6 sa = {};
    sa.sin6_family = AF_INET6;
    sa.sin6_addr = parse_next_hop(route.next_hop);
    const int result = addr_to_text(reinterpret_cast<const sockaddr *>(&sa), sizeof sa, gw->addr,
                                    sizeof gw->addr, "v6gateway");
    if (result != 0)
        return result;
    if (route.device) {
        if (IN6_IS_ADDR_LINKLOCAL(&sa.sin6_addr)) {
            vlsys_strlcat(gw->addr, "%", sizeof gw->addr);
            if (vlsys_strlcat(gw->addr, route.device, sizeof gw->addr) >= sizeof gw->addr)
                return refuse_cut(gw); // the beginning may name another interface
        }
        vlsys_strlcpy(gw->iface, route.device, sizeof gw->iface);
    }
    // The appliance's kernel holds a learnt route more than once; recent ones count uses.
    gw->mode = route.references == 1 ? VLSYS_MODE_MANUAL : VLSYS_MODE_AUTO;
    return 0;
}

static int take_gateway(const Ipv4Route &route, vlsys_gw4 *gw) {
    sockaddr_in sa = {};
    sa.sin_family = AF_INET;
    sa.sin_addr.s_addr = route.gateway;
    const int result = addr_to_text(reinterpret_cast<const sockaddr *>(&sa), sizeof sa, gw->addr,
                                    sizeof gw->addr, "gateway");
    if (result == 0)
        vlsys_strlcpy(gw->iface, route.interface, sizeof gw->iface);
    return result;
}

int read_ipv6_gateway(FILE *table, vlsys_gw6 *gw) {
    char line[line_size];
    int result = 0;
    while ((result = read_line(table, line, sizeof line)) > 0) {
        const Ipv6Route route = parse_ipv6_route(line);
        if (is_default_gateway(route))
            return take_gateway(route, gw);
    }
    return result < 0 ? -log_errno("fgets(%s)", ipv6_route_path) : 0;
}

int read_ipv4_gateway(FILE *table, vlsys_gw4 *gw) {
    char line[line_size];
    int result = 0;
    while ((result = read_line(table, line, sizeof line)) > 0) {
        const Ipv4Route route = parse_ipv4_route(line);
        if (is_default_route(route))
            return take_gateway(route, gw);
    }
    return result < 0 ? -log_errno("fgets(%s)", route_path) : 0;
}

// Whether the network file names a gateway: 1, 0, or the negated errno, logged.
static int names_gateway(const char *path) {
    const File network(fopen(path, "re"));
    if (!network)
        return log_errno("%s", path);
    bool named = false;
    char line[line_size];
    int result = 0;
    while ((result = read_line(network.get(), line, sizeof line)) > 0)
        named |= starts_with(line, "GATEWAY=");
    return result < 0 ? log_errno("fgets(%s)", path) : named;
}

// Whether an interface's file lets it learn a default route: 1, 0, or the negated errno, logged.
static int learns_gateway(const char *path) {
    const File ifcfg(fopen(path, "re"));
    if (!ifcfg)
        return log_errno("%s", path);
    bool dhcp = false;
    bool refused = false;
    char line[line_size];
    int result = 0;
    while ((result = read_line(ifcfg.get(), line, sizeof line)) > 0) {
        dhcp |= starts_with(line, "BOOTPROTO=dhcp");
        refused |= starts_with(line, "DEFROUTE=no");
    }
    return result < 0 ? log_errno("fgets(%s)", path) : dhcp && !refused;
}

// How the IPv4 gateway is configured. Returns 0, or the negated errno of a file that cannot be
// read, with the mode as far as it was found.
static int read_ipv4_gateway_mode(uint32_t *mode) {
    *mode = VLSYS_MODE_OFF;
    const int named = names_gateway(SystemPath(network_path).text);
    if (named < 0)
        return named;
    if (named > 0) {
        *mode = VLSYS_MODE_MANUAL;
        return 0;
    }
    for (const auto &name : InterfaceList()) {
        const int learnt = learns_gateway(SystemPath(ifcfg_prefix, name).text);
        if (learnt < 0)
            return learnt;
        if (learnt > 0)
            *mode = VLSYS_MODE_DHCP;
    }
    return 0;
}

} // namespace vlsys

using namespace vlsys;

int vlsys_get_ipv6_default_gateway2(vlsys_gw6 *gw) {
    if (!gw)
        return EFAULT;
    const File table(fopen(ipv6_route_path, "re"));
    if (!table)
        return -log_errno("%s", ipv6_route_path);
    gw->iface[0] = '\0';
    gw->addr[0] = '\0';
    gw->mode = VLSYS_MODE_OFF;
    return read_ipv6_gateway(table.get(), gw);
}

int vlsys_get_ipv4_default_gateway2(vlsys_gw4 *gw) {
    if (!gw)
        return EFAULT;
    File table(fopen(route_path, "re"));
    if (!table)
        return -log_errno("%s", route_path);
    gw->iface[0] = '\0';
    gw->addr[0] = '\0';
    const int result = read_ipv4_gateway(table.get(), gw);
    table.reset();
    const int mode_result = read_ipv4_gateway_mode(&gw->mode);
    return mode_result != 0 ? -mode_result : result;
}

int vlsys_get_ipv6_default_gateway(char *text) {
    if (!text)
        return EFAULT;
    vlsys_gw6 gw = {};
    const int result = vlsys_get_ipv6_default_gateway2(&gw);
    vlsys_strlcpy(text, result == 0 ? gw.addr : "", sizeof gw.addr);
    return result;
}

int vlsys_get_ipv4_default_gateway(char *text) {
    if (!text)
        return EFAULT;
    vlsys_gw4 gw = {};
    const int result = vlsys_get_ipv4_default_gateway2(&gw);
    vlsys_strlcpy(text, result == 0 ? gw.addr : "", sizeof gw.addr);
    return result;
}
