#include "fixture.h"
#include "operations.h"

#include <algorithm>
#include <cstring>

using namespace test;
using std::string;

struct Row {
    const char *why;
    string changes;    // to the setting that passes
    string result;     // the code in words
    string after = {}; // the fields that the call has changed
};

static void expect(const Row &row, int (*call)(Records &)) {
    SCOPED_TRACE(row.why + (": " + row.changes));
    Records records = make(row.changes);
    Records wanted = make(row.changes + " " + row.after);
    char text[160];
    vlsys_check_text(call(records), records.nifs, 2, text, sizeof text);
    EXPECT_EQ(text, row.result);
    const auto fields = fields_of(records);
    for (const auto &[name, field] : fields_of(wanted))
        EXPECT_EQ(fields.at(name).value(), field.value()) << name;
}

using NetworkSetting = Unit;

static constexpr char valid[] = "no fault";
static const string no_gateways = "gw4.mode=Off gw4= gw4.iface= gw6.mode=Off gw6= ";
static const string longest = "hostname=a." + string(62, 'a');

TEST_F(NetworkSetting, BothValidatorsKeepTheCommonRules) {
    const Row rows[] = {
        {"no interface", "name=a", "a: the interface name names no interface"},
        {"the unspecified address", "addr=0.0.0.0", "eth0: the IPv4 address is not allowed here"},
        {"a loopback address", "addr=127.0.0.1", "eth0: the IPv4 address is not allowed here"},
        {"a multicast address", "addr=224.0.0.1", "eth0: the IPv4 address is not allowed here"},
        {"not an address", "addr=10.0.0.300", "eth0: the IPv4 address is missing or not valid"},
        {"the network", "addr=10.0.0.0", "eth0: the IPv4 address is the address of the network"},
        {"the broadcast address", "addr=10.0.0.255",
         "eth0: the IPv4 address is the broadcast address of the network"},
        {"global, no name", "addr6=2000:0::1 hostname=", valid, "addr6=2000::1 hostname=localhost"},
        {"a unique local address, one host bit", "addr6=fdff::1 prefix6=127", valid},
        {"a link-local address, a long name", "addr6=febf::1%eth0 " + longest, valid},
        {"no scope", "addr6=fe80::1", "eth0: the IPv6 address is missing or not valid"},
        {"the scope of no interface", "addr6=fe80::1%99",
         "eth0: the IPv6 address is missing or not valid"},
        {"a scope of a global address", "addr6=2001:db8::1%1",
         "eth0: the IPv6 address is missing or not valid"},
        {"beyond global", "addr6=4000::1", "eth0: the IPv6 address is not allowed here"},
        {"129 bits", "prefix6=129", "eth0: the IPv6 prefix length is out of range"},
        {"no host bit", "prefix6=128", "eth0: the IPv6 address is the address of the network"},
        {"an IPv4 gateway outside", "gw4=10.0.1.1", "the IPv4 gateway cannot be reached"},
        {"the network as gateway", "gw4=10.0.0.0",
         "eth0: the IPv4 gateway is the address of the network"},
        {"an IPv6 gateway within", "gw6=2001:DB8::F", valid, "gw6=2001:db8::f"},
        {"an IPv6 gateway outside", "gw6=fd00::9", "the IPv6 gateway cannot be reached"},
        {"the IPv6 network as gateway",
         "gw6=2001:db8::", "eth0: the IPv6 gateway is the address of the network"},
        {"DNS from a lease", "ipv6=DHCP dns=DHCP dns.iface=x", valid, "dns.iface=eth0"},
        {"no server", "server0=", "the first DNS server is missing or not valid"},
        {"a server that is no address", "server0=x",
         "the first DNS server is missing or not valid"},
        {"the network as server", "server0=10.0.0.0",
         "eth0: the first DNS server is the address of the network"},
        {"the IPv6 network as server",
         "server0=2001:db8::", "eth0: the first DNS server is the address of the network"},
        {"the broadcast address as server", "server0=10.0.0.255",
         "eth0: the first DNS server is the broadcast address of the network"},
        {"a server within, in short form", no_gateways + "server0=10.53", valid,
         "server0=10.0.0.53"},
        {"a server outside", no_gateways + "server0=9.9.9.9",
         "the first DNS server cannot be reached"},
        {"an IPv6 server outside", no_gateways + "server1=fd00::9",
         "the second DNS server cannot be reached"},
        {"servers beyond the gateways", "server0=9.9.9.9 server1=fd00::9", valid},
        {"servers beyond leases", no_gateways + "ipv4=DHCP ipv6=DHCP server1=fd00::9", valid},
        {"a host name of 65 characters", longest + "a", "the host name is not well-formed"},
        {"an underscore in the domain", "domain=a_b", "the DNS domain is not well-formed"},
    };
    for (const auto validate : {check_one, check_both}) {
        SCOPED_TRACE(validate == check_one ? "vlsys_address_check" : "vlsys_address_check2");
        for (const Row &row : rows)
            expect(row, validate);
        EXPECT_EQ(take_log(LOG_ERR),
                  "3 IPv4 address: 10.0.0.300: Name or service not known\n"
                  "3 IP address is the same as network address: 10.0.0.0\n"
                  "3 IP address is the same as broadcast address: 10.0.0.255\n"
                  "3 IPv6 address is the same as network address: 2001:db8::1\n"
                  "3 gateway address is unreachable: 10.0.1.1\n"
                  "3 gateway address is the same as network address: 10.0.0.0\n"
                  "3 IPv6 gateway address is unreachable: fd00::9\n"
                  "3 IPv6 gateway address is the same as network address: 2001:db8::\n"
                  "3 DNS primary server: x: Name or service not known\n"
                  "3 DNS server[0] address is the same as network address: 10.0.0.0\n"
                  "3 DNS server[0] address is the same as network address: 2001:db8::\n"
                  "3 DNS server[0] address is the same as broadcast address: 10.0.0.255\n"
                  "3 DNS server[0] address is unreachable: 9.9.9.9\n"
                  "3 DNS server[1] address is unreachable: fd00::9\n");
    }
}

