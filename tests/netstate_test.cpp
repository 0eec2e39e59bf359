// The state in force: interfaces, gateways, and the restart with its report.
#include "core/owners.h"
#include "fixture.h"
#include "netstate/routes.h"
#include "vlsys.h"

#include <cstring>

using namespace test;
using std::string;

static const string scripts = "/etc/sysconfig/network-scripts/ifcfg-";

class Netstate : public Unit {
  protected:
    void SetUp() override {
        Unit::SetUp();
        set_fixed_interfaces();
    }
    // eth0 and eth1 anew, up, with the hardware addresses 02:00:00:00:00:01 and :02.
    static void set_fixed_interfaces() {
        set_interfaces({});
        set_interfaces({"eth0", "eth1"});
        run("for i in 0 1; do ip link set eth$i down address 02:00:00:00:00:0$((i + 1)) && "
            "ip link set eth$i up && until ip -6 addr show eth$i | grep -q fe80; do sleep 0.01; "
            "done; done");
    }
};

static string describe(const vlsys_ifconf &nif) {
    string text = string(nif.lower_up ? "carrier" : "no carrier") + (nif.up ? ", up " : " ") +
                  nif.addr + " " + nif.netmask + "=" + std::to_string(nif.prefix) + " " +
                  nif.broadaddr;
    for (const vlsys_addr6 &addr6 : nif.addr6)
        text += string(", ") + addr6.addr + "/" + std::to_string(addr6.prefix) + " " + addr6.scope;
    return text;
}

TEST_F(Netstate, TheStateOfAnInterfaceIsTheKernels) {
    const string link = ", fe80::ff:fe00:2%eth1/64 link, ";
    const struct {
        string why, commands, state;
    } rows[] = {
        {"not up", "ip addr add 10.1.0.5/32 dev eth1; ip link set eth1 down",
         "no carrier 10.1.0.5 255.255.255.255=32 10.1.0.5, /0 , /0 , /0 , /0 "},
        {"the last alias stays",
         "ip addr add 10.1.0.5/24 dev eth1; ip addr add 10.2.0.4/31 dev eth1 label eth1:1",
         "carrier, up 10.2.0.4 255.255.255.254=31 10.2.0.4, /0 " + link + "/0 , /0 "},
        {"the fourth global address replaces the third",
         "for i in 1/128 2/3 3/64 4/65; do ip addr add fd00::$i dev eth1; done",
         "carrier  =0 , fd00::4/65 global" + link + "fd00::3/64 global, fd00::1/128 global"},
    };
    for (const auto &row : rows) {
        set_fixed_interfaces();
        run(row.commands);
        vlsys_ifconf nif = {};
        vlsys_strlcpy(nif.addr6[3].addr, "stale", VLSYS_ADDR6_SIZE);
        EXPECT_EQ(vlsys_get_netif("eth1", &nif), 0) << row.why;
        EXPECT_EQ(describe(nif), row.state) << row.why;
        EXPECT_STREQ(nif.mac, "02-00-00-00-00-02") << row.why;
    }
}

TEST_F(Netstate, AnInterfaceThatCannotBeReadIsLeftAlone) {
    vlsys_ifconf nif = {};
    run("ip link property add dev eth0 altname other; rm /etc/sysconfig/network-scripts/ifcfg-*");
    for (const char *name : {"eth", "eth0:x", "other"})
        EXPECT_EQ(vlsys_get_netif(name, &nif), ENXIO) << name;
    EXPECT_STREQ(nif.name, "");
    EXPECT_EQ(vlsys_get_netif("eth0", &nif), ENOENT) << "its file is missing";
    EXPECT_STREQ(nif.name, "eth0");
}

template <class Gateway>
static string read(int (*reader)(FILE *, Gateway *), string table) {
    Gateway gateway = {};
    const vlsys::File file(fmemopen(table.data(), table.length(), "r"));
    EXPECT_EQ(reader(file.get(), &gateway), 0) << table;
    return string(gateway.addr) + " " + gateway.iface + " " + std::to_string(gateway.mode);
}

