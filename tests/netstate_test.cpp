#include "core/owners.h"
#include "fixture.h"
#include "netstate/routes.h"
#include "vlsys.h"

#include <net/if.h>
#include <netdb.h>

using namespace test;
using std::string;

using Netstate = Unit;

// eth0 and eth1 anew, with known hardware addresses; eth1 without an address.
static void set_fixed_interfaces() {
    set_interfaces({});
    set_interfaces({"eth0", "eth1"});
    run("ip link set eth0 address 02:01:02:03:04:0a;"
        "ip link set eth1 down address 02:00:00:00:00:0b addrgenmode none; ip link set eth1 up");
}

static string describe(const vlsys_ifconf &nif) {
    string text = string(nif.lower_up ? "carrier" : "no carrier") + (nif.up ? ", up, " : ", ") +
                  nif.addr + "/" + std::to_string(nif.prefix) + ", mask " + nif.netmask +
                  ", broadcast " + nif.broadaddr;
    for (const vlsys_addr6 &addr6 : nif.addr6)
        text += string(", ") + addr6.addr + "/" + std::to_string(addr6.prefix) + " " + addr6.scope;
    return text;
}

// The last IPv4 address stays. The kernel lists fd00::4 first and fec0::6 after fd00::1: fec0::6
// takes the place of fd00::4, and fd00::1 that of fd00::2.
TEST_F(Netstate, TheStateOfAnInterfaceIsTheKernels) {
    set_fixed_interfaces();
    run("ip addr add 10.1.0.5/24 dev eth1; ip addr add 10.2.0.4/31 dev eth1 label eth1:1;"
        "for address in fec0::6/64 fe80::5/64 fd00::1/3 fd00::2/128 fd00::3/65 fd00::4/64; do"
        "    ip addr add $address dev eth1; done");
    vlsys_ifconf nif = {};
    EXPECT_EQ(vlsys_get_netif("eth1", &nif), 0);
    EXPECT_EQ(describe(nif), "carrier, up, 10.2.0.4/31, mask 255.255.255.254, broadcast 10.2.0.4, "
                             "fec0::6/64 site, fe80::5%eth1/64 link, fd00::3/65 global, "
                             "fd00::1/3 global");
    EXPECT_EQ(nif.index, if_nametoindex("eth1"));
    EXPECT_STREQ(nif.mac, "02-00-00-00-00-0B");
    run("ip addr flush dev eth1");
    EXPECT_EQ(vlsys_get_netif("eth1", &nif), 0);
    EXPECT_EQ(describe(nif),
              "carrier, 10.2.0.4/31, mask 255.255.255.254, broadcast 10.2.0.4, /0 , /0 , /0 , /0 ");
    EXPECT_EQ(nif.has_ipv6, 0);
}

TEST_F(Netstate, TheFirstIpv6DefaultRouteCounts) {
    const string any = string(32, '0') + " 00 ";
    const string via = any + any + "20010db8000300040005000600070008 0 ";
    string table = "1" + via.substr(1) +
                   "1 0 3 eth0\n"                // references, uses, flags; not to everywhere
                   + via + "1 0 2 eth0\n"        // not up
                   + via + "1 0 1 eth0\n"        // no gateway
                   + via + "2 0 00450003 eth1\n" // learnt: the kernel holds it twice
                   + via + "1 0 3 eth0\n";
    const vlsys::File file(fmemopen(table.data(), table.length(), "r"));
    vlsys_gw6 gateway = {};
    EXPECT_EQ(vlsys::read_ipv6_gateway(file.get(), &gateway), 0);
    EXPECT_STREQ(gateway.addr, "2001:db8:3:4:5:6:7:8");
    EXPECT_STREQ(gateway.iface, "eth1");
    EXPECT_EQ(gateway.mode, VLSYS_MODE_AUTO);
    string long_name = any + any + "fe801111222233334444555566667777 0 1 0 3 eth100\n";
    const vlsys::File other(fmemopen(long_name.data(), long_name.length(), "r"));
    EXPECT_EQ(vlsys::read_ipv6_gateway(other.get(), &gateway), EAI_OVERFLOW);
    EXPECT_STREQ(gateway.addr, "") << "cut, it would name eth10";
}