TEST_F(NetworkSetting, TheValidatorOfOneInterfaceMendsWhatItCan) {
    expect({"learnt addresses", "ipv4=DHCP ipv6=Auto", valid}, check_one);
    EXPECT_EQ(take_log(), "6 vlsys_address_check: start (DHCP, Manual, Auto)\n"
                          "6 vlsys_address_check: OK (DHCP, Manual, Auto)\n");
    const Row rows[] = {
        {"a length", "netmask=8", valid, "netmask=255.0.0.0 broadcast=10.255.255.255"},
        {"31 is bits", "netmask=31", "eth0: the IPv4 netmask has a gap", "netmask=0.0.0.31"},
        {"all is off", "ipv4=Off gw4=x ipv6=Off gw6=x", valid, "dns=Off"},
        {"DNS from a lease, and no lease", "ipv6=Auto dns=DHCP", valid, "dns=Off"},
        {"a repeated server", "server1=10.0.0.9", valid, "server1="},
        {"an IPv4 server, and IPv4 is off", "ipv4=Off", "the first DNS server cannot be reached"},
        {"an IPv6 server, and IPv6 is off", "ipv6=Off server1=fd00::9",
         "the second DNS server cannot be reached"},
    };
    for (const Row &row : rows)
        expect(row, check_one);
    EXPECT_EQ(take_log(LOG_WARNING),
              "3 wrang bit pattern: 0.0.0.31(0000001f)\n"
              "4 Since both setup of IPv4 and IPv6 was OFF, DNS also turns OFF a setup.\n"
              "4 A setup of DNS was set to DHCP although neither of IPv4 and IPv6 of the setup was "
              "DHCP. DNS setting is fallback to OFF.\n"
              "3 Although IPv4 is OFF, DNS server[0] is IPv4 address: 10.0.0.9\n"
              "3 Although IPv6 is OFF, DNS server[1] is IPv6 address: fd00::9\n");
}

