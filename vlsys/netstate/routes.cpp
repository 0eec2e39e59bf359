#include "netstate/routes.h"

#include "core/lines.h"
#include "core/log.h"
#include "core/paths.h"
#include "core/text.h"
#include "netconf/interfaces.h"
#include "netstate/address.h"

#include <cerrno>
#include <cstring>
#include <net/route.h>
#include <string_view>

namespace vlsys {

static constexpr size_t line_size = 160;

namespace {

// The fields of a line, null from the first that is missing on.
template <size_t Count>
struct Fields {
    Fields(char *line, const char *separators) {
        char *rest = nullptr;
        for (const char *&field : text) {
            field = strtok_r(line, separators, &rest);
            line = nullptr;
            if (!field)
                return;
        }
    }

    uint32_t hex(size_t index, uint32_t missing) const {
        return text[index] ? static_cast<uint32_t>(parse_uint(text[index], 16)) : missing;
    }

    const char *text[Count] = {};
};

} // namespace

static File open_or_log(const char *path) {
    File file(fopen(path, "re"));
    if (!file)
        vlsys_log(LOG_ERR, "%s: %m", path);
    return file;
}

// 32 hexadecimal digits; a group of eight that is missing counts as 0.
static in6_addr parse_next_hop(const char *field) {
    char digits[33] = {};
    vlsys_strlcpy(digits, field, sizeof digits);
    in6_addr address;
    for (size_t word = 0; word < 4; word++) {
        char group[9];
        vlsys_strlcpy(group, digits + 8 * word, sizeof group);
        address.s6_addr32[word] = htonl(static_cast<uint32_t>(parse_uint(group, 16)));
    }
    return address;
}

int read_ipv6_gateway(FILE *table, vlsys_gw6 *gw) {
    enum { destination = 0, next_hop = 4, references = 6, flags = 8, device = 9, count };
    constexpr std::string_view any = "00000000000000000000000000000000";
    constexpr uint32_t needed = RTF_UP | RTF_GATEWAY;

    char line[line_size];
    while (read_line(table, line, sizeof line) > 0) {
        const Fields<count> fields(line, " \t\n");
        if (!fields.text[next_hop] || fields.text[destination] != any ||
            (fields.hex(flags, 0) & needed) != needed)
            continue;

        sockaddr_in6 sa = {};
        sa.sin6_family = AF_INET6;
        sa.sin6_addr = parse_next_hop(fields.text[next_hop]);
        const int result = addr_to_text(reinterpret_cast<const sockaddr *>(&sa), sizeof sa,
                                        gw->addr, sizeof gw->addr, "v6gateway");
        if (result != 0)
            return result;
        if (fields.text[device]) {
            if (IN6_IS_ADDR_LINKLOCAL(&sa.sin6_addr)) {
                vlsys_strlcat(gw->addr, "%", sizeof gw->addr);
                vlsys_strlcat(gw->addr, fields.text[device], sizeof gw->addr);
            }
            vlsys_strlcpy(gw->iface, fields.text[device], sizeof gw->iface);
        }
        // The appliance's kernel holds a learnt route more than once; recent ones count uses.
        gw->mode = fields.hex(references, 0) == 1 ? VLSYS_MODE_MANUAL : VLSYS_MODE_AUTO;
        return 0;
    }
    return 0;
}

int read_ipv4_gateway(FILE *table, vlsys_gw4 *gw) {
    enum { interface = 0, destination = 1, gateway = 2, mask = 7, count };

    char line[line_size];
    while (read_line(table, line, sizeof line) > 0) {
        const Fields<count> fields(line, " \t");
        if (fields.hex(mask, UINT32_MAX) != 0 || fields.hex(destination, UINT32_MAX) != 0)
            continue;

        sockaddr_in sa = {};
        sa.sin_family = AF_INET;
        sa.sin_addr.s_addr = fields.hex(gateway, UINT32_MAX);
        const int result = addr_to_text(reinterpret_cast<const sockaddr *>(&sa), sizeof sa,
                                        gw->addr, sizeof gw->addr, "gateway");
        if (result == 0)
            vlsys_strlcpy(gw->iface, fields.text[interface], sizeof gw->iface);
        return result;
    }
    return 0;
}

static bool names_gateway(FILE *network) {
    bool found = false;
    char line[line_size];
    while (read_line(network, line, sizeof line) > 0)
        found |= starts_with(line, "GATEWAY=");
    return found;
}

static bool learns_gateway(FILE *ifcfg) {
    bool dhcp = false;
    bool refused = false;
    char line[line_size];
    while (read_line(ifcfg, line, sizeof line) > 0) {
        dhcp |= starts_with(line, "BOOTPROTO=dhcp");
        refused |= starts_with(line, "DEFROUTE=no");
    }
    return dhcp && !refused;
}

// How the IPv4 gateway is configured. Returns 0, or the errno of a file that cannot be opened, with
// the mode as far as it was found.
static int read_ipv4_gateway_mode(uint32_t *mode) {
    const File network = open_or_log(SystemPath(network_path).text);
    if (!network)
        return errno;
    if (names_gateway(network.get())) {
        *mode = VLSYS_MODE_MANUAL;
        return 0;
    }
    for (const auto &name : InterfaceList()) {
        const File ifcfg = open_or_log(SystemPath(ifcfg_prefix, name).text);
        if (!ifcfg)
            return errno;
        if (learns_gateway(ifcfg.get()))
            *mode = VLSYS_MODE_DHCP;
    }
    return 0;
}

} // namespace vlsys

using namespace vlsys;

int vlsys_get_ipv6_default_gateway2(vlsys_gw6 *gw) {
    if (!gw)
        return EFAULT;
    const File table = open_or_log(ipv6_route_path);
    if (!table)
        return errno;
    gw->iface[0] = '\0';
    gw->addr[0] = '\0';
    gw->mode = VLSYS_MODE_OFF;
    return read_ipv6_gateway(table.get(), gw);
}

int vlsys_get_ipv4_default_gateway2(vlsys_gw4 *gw) {
    if (!gw)
        return EFAULT;
    File table = open_or_log(route_path);
    if (!table)
        return errno;
    gw->iface[0] = '\0';
    gw->addr[0] = '\0';
    const int result = read_ipv4_gateway(table.get(), gw);
    table.reset();

    gw->mode = VLSYS_MODE_OFF;
    const int failure = read_ipv4_gateway_mode(&gw->mode);
    return failure != 0 ? failure : result;
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
