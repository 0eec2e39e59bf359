// A whole network setting: what the validators refuse of it and make of it, how it is applied.
#include "fixture.h"
#include "vlsys.h"

#include <algorithm>
#include <cstring>
#include <sstream>

using namespace test;
using std::string;

struct Setting {
    vlsys_ifconf nifs[2];
    vlsys_gw4 gw4;
    vlsys_gw6 gw6;
    vlsys_dns dns;
    char hostname[VLSYS_HOSTNAME_SIZE];
};

// A field of a setting by the name that rows use; one of at most 4 bytes is a number.
struct Field {
    string name;
    char *at;
    size_t size;

    bool is_number() const { return size <= sizeof(uint32_t); }
    string value() const { return {at, is_number() ? size : strnlen(at, size)}; }
};

template <class Member>
static Field field(const string &name, Member &member) {
    return {name, reinterpret_cast<char *>(&member), sizeof member};
}

static std::vector<Field> fields_of(Setting &s) {
    std::vector<Field> fields = {
        field("gw4", s.gw4.addr),          field("gw4.iface", s.gw4.iface),
        field("gw4.mode", s.gw4.mode),     field("gw6", s.gw6.addr),
        field("gw6.iface", s.gw6.iface),   field("gw6.mode", s.gw6.mode),
        field("dns", s.dns.mode),          field("domain", s.dns.domain),
        field("server0", s.dns.server[0]), field("server1", s.dns.server[1]),
        field("server2", s.dns.server[2]), field("dns.iface", s.dns.iface),
        field("hostname", s.hostname)};
    string of;
    for (vlsys_ifconf &nif : s.nifs) {
        for (const Field &f :
             {field(of + "name", nif.name), field(of + "ipv4", nif.ipv4_mode),
              field(of + "addr", nif.addr), field(of + "netmask", nif.netmask),
              field(of + "prefix", nif.prefix), field(of + "broadcast", nif.broadaddr),
              field(of + "ipv6", nif.ipv6_mode), field(of + "addr6", nif.addr6[0].addr),
              field(of + "prefix6", nif.addr6[0].prefix)})
            fields.push_back(f);
        of = "eth1.";
    }
    return fields;
}

static void put(const Field &f, const string &value) {
    static const std::map<string, uint32_t> modes = {{"Off", VLSYS_MODE_OFF},
                                                     {"Manual", VLSYS_MODE_MANUAL},
                                                     {"DHCP", VLSYS_MODE_DHCP},
                                                     {"Auto", VLSYS_MODE_AUTO}};
    if (f.is_number()) {
        const auto number = modes.contains(value) ? modes.at(value) : std::stoul(value);
        memcpy(f.at, &number, f.size);
    } else {
        vlsys_strlcpy(f.at, value.c_str(), f.size);
    }
}

// A setting that passes, with these changes. eth0 has fixed addresses of both families; eth1 is
// off, but has addresses to be switched on.
static Setting make(const string &changes) {
    static const string start =
        "name=eth0 ipv4=Manual addr=10.0.0.10 netmask=255.255.255.0 prefix=24 "
        "broadcast=10.0.0.255 ipv6=Manual addr6=2001:db8::1 prefix6=64 "
        "eth1.name=eth1 eth1.addr=10.1.0.1 eth1.netmask=255.255.0.0 eth1.prefix=16 "
        "eth1.broadcast=10.1.255.255 eth1.addr6=fd00::1 eth1.prefix6=64 "
        "gw4.mode=Manual gw4=10.0.0.9 gw4.iface=eth0 gw6.mode=Manual gw6=fe80::1%eth0 "
        "dns=Manual domain=a.example server0=10.0.0.9 dns.iface=eth0 hostname=unit ";
    Setting setting = {};
    std::istringstream words(start + changes);
    for (string word; words >> word;)
        for (const Field &f : fields_of(setting))
            if (word.starts_with(f.name + "="))
                put(f, word.substr(f.name.size() + 1));
    return setting;
}

enum Validators { one, several, both };

struct Row {
    const char *why;
    Validators validators;
    string setting;     // what is unlike the start
    const char *result; // the code in words
    string after;       // what has changed
};