TEST_F(NetworkSetting, SeveralInterfacesMustGoTogether) {
    static const string gw4_mode = "the IPv4 gateway does not go with the modes of the interfaces";
    static const string gw6_mode = "the IPv6 gateway does not go with the modes of the interfaces";
    static const string dns_mode = "the DNS mode does not go with the modes of the interfaces";
    const Row rows[] = {
        {"the loopback", "name=lo", "lo: the interface name names no interface"},
        {"the longest prefix", "prefix=30", valid, "netmask=255.255.255.252 broadcast=10.0.0.11"},
        {"a netmask of 31 bits", "prefix=31 netmask=0xfffffffe",
         "eth0: the IPv4 netmask is missing or not valid", "netmask=255.255.255.254"},
        {"a subnet around the first", "eth1.ipv4=Manual eth1.addr=10.0.9.9",
         "the IPv4 address is in the subnet of another interface", "eth1.broadcast=10.0.255.255"},
        {"a subnet within the first", "eth1.ipv6=Manual eth1.addr6=2001:db8::9",
         "the IPv6 address is in the subnet of another interface"},
        {"the second's broadcast address as gateway", "eth1.ipv4=Manual gw4=10.1.255.255",
         "eth1: the IPv4 gateway is the broadcast address of the network", "gw4.iface=eth1"},
        {"a gateway, and IPv4 is off", "ipv4=Off", gw4_mode},
        {"a gateway, and IPv6 is off", "ipv6=Off", gw6_mode},
        {"learnt nowhere", "gw4.mode=DHCP gw4.iface=", "the IPv4 gateway is missing or not valid"},
        {"a gateway learnt from a fixed interface", "gw4.mode=DHCP", gw4_mode},
        {"a gateway learnt from one that is off", "gw6.mode=DHCP gw6.iface=eth1", gw6_mode},
        {"gateways without address", "gw4= gw6=", valid, no_gateways},
        {"DNS, and all is off", no_gateways + "ipv4=Off ipv6=Off", dns_mode},
        {"DNS from a lease, and no lease", "ipv6=Auto dns=DHCP", dns_mode},
        {"DNS from the second's lease", "eth1.ipv4=DHCP dns=DHCP", valid, "dns.iface=eth1"},
        {"DNS for the first interface that is on", no_gateways + "ipv4=Off ipv6=Off eth1.ipv4=DHCP",
         valid, "dns.iface=eth1"},
        {"the third server", "ipv6=Auto server2=::1", "the third DNS server is not allowed here"},
    };
    for (const Row &row : rows)
        expect(row, check_both);
    EXPECT_EQ(take_log(LOG_ERR),
              "3 10.0.0.10/24 and 10.0.9.9/16 have overlapped\n"
              "3 gateway address is the same as broadcast address: 10.1.255.255\n"
              "3 DNS is enable although all the network interfaces are OFF.\n"
              "3 A setup of DNS is DHCP although no setup of a network interface is DHCP.\n");
}

