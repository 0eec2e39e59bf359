// The state in force: interfaces, gateways, and the restart with its report.
#include "core/owners.h"
#include "fixture.h"
#include "netstate/routes.h"
#include "vlsys.h"

#include <cstring>
#include <sys/resource.h>

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
    string text = string(nif.lower_up ? "carrier" : "no carrier") + (nif.up ? ", up" : "");
    if (nif.addr[0])
        text += string(" ") + nif.addr + " " + nif.netmask + "=" + std::to_string(nif.prefix) +
                " " + nif.broadaddr;
    for (int i = 0; i < VLSYS_ADDR6_COUNT; i++)
        if (nif.addr6[i].addr[0])
            text += ", " + std::to_string(i) + ": " + nif.addr6[i].addr + "/" +
                    std::to_string(nif.addr6[i].prefix) + " " + nif.addr6[i].scope;
    return text;
}

TEST_F(Netstate, TheStateOfAnInterfaceIsTheKernels) {
    const string link = ", 1: fe80::ff:fe00:2%eth1/64 link";
    const struct {
        string why, commands, state;
    } rows[] = {
        {"not up", "ip addr add 10.1.0.5/32 dev eth1; ip link set eth1 down",
         "no carrier 10.1.0.5 255.255.255.255=32 10.1.0.5"},
        {"a broadcast address", "ip addr add 10.1.0.5/20 brd + dev eth1",
         "carrier, up 10.1.0.5 255.255.240.0=20 10.1.15.255" + link},
        {"the last alias stays",
         "ip addr add 10.1.0.5/24 dev eth1; ip addr add 10.2.0.4/31 dev eth1 label eth1:1",
         "carrier, up 10.2.0.4 255.255.255.254=31 10.2.0.4" + link},
        {"the fourth global address replaces the third",
         "for i in 1/128 2/3 3/64 4/65; do ip addr add fd00::$i dev eth1; done",
         "carrier, 0: fd00::4/65 global" + link + ", 2: fd00::3/64 global, 3: fd00::1/128 global"},
        {"a site-local address", "ip addr add fec0::1/48 dev eth1",
         "carrier, 0: fec0::1/48 site" + link},
    };
    for (const auto &row : rows) {
        set_fixed_interfaces();
        run(row.commands);
        vlsys_ifconf nif = {};
        vlsys_strlcpy(nif.addr6[3].addr, "stale", VLSYS_ADDR6_SIZE);
        EXPECT_EQ(vlsys_get_netif("eth1", &nif), 0) << row.why;
        EXPECT_EQ(describe(nif), row.state) << row.why;
        EXPECT_STREQ(nif.mac, "02-00-00-00-00-02") << row.why;
        EXPECT_STREQ(nif.name, "eth1") << row.why;
    }
}

TEST_F(Netstate, AnInterfaceThatCannotBeReadIsLeftAlone) {
    vlsys_ifconf nif = {};
    run("ip link property add dev eth0 altname other; cd /etc/sysconfig/network-scripts; rm "
        "ifcfg-*; mkdir ifcfg-eth1");
    for (const char *name : {"eth", "eth0:x", "other"})
        EXPECT_EQ(vlsys_get_netif(name, &nif), ENXIO) << name;
    const rlimit few = {0, 4096};
    setrlimit(RLIMIT_NOFILE, &few);
    EXPECT_EQ(vlsys_get_netif("eth0", &nif), EMFILE) << "the kernel cannot be asked";
    const rlimit enough = {1024, 4096};
    setrlimit(RLIMIT_NOFILE, &enough);
    fail_call("getifaddrs", 1, ENOMEM);
    EXPECT_EQ(vlsys_get_netif("eth0", &nif), ENOMEM);
    EXPECT_TRUE(logged(LOG_ERR, "getifaddrs: Cannot allocate memory"));
    EXPECT_STREQ(nif.name, "");
    EXPECT_EQ(vlsys_get_netif("eth0", &nif), ENOENT) << "its file is missing";
    EXPECT_STREQ(nif.name, "eth0");
    EXPECT_EQ(vlsys_get_netif("eth1", &nif), EISDIR) << "its file cannot be read";
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
        {"in a long line's second piece", string(159, 'x') + via + "1 0 3 eth0\n", "  0"},
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
        {"not whole", "c 0 3\n", "  0"},
        {"more than 32 bits", "e 0 5 3 0 0 0 100000000\nf 100000000 6 3 0 0 0 0\n", "  0"},
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
    run("ip addr add 10.1.0.5/24 dev eth0; ip route add default via 10.1.0.1; mkdir -p /run/root; "
        "mv /etc/sysconfig /run/root; mkdir -p /run/root/etc; mv /run/root/sysconfig "
        "/run/root/etc");
    vlsys_exit();
    setenv("VL_ROOT", "/run/root", 1);
    ASSERT_EQ(vlsys_init(), 0);
    vlsys_gw4 gateway = {};
    for (const auto &row : rows) {
        write_file("/run/root/etc/sysconfig/network", row.network);
        write_file("/run/root" + scripts + "eth0", row.eth0);
        write_file("/run/root" + scripts + "eth1", row.eth1);
        EXPECT_EQ(vlsys_get_ipv4_default_gateway2(&gateway), 0) << row.why;
        EXPECT_STREQ(gateway.addr, "10.1.0.1") << row.why;
        EXPECT_STREQ(gateway.iface, "eth0") << row.why;
        EXPECT_EQ(gateway.mode, row.mode) << row.why;
    }
    run("rm /run/root/etc/sysconfig/network");
    EXPECT_EQ(vlsys_get_ipv4_default_gateway(gateway.addr), ENOENT);
    EXPECT_STREQ(gateway.addr, "");
    EXPECT_TRUE(logged(LOG_ERR, "/run/root/etc/sysconfig/network: No such file or directory"));
}