static void expect(Validators validator, const Row &row) {
    SCOPED_TRACE(row.why + string(validator == one ? " (one)" : " (several)"));
    Setting s = make(row.setting);
    Setting wanted = make(row.setting + " " + row.after);
    const int code = validator == one
                         ? vlsys_address_check(s.nifs, s.gw4.addr, s.gw6.addr, &s.dns, s.hostname)
                         : vlsys_address_check2(s.nifs, 2, &s.gw4, &s.gw6, &s.dns, s.hostname);
    char text[160];
    vlsys_check_text(code, s.nifs, 2, text, sizeof text);
    EXPECT_STREQ(text, row.result);
    for (size_t i = 0; i < fields_of(s).size(); i++)
        EXPECT_EQ(fields_of(s)[i].value(), fields_of(wanted)[i].value()) << fields_of(s)[i].name;
}

static void check(const std::vector<Row> &rows) {
    for (const Row &row : rows) {
        if (row.validators != several)
            expect(one, row);
        if (row.validators != one)
            expect(several, row);
    }
}

class NetworkSetting : public Unit {
  protected:
    void SetUp() override {
        Unit::SetUp();
        set_interfaces({"eth0", "eth1"});
    }
};

static constexpr char valid[] = "no fault";
static constexpr char gateway4_mode[] =
    "the IPv4 gateway does not go with the modes of the interfaces";
static constexpr char gateway6_mode[] =
    "the IPv6 gateway does not go with the modes of the interfaces";
static constexpr char dns_mode[] = "the DNS mode does not go with the modes of the interfaces";
static const string no_gateways = "gw4.mode=Off gw4= gw4.iface= gw6.mode=Off gw6= ";

TEST_F(NetworkSetting, AnInterfaceIsOneOfTheKernels) {
    set_interfaces({"eth0"}); // eth1 may be missing
    check({
        {"none of this name", both, "name=a", "a: the interface name names no interface"},
        {"the loopback", several, "name=lo", "lo: the interface name names no interface"},
    });
}

TEST_F(NetworkSetting, AnIpv4AddressIsAHosts) {
    check({
        {"unspecified", both, "addr=0.0.0.0", "eth0: the IPv4 address is not allowed here"},
        {"loopback", both, "addr=127.0.0.1", "eth0: the IPv4 address is not allowed here"},
        {"multicast", both, "addr=224.0.0.1", "eth0: the IPv4 address is not allowed here"},
        {"no address", both, "addr=10.0.0.300", "eth0: the IPv4 address is missing or not valid"},
        {"network", both, "addr=10.0.0.0", "eth0: the IPv4 address is the address of the network"},
        {"broadcast address", both, "addr=10.0.0.255",
         "eth0: the IPv4 address is the broadcast address of the network"},
    });
}

TEST_F(NetworkSetting, ANetmaskIsALengthOrBitsWithoutGap) {
    check({
        {"shortest", one, "netmask=8", valid, "netmask=255.0.0.0 broadcast=10.255.255.255"},
        {"31 is bits", one, "netmask=31", "eth0: the IPv4 netmask has a gap", "netmask=0.0.0.31"},
        {"one address", one, "netmask=255.255.255.255", "the IPv4 gateway cannot be reached",
         "broadcast=10.0.0.10"},
        {"longest", several, "prefix=30", valid, "netmask=255.255.255.252 broadcast=10.0.0.11"},
        {"31 is no prefix", several, "prefix=31", valid, "prefix=24"},
    });
}

TEST_F(NetworkSetting, AnIpv6AddressIsGlobalOrLocalWithItsInterface) {
    check({
        {"global", both, "addr6=2000:0::1", valid, "addr6=2000::1"},
        {"unique local", both, "addr6=fdff::1", valid},
        {"link-local", both, "addr6=febf::1%eth0", valid},
        {"no scope", both, "addr6=fe80::1", "eth0: the IPv6 address is missing or not valid"},
        {"site-local", both, "addr6=fec0::1", "eth0: the IPv6 address is not allowed here"},
        {"beyond global", both, "addr6=4000::1", "eth0: the IPv6 address is not allowed here"},
        {"one host bit", both, "prefix6=127", valid},
        {"none", both, "prefix6=128", "eth0: the IPv6 address is the address of the network"},
    });
}