// Each row begins with every key in the interfaces' files.
TEST_F(NetworkSetting, ASettingIsWrittenKeyByKey) {
    const struct {
        const char *why, *setting, *changes, *log;
    } rows[] = {
        {"a learnt setting, no name",
         "ipv4=DHCP ipv6=DHCP eth1.ipv6=Auto gw4.mode=DHCP gw6.mode=DHCP gw6.iface=eth1 dns=DHCP "
         "hostname=",
         "network +HOSTNAME=localhost -GATEWAY "
         "ifcfg-eth0 +NM_CONTROLLED=no +ONBOOT=yes +BOOTPROTO=dhcp +IPV6INIT=yes "
         "+IPV6_AUTOCONF=yes +DHCPV6C=yes +PEERDNS=yes -GATEWAY -PREFIX -UUID -HWADDR -IPADDR "
         "-NETMASK -IPV6FORWARDING -IPV6_ROUTER -IPV6ADDR -DOMAIN -DNS1 -DNS2 -DEFROUTE -METRIC "
         "-GATEWAYDEV "
         "ifcfg-eth1 +NM_CONTROLLED=no +ONBOOT=yes +BOOTPROTO=none +IPV6INIT=yes "
         "+IPV6_AUTOCONF=yes +PEERDNS=no +DEFROUTE=no -GATEWAY -PREFIX -UUID -HWADDR -IPADDR "
         "-NETMASK -IPV6FORWARDING -IPV6_ROUTER -IPV6ADDR -DHCPV6C -DOMAIN -DNS1 -DNS2 -METRIC "
         "-GATEWAYDEV "
         "velmora +net.ipv6.conf.eth0.accept_ra_pinfo = 1 +net.ipv6.conf.eth1.disable_ipv6 = 0 "
         "+net.ipv6.conf.eth1.autoconf = 1 +net.ipv6.conf.eth1.accept_ra_pinfo = 1 "
         "+net.ipv6.conf.eth0.accept_ra_defrtr = 0 +net.ipv6.conf.eth1.accept_ra_defrtr = 1 ",
         "6 start checking: mode: D_DA01DDD 7 dns->mode: 2 7 dns->iface: eth0 "
         "4 Since hostname is empty, set \"localhost\" 6 vlsys_address_check2: OK "
         "6 IPv4 (eth0): DHCP 6 IPv6 (eth0): DHCP 6 IPv4 (eth1): OFF 6 IPv6 (eth1): AUTO "
         "6 IPv4 GW dhcp 7 eth0: delete DEFROUTE 7 eth1: DEFROUTE=no "
         "6 IPv6 GW dhcp 7 vlsys_get_ifname_list: 2 "
         "7 net.ipv6.conf.eth0.accept_ra_defrtr  0 "
         "6 IPv6 GW auto (eth1) 7 net.ipv6.conf.eth1.accept_ra_defrtr  1 "
         "7 /etc/sysconfig/network-scripts/ifcfg-eth0 6 DNS DHCP (eth0) "
         "7 /etc/sysconfig/network-scripts/ifcfg-eth1 7 PEERDNS=no (eth1) "
         "6 hostname: localhost "},
        {"a fixed setting", "gw6=2001:db8::9 server1=10.0.0.2 server2=10.0.0.9",
         "network +HOSTNAME=unit +GATEWAY=10.0.0.9 +IPV6_DEFAULTGW=2001:db8::9 "
         "ifcfg-eth0 +NM_CONTROLLED=no +ONBOOT=yes +BOOTPROTO=none +IPADDR=10.0.0.10 "
         "+NETMASK=255.255.255.0 +IPV6INIT=yes +IPV6_AUTOCONF=no +IPV6ADDR=2001:db8::1/64 "
         "+PEERDNS=yes +DOMAIN=a.example +DNS1=10.0.0.2 +DNS2=10.0.0.9 -GATEWAY -PREFIX -UUID "
         "-HWADDR -IPV6FORWARDING -IPV6_ROUTER -DHCPV6C -DEFROUTE -METRIC -GATEWAYDEV "
         "ifcfg-eth1 +NM_CONTROLLED=no +ONBOOT=no +IPV6INIT=no +IPV6_AUTOCONF=no +PEERDNS=no "
         "-GATEWAY -PREFIX -UUID -HWADDR -IPV6FORWARDING -IPV6_ROUTER -IPV6ADDR -DHCPV6C -DOMAIN "
         "-DNS1 -DNS2 -DEFROUTE -METRIC -GATEWAYDEV "
         "velmora +net.ipv6.conf.eth0.autoconf = 0 +net.ipv6.conf.eth0.accept_ra_pinfo = 0 "
         "+net.ipv6.conf.eth1.disable_ipv6 = 1 +net.ipv6.conf.eth0.accept_ra_defrtr = 1 ",
         "6 start checking: mode: M_M_MMM44 7 netmask: 24 -> 0xffffff00 "
         "7 dns->mode: 1 7 domain: a.example 7 server[0]: 10.0.0.9 7 server[1]: 10.0.0.2 "
         "7 dns->iface: eth0 6 vlsys_address_check2: OK "
         "6 IPv4 (eth0): 10.0.0.10/24 6 IPv6 (eth0): 2001:db8::1/64 "
         "6 IPv4 (eth1): OFF 6 IPv6 (eth1): OFF "
         "6 IPv4 GW 10.0.0.9 7 eth0: delete DEFROUTE 7 eth1: delete DEFROUTE "
         "6 IPv6 GW 2001:db8::9 7 vlsys_get_ifname_list: 2 "
         "6 IPv6 GW auto (eth0) 7 net.ipv6.conf.eth0.accept_ra_defrtr  1 "
         "6 IPv6 GW auto (eth1) 7 net.ipv6.conf.eth1.accept_ra_defrtr  1 "
         "7 /etc/sysconfig/network-scripts/ifcfg-eth0 6 DNS a.example, 10.0.0.2, 10.0.0.9 (eth0) "
         "7 /etc/sysconfig/network-scripts/ifcfg-eth1 7 PEERDNS=no (eth1) 6 hostname: unit "},
    };
    const string file = "GATEWAY=1\nPREFIX=1\nUUID=1\nHWADDR=1\nNM_CONTROLLED=1\nONBOOT=1\n"
                        "BOOTPROTO=1\nIPADDR=1\nNETMASK=1\nIPV6FORWARDING=1\nIPV6_ROUTER=1\n"
                        "IPV6INIT=1\nIPV6_AUTOCONF=1\nIPV6ADDR=1\nDHCPV6C=1\nPEERDNS=1\n"
                        "DOMAIN=1\nDNS1=1\nDNS2=1\nDEFROUTE=1\nMETRIC=1\nGATEWAYDEV=1\n";
    for (const auto &row : rows) {
        write_file(ifcfg + "eth0", file);
        write_file(ifcfg + "eth1", file);
        const Files before = unit_files();
        Records records = make(row.setting);
        EXPECT_EQ(set_network(records), 0) << row.why;
        EXPECT_EQ(records.step, VLSYS_STEP_NONE) << row.why;
        string log = take_log();
        std::replace(log.begin(), log.end(), '\n', ' ');
        EXPECT_EQ(log, row.log) << row.why;
        EXPECT_EQ(changes(before), row.changes) << row.why;
    }
}