TEST_F(Netstate, AFixedSettingIsInForceAfterTheRestart) {
    vlsys_ifconf nif = {};
    nif.ipv4_mode = nif.ipv6_mode = VLSYS_MODE_MANUAL;
    nif.addr6[0].prefix = 64;
    vlsys_strlcpy(nif.addr, "192.168.1.9", sizeof nif.addr);
    vlsys_strlcpy(nif.netmask, "255.255.255.0", sizeof nif.netmask);
    vlsys_strlcpy(nif.addr6[0].addr, "fd00:1::9", VLSYS_ADDR6_SIZE);
    const vlsys_dns dns = {"a.example", {"192.168.1.1"}, "eth0", VLSYS_MODE_MANUAL};
    EXPECT_EQ(vlsys_set_netif("eth0", &nif), 0);
    EXPECT_EQ(vlsys_set_ipv4_default_gateway("192.168.1.1"), 0);
    EXPECT_EQ(vlsys_set_ipv6_default_gateway("fe80::1%eth0"), 0);
    EXPECT_EQ(vlsys_set_dns_settings(&dns), 0);
    EXPECT_EQ(vlsys_set_hostname("studio-1"), 0);
    EXPECT_EQ(vlsys_network_restart(), 0);
    const string log = take_log(LOG_INFO);
    EXPECT_EQ(log.substr(std::min(log.find("vlsys_network_restart"), log.size())),
              "vlsys_network_restart: exited (service network restart), status: 0\n"
              "hostname: studio-1\n"
              "mode: M_MAMMM4_\n"
              "eth0: link up, MAC: 02-00-00-00-00-01\n"
              "192.168.1.9/24, fd00:1::9/64, fe80::ff:fe00:1%eth0/64\n"
              "eth1: no carrier, MAC: 02-00-00-00-00-02\n"
              "gw4 192.168.1.1 (eth0) [static], gw6 fe80::1%eth0 (eth0) [static]\n"
              "DNS domain: a.example  server: 192.168.1.1\n");
}

TEST_F(Netstate, ARestartGivesTheResultOfItsCommand) {
    const string self = "vlsys_network_restart: ";
    const string x65(65, 'x');
    const struct {
        string why, arrange, status;
        int result;
        size_t waits;
        int priority;
        string log;
    } rows[] = {
        {"it went well, but no IPv6 address comes", ":", "0", 0, 20, LOG_INFO,
         self + "exited (service network restart), status: 0"},
        {"it failed", ":", "256", 1, 0, LOG_INFO,
         self + "exited (service network restart), status: 1"},
        {"nobody answers", ":", "", -1, 0, LOG_ERR,
         self + "vlsys_system(service network restart): Connection reset by peer"},
        {"DNS settings that cannot be read", "rm network-scripts/ifcfg-eth0", "0", ENOENT, 0,
         LOG_ERR, "vlsys_get_dns_settings: fopen(" + scripts + "eth0): No such file or directory"},
        {"a host name too long", "echo HOSTNAME=" + x65 + " >network", "0", -EINVAL, 0, LOG_ERR,
         self + "sethostname(" + x65 + ", 65): Invalid argument"},
    };
    run("ip link set eth0 down; ip link set eth1 down");
    for (const auto &row : rows) {
        unit::make_unit_files("sy");
        run("touch /etc/resolv.conf; cd /etc/sysconfig; " + row.arrange);
        const ScriptedSurrogate surrogate(row.status, ScriptedSurrogate::Then::close);
        EXPECT_EQ(vlsys_network_restart(), row.result) << row.why;
        EXPECT_EQ(take_waits(), std::vector<int64_t>(row.waits, second)) << row.why;
        EXPECT_TRUE(logged(row.priority, row.log)) << row.why;
        const bool has_run = row.priority == LOG_INFO || row.result == -1;
        EXPECT_EQ(access("/etc/resolv.conf", F_OK) != 0, has_run) << row.why;
    }
}

TEST_F(Netstate, ARestartTakesTheHostNameFromItsFile) {
    const struct {
        const char *why, *arrange, *hostname;
        int result;
    } rows[] = {
        {"the first one, without quotes",
         "echo '#HOSTNAME=y\n\nHOSTNAME=\"x\"y\nHOSTNAME=z' >network", "x", 0},
        {"no file", "rm network", "", 0},
        {"a file that cannot be read", "mkdir network", "before", -EISDIR},
    };
    for (const auto &row : rows) {
        run(string("hostname before; cd /etc/sysconfig; ") + row.arrange);
        const ScriptedSurrogate surrogate("0", ScriptedSurrogate::Then::close);
        EXPECT_EQ(vlsys_network_restart(), row.result) << row.why;
        char hostname[VLSYS_HOSTNAME_SIZE] = "";
        EXPECT_EQ(vlsys_get_hostname(hostname), 0);
        EXPECT_STREQ(hostname, row.hostname) << row.why;
    }
}