TEST_F(NetworkSetting, AFixedGatewayCanBeReached) {
    check({
        {"outside", both, "gw4=10.0.1.1", "the IPv4 gateway cannot be reached"},
        {"network", both, "gw4=10.0.0.0", "eth0: the IPv4 gateway is the address of the network"},
        {"no address", both, "ipv4=DHCP gw4=x", "the IPv4 gateway is missing or not valid"},
        {"beyond another's lease", several, "eth1.ipv4=DHCP gw4=8.8.8.8", valid},
        {"IPv4 is off", several, "ipv4=Off", gateway4_mode},
        {"the second's broadcast address", several, "eth1.ipv4=Manual gw4=10.1.255.255",
         "eth1: the IPv4 gateway is the broadcast address of the network", "gw4.iface=eth1"},
        {"within", both, "gw6=2001:DB8::F", valid, "gw6=2001:db8::f"},
        {"outside", both, "gw6=fd00::9", "the IPv6 gateway cannot be reached"},
        {"no address", both, "ipv6=DHCP gw6=x", "the IPv6 gateway is missing or not valid"},
        {"network", both, "gw6=2001:db8::", "eth0: the IPv6 gateway is the address of the network"},
        {"IPv6 is off", several, "ipv6=Off", gateway6_mode},
        {"not read when off", one, "ipv4=Off gw4=x ipv6=Off gw6=x dns=Off", valid},
    });
}

TEST_F(NetworkSetting, AnotherGatewayIsLearntOrCleared) {
    check({
        {"no interface", several,
         "gw4.mode=DHCP gw4.iface=", "the IPv4 gateway is missing or not valid"},
        {"from a fixed one", several, "gw4.mode=DHCP", gateway4_mode},
        {"from one that is off", several, "gw6.mode=DHCP gw6.iface=eth1", gateway6_mode},
        {"from a lease", several, "eth1.ipv4=DHCP gw4.mode=DHCP gw4.iface=eth1", valid},
        {"no address", several, "gw4= gw6=", valid, no_gateways},
        {"unknown modes", several, "gw4.mode=Auto gw6.mode=4", valid, no_gateways},
    });
}

TEST_F(NetworkSetting, TheSubnetsOfTwoInterfacesDoNotOverlap) {
    check({
        {"around the first", several, "eth1.ipv4=Manual eth1.addr=10.0.9.9",
         "the IPv4 address is in the subnet of another interface", "eth1.broadcast=10.0.255.255"},
        {"within the first", several, "eth1.ipv6=Manual eth1.addr6=2001:db8::9",
         "the IPv6 address is in the subnet of another interface"},
    });
    EXPECT_TRUE(logged(LOG_ERR, "10.0.0.10/24 and 10.0.9.9/16 have overlapped"));
}

TEST_F(NetworkSetting, DnsIsCarriedByAnInterfaceThatCan) {
    check({
        {"all is off", one, "ipv4=Off ipv6=Off", valid, "dns=Off"},
        {"no lease", one, "ipv6=Auto dns=DHCP", valid, "dns=Off"},
        {"a lease", both, "ipv6=DHCP dns=DHCP", valid},
        {"all is off", several, no_gateways + "ipv4=Off ipv6=Off", dns_mode},
        {"no lease", several, "ipv6=Auto dns=DHCP", dns_mode},
        {"the second's lease", several, "eth1.ipv6=DHCP dns=DHCP", valid, "dns.iface=eth1"},
    });
}