TEST_F(NetworkSetting, TextThatNoCheckReadsStaysOutOfTheFiles) {
    Records records =
        make("ipv6=Auto addr6=$(touch/x) eth1.ipv4=DHCP eth1.addr=$(touch/x) "
             "eth1.netmask=$(touch/x) gw4.mode=DHCP gw4.iface=eth1 gw4=$(touch/x) gw6.mode=Auto "
             "gw6.iface=eth0 gw6=$(touch/x) dns=DHCP domain=$(touch/x) server0=$(touch/x)");
    EXPECT_EQ(set_network(records), 0);
    for (const auto &[path, content] : unit_files())
        EXPECT_EQ(content.find("$(touch/x)"), string::npos) << path;
    EXPECT_EQ(memmem(&records, sizeof records, "$(touch/x)", 10), nullptr) << "cleared, too";
}

TEST_F(NetworkSetting, ASettingThatNoSetterServesIsNotWritten) {
    const Files before = unit_files();
    for (const char *change : {"eth1.ipv4=Auto", "ipv6=4", "gw4.mode=Auto", "gw6.mode=4",
                               "dns=Auto", "eth1.name=eth0", "eth1.name=virbr0"})
        expect(
            {"no such mode, or no such list", change, "error 22: Invalid argument", "step=Check"},
            set_network);
    EXPECT_NE(take_log().find("3 vlsys_set_network: IPv6 gateway: no such mode: 4\n"),
              string::npos);
    run("ip link set eth1 down; ip link set eth1 name '$(x)'; ip link set '$(x)' up");
    expect({"a name that a shell would run", "gw6=fe80::1%$(x)",
            "the IPv6 gateway is missing or not valid", "step=Check"},
           set_network);
    EXPECT_EQ(changes(before), "");
}

TEST_F(NetworkSetting, WhatTheScriptsMayNotServeIsWarnedOf) {
    Records records = make("addr6=fe80::20%eth0 eth1.ipv4=DHCP gw4=10.9.9.1 eth1.ipv6=Auto "
                           "gw6=fd00:9::1");
    run("rm /etc/sysconfig/network; mkdir /etc/sysconfig/network"); // the gateway cannot be written
    EXPECT_EQ(set_network(records), EISDIR);
    EXPECT_EQ(records.step, VLSYS_STEP_IPV4_GATEWAY);
    const string log = take_log(LOG_WARNING);
    EXPECT_TRUE(log.starts_with(
        "4 eth0: the network scripts refuse a link-local IPv6 address: fe80::20%eth0\n"
        "4 the network scripts set an IPv4 gateway outside the fixed subnets only where a lease's "
        "subnet holds it: 10.9.9.1\n"
        "4 the network scripts set a global IPv6 gateway outside the fixed subnets only where its "
        "prefix is known before: fd00:9::1\n"))
        << log;
}
