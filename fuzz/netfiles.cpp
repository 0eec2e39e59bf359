// The resolver's file, two interfaces' files, the network file, switches, two routing tables.
#include "fuzz.h"
#include "netconf/get_mode.h"
#include <net/if.h>

extern "C" void __wrap_if_freenameindex(void * /*list*/) {}
extern "C" struct if_nameindex *__wrap_if_nameindex() {
    static struct if_nameindex list[] = {{3, strdup("eth1")}, {2, strdup("eth0")}, {}};
    return list;
}

static auto read(const Input &in) {
    static const char *const names[] = {"resolv.conf",  "ifcfg-eth0", "ifcfg-eth1", "network",
                                        "disable_ipv6", "autoconf",   "ipv6_route", "route"};
    for (size_t i = 0; i < 8; i++)
        files[names[i]] = in[i];
    struct {
        vlsys_dns dns;
        vlsys_gw4 gw4;
        vlsys_gw6 gw6;
        uint32_t ipv4, ipv6;
    } s = {};
    assert(vlsys_get_dns_settings(&s.dns) + vlsys::get_mode("eth0", &s.ipv4, &s.ipv6) == 0);
    strncpy(s.dns.domain, std::string(s.dns.domain).c_str(), sizeof s.dns.domain); // zero its tail
    assert(vlsys_get_ipv4_default_gateway2(&s.gw4) + vlsys_get_ipv6_default_gateway2(&s.gw6) == 0);
    return s;
}

static void check(Input &in) {
    const auto s = read(in);
    assert(s.dns.mode <= 2 && s.ipv4 <= 2 && s.ipv6 <= 3 && !s.gw6.mode == !s.gw6.addr[0]);
    assert(s.dns.mode != VLSYS_MODE_MANUAL || has(in[1] + in[2], "DOMAIN"));
    assert(has("\n" + in[3], "\nGATEWAY=") == (s.gw4.mode == VLSYS_MODE_MANUAL));
    // What was read makes the same again; what stands twice, or is no default route, does nothing.
    in[0] = "#\n;\n\ndomain " + std::string(s.dns.domain);
    for (const auto &server : s.dns.server)
        in[0] += "\nnameserver " + std::string(server);
    in[1] += "\n#\n\n" + in[1];
    in[6] = "00000000000000000000000000000000 00 0 00 fe80 0 1 1 1 lo\n" + in[6];
    in[7] = "Iface Destination Gateway\nx 0 0\ny 0 0 3 0 0 0 80\n" + in[7];
    assert(bytes_of(read(in)) == bytes_of(s));
}