TEST_F(NetworkSetting, ADnsServerCanBeReached) {
    check({
        {"no server", both, "server0=", "the first DNS server is missing or not valid"},
        {"network", both, "server0=10.0.0.0",
         "eth0: the first DNS server is the address of the network"},
        {"broadcast address", both, "server0=10.0.0.255",
         "eth0: the first DNS server is the broadcast address of the network"},
        {"within", both, no_gateways + "server0=10.53", valid, "server0=10.0.0.53"},
        {"outside", both, no_gateways + "server0=9.9.9.9",
         "the first DNS server cannot be reached"},
        {"outside", both, no_gateways + "server1=fd00::9",
         "the second DNS server cannot be reached"},
        {"beyond gateways", both, "server0=9.9.9.9 server1=fd00::9", valid},
        {"beyond leases", both, no_gateways + "ipv4=DHCP ipv6=DHCP server1=fd00::9", valid},
        {"IPv4 is off", both, no_gateways + "ipv4=Off", "the first DNS server cannot be reached"},
        {"a repeated one", one, "server1=10.0.0.9", valid, "server1="},
        {"a repeated one", several, "server2=10.0.0.9", valid, "server0="},
    });
}

TEST_F(NetworkSetting, ANameIsWellFormed) {
    const string longest = "hostname=a." + string(62, 'a');
    check({
        {"none", both, "hostname=", valid, "hostname=localhost"},
        {"64 characters", both, longest, valid},
        {"65 characters", both, longest + "a", "the host name is not well-formed"},
        {"an underscore", both, "domain=a_b", "the DNS domain is not well-formed"},
    });
}

TEST_F(NetworkSetting, TheModesAreLogged) {
    check({{"leases", one, "ipv4=DHCP ipv6=Auto", valid}});
    EXPECT_TRUE(logged(LOG_INFO, "vlsys_address_check: start (DHCP, Manual, Auto)"));
    EXPECT_TRUE(logged(LOG_INFO, "vlsys_address_check: OK (DHCP, Manual, Auto)"));
    check({{"learnt", several, "eth1.ipv4=DHCP gw4.mode=DHCP gw4.iface=eth1 server1=::",
            "the second DNS server is not allowed here"}});
    EXPECT_TRUE(logged(LOG_INFO, "start checking: mode: MDM_1MM46"));
    EXPECT_TRUE(logged(LOG_INFO, "vlsys_address_check2: NG (0x168)"));
}

static int apply(Setting &s, int *step) {
    return vlsys_set_network(s.nifs, 2, &s.gw4, &s.gw6, &s.dns, s.hostname, step);
}

static string one_line(string text) {
    std::replace(text.begin(), text.end(), '\n', ' ');
    return text;
}