TEST_F(Netstate, TheFirstDefaultRouteOfTheTableCounts) {
    const string any(32, '0');
    const string to_any = any + " 00 " + any + " 00 ";
    const string via = to_any + "20010db8000000000000000000000001 0 ";
    const struct {
        string why, table, gateway;
    } ipv6[] = {
        {"fixed", via + "1 0 3 eth0\n" + via + "9 0 3 eth1\n", "2001:db8::1 eth0 1"},
        {"learnt", via + "2 0 00450003 eth0\n", "2001:db8::1 eth0 3"},
        {"not up, no gateway", via + "1 0 2 eth0\n" + via + "1 0 1 eth0\n", "  0"},
        {"not to everywhere", "1" + via.substr(1) + "1 0 3 eth0\n", "  0"},
        {"link-local", to_any + "febf0000000000000000000000000001\t0 0 0 3 eth0",
         "febf::1%eth0 eth0 3"},
    };
    for (const auto &row : ipv6)
        EXPECT_EQ(read(vlsys::read_ipv6_gateway, row.table), row.gateway) << row.why;
    const struct {
        string why, table, gateway;
    } ipv4[] = {
        {"the first",
         "Iface\tDestination\tGateway\na\t0\t0101A8C0\t3\t0\t0\t0\t00000000\nb 0 7 3 0 0 0 0\n",
         "192.168.1.1 a 0"},
        {"not to everywhere", "a 1 1 3 0 0 0 0\nb 0 2 3 0 0 0 1\n", "  0"},
        {"in a long line's second piece", string(159, 'x') + "d 0 4 3 0 0 0 0\n", "  0"},
    };
    for (const auto &row : ipv4)
        EXPECT_EQ(read(vlsys::read_ipv4_gateway, row.table), row.gateway) << row.why;
}

TEST_F(Netstate, TheIpv4GatewaysModeIsThatOfTheFiles) {
    const struct {
        const char *why, *network, *eth0, *eth1;
        uint32_t mode;
    } rows[] = {
        {"a fixed one", "GATEWAY=\n", "BOOTPROTO=dhcp\n", "", VLSYS_MODE_MANUAL},
        {"no key of that name", "#GATEWAY=\nGATEWAYDEV=1\n", "", "", VLSYS_MODE_OFF},
        {"a lease that gives one", "", "", "BOOTPROTO=dhcp\n", VLSYS_MODE_DHCP},
        {"a lease that gives none", "", "BOOTPROTO=dhcp\nDEFROUTE=no\n", "", VLSYS_MODE_OFF},
    };
    run("ip addr add 10.1.0.5/24 dev eth0; ip route add default via 10.1.0.1");
    vlsys_gw4 gateway = {};
    for (const auto &row : rows) {
        write_file("/etc/sysconfig/network", row.network);
        write_file(scripts + "eth0", row.eth0);
        write_file(scripts + "eth1", row.eth1);
        EXPECT_EQ(vlsys_get_ipv4_default_gateway2(&gateway), 0) << row.why;
        EXPECT_STREQ(gateway.addr, "10.1.0.1") << row.why;
        EXPECT_STREQ(gateway.iface, "eth0") << row.why;
        EXPECT_EQ(gateway.mode, row.mode) << row.why;
    }
}

// The report that the log ends with.
static string report() {
    const string log = take_log(LOG_INFO);
    return log.substr(std::min(log.find("mode: "), log.size()));
}