TEST_F(Netstate, TheIpv4GatewaysModeIsThatOfTheFiles) {
    const struct {
        const char *why, *network, *eth0, *eth1;
        uint32_t mode;
    } rows[] = {
        {"a fixed gateway", "GATEWAY=\n", "BOOTPROTO=dhcp\n", "", VLSYS_MODE_MANUAL},
        {"no key of that name", "#GATEWAY=\nGATEWAYDEV=1\n", "", "", VLSYS_MODE_OFF},
        {"a lease that gives one", "", "", "BOOTPROTO=dhcp\n", VLSYS_MODE_DHCP},
        {"a lease that gives none", "", "BOOTPROTO=dhcp\nDEFROUTE=no\n", "", VLSYS_MODE_OFF},
    };
    run("ip addr add 10.1.0.5/24 dev eth0; ip route add default via 10.1.0.1;"
        "ip route add 0.0.0.0/1 via 10.1.0.2"); // comes first in the table
    vlsys_gw4 gateway = {};
    char text[VLSYS_ADDR4_SIZE] = "";
    for (const auto &row : rows) {
        write_file("/etc/sysconfig/network", row.network);
        write_file(ifcfg + "eth0", row.eth0);
        write_file(ifcfg + "eth1", row.eth1);
        EXPECT_EQ(vlsys_get_ipv4_default_gateway2(&gateway), 0) << row.why;
        EXPECT_EQ(vlsys_get_ipv4_default_gateway(text), 0) << row.why;
        EXPECT_STREQ(text, "10.1.0.1") << row.why;
        EXPECT_EQ(gateway.mode, row.mode) << row.why;
    }
}

TEST_F(Netstate, ASettingIsInForceAfterTheRestart) {
    const vlsys_ifconf nif = {.ipv4_mode = VLSYS_MODE_DHCP,
                              .addr6 = {{.addr = "fd00:1::9", .prefix = 64}},
                              .ipv6_mode = VLSYS_MODE_MANUAL};
    const vlsys_dns dns = {.domain = "a.example",
                           .server = {"192.168.1.53", "fd00:1::1"},
                           .iface = "eth0",
                           .mode = VLSYS_MODE_MANUAL};
    set_fixed_interfaces();
    EXPECT_EQ(vlsys_set_netif("eth0", &nif), 0);
    EXPECT_EQ(vlsys_set_ipv6_default_gateway("fe80::1%eth0"), 0);
    EXPECT_EQ(vlsys_set_dns_settings(&dns), 0);
    string tries; // eth1 gets no IPv6 address
    for (int i = 1; i <= 10; i++)
        tries += "7 q: eth1\n7 print_network_info: retry vlsys_get_netif(eth1) " +
                 std::to_string(i) + " times\n";
    take_log();
    EXPECT_EQ(vlsys_network_restart(), 0);
    EXPECT_EQ(take_log(),
              "3 connect: Connection refused\n"
              "4 can't connect surrogate parant. fallback to direct call.\n"
              "6 vlsys_network_restart: exited (service network restart), status: 0\n"
              "6 hostname: unit.lan1.example\n"
              "7 q: eth0\n" +
                  tries +
                  "6 mode: D_MAMMM46\n"
                  "6 eth0: link up, MAC: 02-01-02-03-04-0A\n"
                  "6 192.168.1.100/24, fd00:1::9/64, fe80::1:2ff:fe03:40a%eth0/64\n"
                  "6 eth1: no carrier, MAC: 02-00-00-00-00-0B\n"
                  "6 gw4 192.168.1.1 (eth0) [static], gw6 fe80::1%eth0 (eth0) [static]\n"
                  "6 DNS domain: a.example  server: 192.168.1.53, fd00:1::1, 192.168.1.1\n");
    EXPECT_EQ(take_waits(), std::vector<int64_t>(10, second));
}

TEST_F(Netstate, ARestartGivesTheResultOfItsCommand) {
    set_fixed_interfaces();
    run("ip link del eth1; ip link set eth0 down; ip addr add 10.1.0.5/24 dev eth0;"
        "touch /etc/resolv.conf; echo 'HOSTNAME=\"x\"y' >/etc/sysconfig/network");
    const auto request = answer("256");
    EXPECT_EQ(vlsys_network_restart(), 1);
    EXPECT_NE(access("/etc/resolv.conf", F_OK), 0) << "the scripts write it anew";
    EXPECT_EQ(take_log(LOG_INFO),
              "6 CMD: service network restart\n"
              "6 vlsys_network_restart: exited (service network restart), status: 1\n"
              "6 hostname: x\n"
              "6 mode: D_A_1____\n"
              "6 eth0: no carrier, MAC: 02-01-02-03-04-0A\n"
              "6 gw4  () [dhcp], gw6 [off]\n"
              "6 DNS domain:   server: \n");
}