// Each row begins with what the one before has left.
TEST_F(NetworkSetting, IsWrittenKeyByKey) {
    const struct {
        const char *why, *setting, *changes, *log;
    } rows[] = {
        {"fixed", "server1=10.0.0.2",
         "network +GATEWAY=10.0.0.9 +IPV6_DEFAULTGW=fe80::1%eth0 ifcfg-eth0 +BOOTPROTO=none "
         "+IPV6_AUTOCONF=no +NM_CONTROLLED=no +IPADDR=10.0.0.10 +NETMASK=255.255.255.0 "
         "+IPV6ADDR=2001:db8::1/64 +PEERDNS=yes +DOMAIN=a.example +DNS1=10.0.0.9 +DNS2=10.0.0.2 "
         "-UUID -HWADDR -PREFIX -IPV6FORWARDING -IPV6_ROUTER -METRIC -GATEWAYDEV ifcfg-eth1 "
         "+PEERDNS=no -METRIC -GATEWAYDEV velmora +net.ipv6.conf.eth0.autoconf = 0 "
         "+net.ipv6.conf.eth0.accept_ra_pinfo = 0 +net.ipv6.conf.eth0.accept_ra_defrtr = 1 "
         "+net.ipv6.conf.eth1.accept_ra_defrtr = 1 ",
         "IPv4 (eth0): 10.0.0.10/24 IPv6 (eth0): 2001:db8::1/64 IPv4 GW 10.0.0.9 "
         "IPv6 GW fe80::1%eth0 IPv6 GW auto (eth0) IPv6 GW auto (eth1) "
         "DNS a.example, 10.0.0.9, 10.0.0.2 (eth0) "},
        {"learnt from leases",
         "ipv4=DHCP ipv6=DHCP gw4.mode=DHCP gw4= gw6.mode=DHCP gw6= gw6.iface=eth1 dns=DHCP",
         "network -GATEWAY -IPV6_DEFAULTGW ifcfg-eth0 +BOOTPROTO=dhcp +IPV6_AUTOCONF=yes "
         "+DHCPV6C=yes -IPADDR -NETMASK -IPV6ADDR -DOMAIN -DNS1 -DNS2 ifcfg-eth1 +DEFROUTE=no "
         "velmora +net.ipv6.conf.eth0.autoconf = 1 +net.ipv6.conf.eth0.accept_ra_pinfo = 1 "
         "+net.ipv6.conf.eth0.accept_ra_defrtr = 0 ",
         "IPv4 (eth0): DHCP IPv6 (eth0): DHCP IPv4 GW dhcp IPv6 GW dhcp IPv6 GW auto (eth1) "
         "DNS DHCP (eth0) "},
        {"unknown modes", "ipv4=Off ipv6=4 gw4= gw6.mode=4 gw6= gw6.iface=eth0 dns=4",
         "ifcfg-eth0 +BOOTPROTO=none +DOMAIN=a.example +DNS1=10.0.0.9 -DHCPV6C ifcfg-eth1 "
         "-DEFROUTE velmora +net.ipv6.conf.eth0.accept_ra_defrtr = 1 "
         "+net.ipv6.conf.eth1.accept_ra_defrtr = 0 ",
         "IPv4 (eth0): OFF IPv6 (eth0): AUTO IPv4 GW none IPv6 GW auto IPv6 GW auto (eth0) "
         "DNS a.example, 10.0.0.9,  (eth0) "},
        {"off", "ipv4=Off ipv6=Off gw4.mode=Off gw4= gw4.iface= gw6.mode=Off gw6= dns=Off",
         "ifcfg-eth0 +ONBOOT=no +IPV6INIT=no +IPV6_AUTOCONF=no +PEERDNS=no +DEFROUTE=no -DOMAIN "
         "-DNS1 ifcfg-eth1 +DEFROUTE=no velmora +net.ipv6.conf.eth0.disable_ipv6 = 1 "
         "+net.ipv6.conf.eth0.accept_ra_defrtr = 0 ",
         "IPv4 (eth0): OFF IPv6 (eth0): OFF IPv4 GW none IPv6 GW none DNS OFF (eth0) "},
    };
    run("for i in 0 1; do printf 'PREFIX=1\\nIPV6FORWARDING=1\\nIPV6_ROUTER=1\\nMETRIC=1\\n"
        "GATEWAYDEV=1\\n' >>/etc/sysconfig/network-scripts/ifcfg-eth$i; done");
    for (const auto &row : rows) {
        const Files before = unit_files();
        const Setting setting = make(row.setting);
        EXPECT_EQ(vlsys_set_netif("eth0", &setting.nifs[0]), 0);
        EXPECT_EQ(vlsys_set_ipv4_default_gateway2(&setting.gw4), 0);
        EXPECT_EQ(vlsys_set_ipv6_default_gateway2(&setting.gw6), 0);
        EXPECT_EQ(vlsys_set_dns_settings(&setting.dns), 0);
        EXPECT_EQ(one_line(take_log(LOG_INFO)), row.log) << row.why;
        EXPECT_EQ(one_line(changes(before)), row.changes) << row.why;
    }
}

TEST_F(NetworkSetting, IsAppliedToTheLastStep) {
    Setting setting = make("server2=10.0.0.9 server1=10.0.0.2");
    int step = -1;
    EXPECT_EQ(apply(setting, &step), 0);
    EXPECT_EQ(step, VLSYS_STEP_NONE);
    EXPECT_STREQ(setting.dns.server[0], "10.0.0.2") << "of equal ones the last stays, and moves up";
    EXPECT_EQ(capture("grep -h HOSTNAME /etc/sysconfig/network").text, "HOSTNAME=unit\n");
}