TEST_F(Netstate, AFixedSettingIsInForceAfterTheRestart) {
    const vlsys_ifconf nif = {.addr = "192.168.1.9",
                              .netmask = "255.255.255.0",
                              .ipv4_mode = VLSYS_MODE_MANUAL,
                              .addr6 = {{.addr = "fd00:1::9", .prefix = 64}},
                              .ipv6_mode = VLSYS_MODE_MANUAL};
    const vlsys_dns dns = {"a.example", {"192.168.1.1"}, "eth0", VLSYS_MODE_MANUAL};
    EXPECT_EQ(vlsys_set_netif("eth0", &nif), 0);
    EXPECT_EQ(vlsys_set_ipv4_default_gateway("192.168.1.1"), 0);
    EXPECT_EQ(vlsys_set_ipv6_default_gateway("fe80::1%eth0"), 0);
    EXPECT_EQ(vlsys_set_dns_settings(&dns), 0);
    EXPECT_EQ(vlsys_network_restart(), 0);
    EXPECT_EQ(report(), "mode: M_MAMMM4_\n"
                        "eth0: link up, MAC: 02-00-00-00-00-01\n"
                        "192.168.1.9/24, fd00:1::9/64, fe80::ff:fe00:1%eth0/64\n"
                        "eth1: no carrier, MAC: 02-00-00-00-00-02\n"
                        "gw4 192.168.1.1 (eth0) [static], gw6 fe80::1%eth0 (eth0) [static]\n"
                        "DNS domain: a.example  server: 192.168.1.1\n");
}

// One IPv6 address is enough for the report. The lease's server stays behind the fixed one.
TEST_F(Netstate, WhatComesAfterTheRestartIsNotInItsReport) {
    const vlsys_ifconf nif = {.ipv4_mode = VLSYS_MODE_DHCP, .ipv6_mode = VLSYS_MODE_AUTO};
    const vlsys_dns dns = {"a.example", {"192.168.1.53"}, "eth0", VLSYS_MODE_MANUAL};
    EXPECT_EQ(vlsys_set_netif("eth0", &nif), 0);
    EXPECT_EQ(vlsys_set_dns_settings(&dns), 0);
    run("echo 3 >/run/advertisement-delay");
    write_file("/usr/sbin/service",
               "/etc/rc.d/init.d/network restart && "
               "until ip -6 addr show eth0 | grep -q fe80; do sleep 0.01; done");
    EXPECT_EQ(vlsys_network_restart(), 0);
    EXPECT_EQ(report(), "mode: D_AAM_M44\n"
                        "eth0: link up, MAC: 02-00-00-00-00-01\n"
                        "192.168.1.100/24, fe80::ff:fe00:1%eth0/64\n"
                        "eth1: no carrier, MAC: 02-00-00-00-00-02\n"
                        "gw4 192.168.1.1 (eth0) [static], gw6 [off]\n"
                        "DNS domain: a.example  server: 192.168.1.53, 192.168.1.1\n");
}

TEST_F(Netstate, ARestartGivesTheResultOfItsCommand) {
    run("ip link set eth0 down; ip link set eth1 down; echo 'HOSTNAME=\"x\"y' "
        ">/etc/sysconfig/network");
    const struct {
        const char *why, *status;
        int result;
        size_t waits;
    } rows[] = {
        {"it went well, but no IPv6 address comes to two interfaces", "0", 0, 20},
        {"it failed", "256", 1, 0},
    };
    for (const auto &row : rows) {
        write_file("/etc/resolv.conf", "");
        const ScriptedSurrogate surrogate(row.status, ScriptedSurrogate::Then::close);
        EXPECT_EQ(vlsys_network_restart(), row.result) << row.why;
        EXPECT_EQ(take_waits(), std::vector<int64_t>(row.waits, second)) << row.why;
        EXPECT_NE(access("/etc/resolv.conf", F_OK), 0) << row.why;
        EXPECT_TRUE(logged(LOG_INFO, "hostname: x")) << "without quotes";
    }
    EXPECT_TRUE(logged(LOG_INFO, "vlsys_network_restart: exited (service network restart), "
                                 "status: 1"));
}

TEST_F(Netstate, AUnitWhoseDnsSettingsCannotBeReadKeepsItsNetwork) {
    run("touch /etc/resolv.conf; rm /etc/sysconfig/network " + scripts + "eth0");
    EXPECT_EQ(vlsys_network_restart(), ENOENT);
    EXPECT_EQ(access("/etc/resolv.conf", F_OK), 0);
    char hostname[VLSYS_HOSTNAME_SIZE] = "before";
    EXPECT_EQ(vlsys_get_hostname(hostname), 0);
    EXPECT_STREQ(hostname, "") << "of a network file that is missing";
}