TEST_F(NetworkSetting, TextThatNoCheckReadsStaysOutOfTheFiles) {
    static constexpr char text[] = "$(touch/x)";
    Setting setting =
        make("ipv6=Auto addr6=$(touch/x) eth1.ipv4=DHCP eth1.addr=$(touch/x) "
             "eth1.netmask=$(touch/x) gw4.mode=DHCP gw4.iface=eth1 gw4=$(touch/x) gw6.mode=Auto "
             "gw6.iface=eth0 gw6=$(touch/x) dns=DHCP domain=$(touch/x) server0=$(touch/x)");
    EXPECT_EQ(apply(setting, nullptr), 0);
    for (const auto &[path, content] : unit_files())
        EXPECT_EQ(content.find(text), string::npos) << path;
    EXPECT_EQ(memmem(&setting, sizeof setting, text, strlen(text)), nullptr)
        << "the records are cleared, too";
}

TEST_F(NetworkSetting, WhatNoSetterCanServeIsRefusedBeforeAnythingIsWritten) {
    const Files before = unit_files();
    for (const char *change : {"eth1.ipv4=Auto", "ipv6=4", "gw4.mode=Auto", "gw6.mode=4",
                               "dns=Auto", "eth1.name=eth0", "eth1.name=virbr0"}) {
        Setting setting = make(change);
        int step = -1;
        EXPECT_EQ(apply(setting, &step), EINVAL) << change;
        EXPECT_EQ(step, VLSYS_STEP_CHECK) << change;
        EXPECT_EQ(changes(before), "") << change;
    }
}

TEST_F(NetworkSetting, AnInterfaceThatAShellWouldRunIsNoScope) {
    run("ip link set eth1 down; ip link set eth1 name '$(x)'; ip link set '$(x)' up");
    Setting setting = make("gw6=fe80::1%$(x)");
    EXPECT_EQ(apply(setting, nullptr),
              VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_IPV6_GATEWAY, VLSYS_CHECK_KIND_INVALID));
}

TEST_F(NetworkSetting, TheStepThatFailedIsNamed) {
    Setting setting = make("");
    int step = -1;
    run("rm /etc/sysconfig/network && mkdir -p /etc/sysconfig/network/full");
    EXPECT_EQ(apply(setting, &step), EISDIR);
    EXPECT_EQ(step, VLSYS_STEP_IPV4_GATEWAY);
    set_interfaces({"eth0"}); // the check lets a missing eth1 pass
    EXPECT_EQ(apply(setting, &step), ENXIO);
    EXPECT_EQ(step, VLSYS_STEP_NETIF);
}

TEST_F(NetworkSetting, AWarningSaysWhatTheScriptsDoNotServe) {
    const struct {
        const char *change, *warning;
    } rows[] = {
        {"", ""},
        {"ipv6=Auto gw6=fd00:9::1",
         "the network scripts set a global IPv6 gateway outside the fixed subnets only where its "
         "prefix is known before: fd00:9::1\n"},
        {"addr6=fe80::20%eth0",
         "eth0: the network scripts refuse a link-local IPv6 address: fe80::20%eth0\n"},
        {"eth1.ipv4=DHCP gw4=10.9.9.1",
         "the network scripts set an IPv4 gateway outside the fixed subnets only where a lease's "
         "subnet holds it: 10.9.9.1\n"},
    };
    for (const auto &row : rows) {
        Setting setting = make(row.change);
        EXPECT_EQ(apply(setting, nullptr), 0);
        EXPECT_EQ(take_log(LOG_WARNING), row.warning);
    }
}

TEST(CheckText, SaysEveryResultInWords) {
    const vlsys_ifconf nif = {.name = "eth0"};
    const struct {
        const char *why;
        int code;
        const char *text;
    } rows[] = {
        {"there is no fixed IPv6 address",
         VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_IPV6_ADDR, VLSYS_CHECK_KIND_INVALID),
         "the third DNS server is missing or not valid"},
        {"no field", VLSYS_CHECK_CODE(0, 0, VLSYS_CHECK_KIND_SYNTAX), "unknown fault 0x104"},
        {"an errno value", EFAULT, "error 14: Bad address"},
    };
    for (const auto &row : rows) {
        char text[60];
        EXPECT_EQ(vlsys_check_text(row.code, &nif, 1, text, sizeof text), strlen(row.text));
        EXPECT_STREQ(text, row.text) << row.why;
    }
}
