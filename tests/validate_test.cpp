// The two validators of a network setting: what each refuses, and what it makes of what it takes.
#include "fixture.h"
#include "vlsys.h"

#include <cstring>
#include <sstream>
#include <sys/resource.h>

using namespace test;

enum {
    // Fields, of the first interface
    addr4 = VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_IPV4_ADDR, 0),
    mask4 = VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_IPV4_NETMASK, 0),
    gateway4 = VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_IPV4_GATEWAY, 0),
    domain = VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_DNS_DOMAIN, 0),
    server0 = VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_DNS_PRIMARY, 0),
    server1 = VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_DNS_SECONDARY, 0),
    addr6 = VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_IPV6_ADDR, 0),
    server2 = addr6,
    prefix6 = VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_IPV6_PREFIX, 0),
    gateway6 = VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_IPV6_GATEWAY, 0),
    hostname = VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_HOSTNAME, 0),
    interface = VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_IFNAME, 0),
    of_eth1 = VLSYS_CHECK_CODE(1, 0, 0) - VLSYS_CHECK_CODE(0, 0, 0), // added to a field
    // Kinds
    invalid = VLSYS_CHECK_KIND_INVALID,
    gap = VLSYS_CHECK_KIND_NETMASK,
    unreachable = VLSYS_CHECK_KIND_UNREACHABLE,
    syntax = VLSYS_CHECK_KIND_SYNTAX,
    network = VLSYS_CHECK_KIND_NETWORK,
    broadcast = VLSYS_CHECK_KIND_BROADCAST,
    too_long = VLSYS_CHECK_KIND_PREFIX,
    range = VLSYS_CHECK_KIND_RANGE,
    missing = VLSYS_CHECK_KIND_NO_IFACE,
    overlap = VLSYS_CHECK_KIND_OVERLAP,
    mode = VLSYS_CHECK_KIND_MODE,
    valid = 0
};

struct Setting {
    vlsys_ifconf nifs[3];
    vlsys_gw4 gw4;
    vlsys_gw6 gw6;
    vlsys_dns dns;
    char hostname[VLSYS_HOSTNAME_SIZE];
};

// A field of a setting by the name that rows use; one of at most 4 bytes is a number.
struct Field {
    std::string name;
    char *at;
    size_t size;

    bool is_number() const { return size <= sizeof(uint32_t); }
    std::string value() const {
        uint32_t number = 0;
        if (!is_number())
            return {at, strnlen(at, size)};
        memcpy(&number, at, size);
        return std::to_string(number);
    }
};

template <class Member>
static Field field(const std::string &name, Member &member) {
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
    std::string of;
    for (vlsys_ifconf &nif : s.nifs) {
        for (const Field &f :
             {field(of + "name", nif.name), field(of + "ipv4", nif.ipv4_mode),
              field(of + "addr", nif.addr), field(of + "netmask", nif.netmask),
              field(of + "prefix", nif.prefix), field(of + "broadcast", nif.broadaddr),
              field(of + "ipv6", nif.ipv6_mode), field(of + "addr6", nif.addr6[0].addr),
              field(of + "prefix6", nif.addr6[0].prefix)})
            fields.push_back(f);
        of = of.empty() ? "eth1." : "eth2.";
    }
    return fields;
}

static void put(const Field &f, const std::string &value) {
    static const std::map<std::string, uint32_t> modes = {{"Off", VLSYS_MODE_OFF},
                                                          {"Manual", VLSYS_MODE_MANUAL},
                                                          {"DHCP", VLSYS_MODE_DHCP},
                                                          {"Auto", VLSYS_MODE_AUTO}};
    if (f.is_number()) {
        const auto number = modes.contains(value) ? modes.at(value) : std::stoul(value);
        memcpy(f.at, &number, f.size);
    } else {
        strncpy(f.at, value.c_str(), f.size); // a text that fills its field has no NUL
    }
}

// A valid setting: eth0 has fixed addresses of both families, the other interfaces are off.
static const std::string start =
    "name=eth0 ipv4=Manual addr=10.0.0.10 netmask=255.255.255.0 prefix=24 "
    "broadcast=10.0.0.255 ipv6=Manual addr6=2001:db8::1 prefix6=64 "
    "eth1.name=eth1 eth1.addr=10.1.0.1 eth1.netmask=255.255.0.0 eth1.prefix=16 "
    "eth1.broadcast=10.1.255.255 eth1.addr6=fd00::1 eth1.prefix6=64 eth2.name=eth2 "
    "gw4.mode=Manual gw4=10.0.0.9 gw4.iface=eth0 gw6.mode=Manual gw6=fe80::1%eth0 "
    "dns=Manual domain=a.example server0=10.0.0.9 dns.iface=eth0 hostname=unit ";
static const std::string no_gateways = "gw4.mode=Off gw4= gw4.iface= gw6.mode=Off gw6= ";

// What the faults' messages have in common.
static const std::string is_unreachable = " address is unreachable: ";
static const std::string is_network = " address is the same as network address: ";
static const std::string is_broadcast = " address is the same as broadcast address: ";
static const std::string unknown = ": Name or service not known";

static Setting make(const std::string &text) {
    Setting setting = {};
    std::istringstream words(start + text);
    for (std::string word; words >> word;) {
        const size_t equals = word.find('=');
        for (const Field &f : fields_of(setting))
            if (f.name == word.substr(0, equals))
                put(f, word.substr(equals + 1));
    }
    return setting;
}

static int check_one(Setting &s) {
    return vlsys_address_check(&s.nifs[0], s.gw4.addr, s.gw6.addr, &s.dns, s.hostname);
}

static int check_several(Setting &s) {
    return vlsys_address_check2(s.nifs, 3, &s.gw4, &s.gw6, &s.dns, s.hostname);
}

struct Row {
    const char *why;
    std::string setting; // what is unlike the start
    int result;
    std::string log = {};   // the error or warning, if there is one
    std::string after = {}; // what has changed
};

static void expect(int (*check)(Setting &), const Row &row) {
    SCOPED_TRACE(check == check_one ? "one interface" : "several interfaces");
    SCOPED_TRACE(row.why);
    Setting result = make(row.setting);
    Setting expected = make(row.setting + " " + row.after);
    EXPECT_EQ(check(result), row.result);
    EXPECT_EQ(take_log(LOG_WARNING), row.log.empty() ? "" : row.log + "\n");
    const std::vector<Field> wanted = fields_of(expected);
    const std::vector<Field> fields = fields_of(result);
    for (size_t i = 0; i < fields.size(); i++)
        EXPECT_EQ(fields[i].value(), wanted[i].value()) << fields[i].name;
}

class Validate : public Unit {
  protected:
    void SetUp() override {
        Unit::SetUp();
        set_interfaces({"eth0", "eth2"});
    }
    static void one(const std::vector<Row> &rows) {
        for (const Row &row : rows)
            expect(check_one, row);
    }
    static void several(const std::vector<Row> &rows) {
        for (const Row &row : rows)
            expect(check_several, row);
    }
    static void both(const std::vector<Row> &rows) {
        one(rows);
        several(rows);
    }
};

TEST_F(Validate, AnInterfaceIsOneOfTheKernels) {
    run("ip link property add dev eth0 altname other");
    both({
        {"there is none of this name", "name=eth9", interface | missing},
        {"a path behind a colon", "name=eth0:/../../x", interface | missing},
        {"an alternative name", "name=other", interface | missing},
    });
    one({
        {"the loopback", "name=lo", valid, "", "dns.iface=lo"},
        {"eth1 is not here", "name=eth1", interface | missing},
    });
    several({
        {"the loopback", "name=lo", interface | missing},
        {"eth1 may be missing", "name=eth1", valid, "", "dns.iface=eth1 gw4.iface=eth1"},
        {"the second is missing", "eth1.name=eth9", of_eth1 + (interface | missing)},
    });
}

TEST_F(Validate, AKernelThatCannotBeAskedIsNoMissingInterface) {
    const rlimit few = {0, 4096};
    setrlimit(RLIMIT_NOFILE, &few);
    Setting setting = make("");
    EXPECT_EQ(check_one(setting), EMFILE);
    EXPECT_EQ(check_several(setting), EMFILE);
    const rlimit enough = {1024, 4096};
    setrlimit(RLIMIT_NOFILE, &enough);
}

TEST_F(Validate, AnIpv4AddressIsAHosts) {
    both({
        {"the lowest", "ipv4=DHCP gw4=0.0.0.1", valid},
        {"unspecified", "addr=0.0.0.0", addr4 | range},
        {"multicast", "addr=224.0.0.1", addr4 | range},
        {"no address", "addr=10.0.0.300", addr4 | invalid, "IPv4 address: 10.0.0.300" + unknown},
        {"the network", "addr=10.0.0.0", addr4 | network, "IP" + is_network + "10.0.0.0"},
        {"the broadcast address", "addr=10.0.0.255", addr4 | broadcast,
         "IP" + is_broadcast + "10.0.0.255"},
    });
    several({
        {"the second's", "eth1.ipv4=Manual eth1.addr=0.0.0.0", of_eth1 + (addr4 | range)},
    });
}

TEST_F(Validate, ANetmaskIsALengthOrBitsWithoutGap) {
    one({
        {"shortest length", "netmask=8", valid, "", "netmask=255.0.0.0 broadcast=10.255.255.255"},
        {"longest length", "netmask=30", valid, "", "netmask=255.255.255.252 broadcast=10.0.0.11"},
        {"31 is bits", "netmask=31", mask4 | gap, "wrang bit pattern: 0.0.0.31(0000001f)",
         "netmask=0.0.0.31"},
        {"all bits", "netmask=255.255.255.255 gw4=10.0.0.10", valid, "", "broadcast=10.0.0.10"},
    });
    several({
        {"shortest prefix", "prefix=8", valid, "", "netmask=255.0.0.0 broadcast=10.255.255.255"},
        {"a length", "prefix=0 netmask=16", valid, "",
         "netmask=255.255.0.0 prefix=16 broadcast=10.0.255.255"},
        {"31 is no prefix", "prefix=31", valid, "", "prefix=24"},
        {"seven bits", "prefix=0 netmask=254.0.0.0", mask4 | invalid},
        {"the second's", "eth1.ipv4=Manual eth1.prefix=0 eth1.netmask=255.0.255.0",
         of_eth1 + (mask4 | gap), "wrang bit pattern: 255.0.255.0(ff00ff00)", "eth1.prefix=8"},
        {"the second's", "eth1.ipv4=Manual eth1.prefix=0 eth1.netmask=x",
         of_eth1 + (mask4 | invalid), "IPv4 netmask: x" + unknown},
    });
}

TEST_F(Validate, AFixedIpv4GatewayIsAHostOfASubnet) {
    both({
        {"outside the subnet", "gw4=10.0.1.1", gateway4 | unreachable,
         "gateway" + is_unreachable + "10.0.1.1"},
        {"the network", "gw4=10.0.0.0", gateway4 | network, "gateway" + is_network + "10.0.0.0"},
        {"the broadcast address", "gw4=10.0.0.255", gateway4 | broadcast,
         "gateway" + is_broadcast + "10.0.0.255"},
        {"beside a lease, no address", "ipv4=DHCP gw4=x", gateway4 | invalid,
         "IPv4 defautl gateway : x" + unknown},
    });
    one({
        {"not looked at with IPv4 off", "ipv4=Off gw4=x dns=Off", valid},
        {"outside of all bits", "netmask=255.255.255.255", gateway4 | unreachable,
         "gateway" + is_unreachable + "10.0.0.9", "broadcast=10.0.0.10"},
    });
    several({
        {"IPv4 is off", "ipv4=Off", gateway4 | mode},
        {"of the second's subnet", "eth1.ipv4=Manual gw4=10.1.0.9", valid, "", "gw4.iface=eth1"},
        {"the second's network", "eth1.ipv4=Manual gw4=10.1.0.0", of_eth1 + (gateway4 | network),
         "gateway" + is_network + "10.1.0.0", "gw4.iface=eth1"},
        {"another interface learns", "eth2.ipv4=DHCP gw4=8.8.8.8", valid},
    });
}

TEST_F(Validate, AnIpv6AddressIsGlobalOrLocalWithItsInterface) {
    both({
        {"the lowest global one", "addr6=2000:0::1", valid, "", "addr6=2000::1"},
        {"unique local", "addr6=fdff::1", valid},
        {"link-local", "addr6=febf::1%eth0", valid},
        {"link-local without its interface", "addr6=fe80::1", addr6 | invalid},
        {"loopback", "addr6=::1", addr6 | range},
        {"just above the global ones", "addr6=4000::1", addr6 | range},
        {"site-local", "addr6=fec0::1", addr6 | range},
        {"no address", "addr6=x", addr6 | invalid, "IPv6 address: x" + unknown},
        {"the network", "addr6=2001:db8::", addr6 | network, "IPv6" + is_network + "2001:db8::"},
        {"one bit is the host's", "prefix6=127", valid},
        {"no bit is the host's", "prefix6=128", addr6 | network,
         "IPv6" + is_network + "2001:db8::1"},
        {"the prefix is too long", "prefix6=129", prefix6 | too_long},
    });
    several({
        {"the second's", "eth1.ipv6=Manual eth1.addr6=::1", of_eth1 + (addr6 | range)},
        {"the second's", "eth1.ipv6=Manual eth1.prefix6=129", of_eth1 + (prefix6 | too_long)},
    });
}

TEST_F(Validate, AFixedIpv6GatewayIsInASubnetOrLinkLocal) {
    both({
        {"in the subnet", "gw6=2001:DB8::FFFF", valid, "", "gw6=2001:db8::ffff"},
        {"link-local without its interface", "gw6=fe80::1", gateway6 | invalid},
        {"outside the subnet", "gw6=2001:db8:0:1::1", gateway6 | unreachable,
         "IPv6 gateway" + is_unreachable + "2001:db8:0:1::1"},
        {"the network", "gw6=2001:db8::", gateway6 | network,
         "IPv6 gateway" + is_network + "2001:db8::"},
        {"beside a learnt prefix, any", "ipv6=Auto gw6=fd00::1", valid},
        {"beside a lease, no address", "ipv6=DHCP gw6=x", gateway6 | invalid,
         "IPv6 default gateway: x" + unknown},
    });
    one({{"not looked at with IPv6 off", "ipv6=Off gw6=x", valid}});
    several({
        {"IPv6 is off", "ipv6=Off", gateway6 | mode},
        {"the second's network", "eth1.ipv6=Manual gw6=fd00::", of_eth1 + (gateway6 | network),
         "IPv6 gateway" + is_network + "fd00::"},
    });
}

TEST_F(Validate, ALearntGatewayNamesAnInterfaceThatLearns) {
    several({
        {"no interface", "gw4.mode=DHCP gw4.iface=", gateway4 | invalid},
        {"one with a fixed address", "gw4.mode=DHCP", gateway4 | mode},
        {"one that is off", "gw4.mode=DHCP gw4.iface=eth1", gateway4 | mode},
        {"one with a lease", "gw4.mode=DHCP gw4.iface=eth1 eth1.ipv4=DHCP", valid},
        {"no interface", "gw6.mode=Auto", gateway6 | invalid},
        {"one with a fixed address", "gw6.mode=Auto gw6.iface=eth0", gateway6 | mode},
        {"one that is off", "gw6.mode=DHCP gw6.iface=eth1", gateway6 | mode},
        {"one that learns", "gw6.mode=DHCP gw6.iface=eth1 eth1.ipv6=Auto", valid},
    });
}

TEST_F(Validate, AGatewayThatIsNotSetIsCleared) {
    several({
        {"off", "gw4.mode=Off gw6.mode=Off gw6.iface=eth0", valid, "", no_gateways + "gw6.iface="},
        {"no address", "gw4= gw6=", valid, "", no_gateways},
        {"an unknown mode", "gw4.mode=Auto gw6.mode=4", valid, "", no_gateways},
    });
}

TEST_F(Validate, TheSubnetsOfTwoInterfacesDoNotOverlap) {
    const std::string within = "eth1.ipv4=Manual eth1.prefix=24 eth1.netmask=255.255.255.0 "
                               "eth1.broadcast=10.0.0.255 eth1.addr=";
    several({
        {"beside each other", "eth1.ipv4=Manual eth1.ipv6=Manual", valid},
        {"the same address", within + "10.0.0.10", addr4 | overlap,
         "eth0 and eth1 is same address: 10.0.0.10"},
        {"within the first", within + "10.0.0.20", addr4 | overlap,
         "10.0.0.20/24 and 10.0.0.10/24 have overlapped"},
        {"around the first", "eth1.ipv4=Manual eth1.addr=10.0.9.9", addr4 | overlap,
         "10.0.0.10/24 and 10.0.9.9/16 have overlapped", "eth1.broadcast=10.0.255.255"},
        {"within the first", "eth1.ipv6=Manual eth1.addr6=2001:db8::9", addr6 | overlap},
        {"around the first", "eth1.ipv6=Manual eth1.addr6=2001:db8:9::9 eth1.prefix6=32",
         addr6 | overlap},
    });
}

TEST_F(Validate, DnsIsCarriedByAnInterfaceThatCan) {
    one({
        {"all is off", "ipv4=Off ipv6=Off", valid,
         "Since both setup of IPv4 and IPv6 was OFF, DNS also turns OFF a setup.", "dns=Off"},
        {"no lease", "ipv4=Auto ipv6=Auto dns=DHCP", valid,
         "A setup of DNS was set to DHCP although neither of IPv4 and IPv6 of the setup was DHCP. "
         "DNS setting is fallback to OFF.",
         "dns=Off"},
        {"the interface", "dns=Off dns.iface=eth9", valid, "", "dns.iface=eth0"},
    });
    both({
        {"an IPv4 lease", "ipv4=DHCP dns=DHCP", valid},
        {"an IPv6 lease", "ipv6=DHCP dns=DHCP", valid},
    });
    several({
        {"all is off", no_gateways + "ipv4=Off ipv6=Off", domain | mode,
         "DNS is enable although all the network interfaces are OFF."},
        {"no lease", "ipv6=Auto dns=DHCP", domain | mode,
         "A setup of DNS is DHCP although no setup of a network interface is DHCP."},
        {"the first lease", "eth1.ipv4=Auto eth2.ipv6=DHCP dns=DHCP", valid, "", "dns.iface=eth2"},
        {"the first that is on", no_gateways + "ipv4=Off ipv6=Off eth1.ipv6=Auto eth2.ipv4=DHCP",
         valid, "", "dns.iface=eth1"},
        {"off", "dns=Off dns.iface=eth9", valid},
    });
}

TEST_F(Validate, ADnsServerCanBeReached) {
    both({
        {"no domain", "domain=", valid},
        {"a malformed domain", "domain=a_b", domain | syntax},
        {"no server", "server0=", server0 | invalid},
        {"no address", "server0=x", server0 | invalid, "DNS primary server: x" + unknown},
        {"loopback", "server0=127.0.0.1", server0 | range},
        {"in the subnet", no_gateways + "server0=10.53", valid, "", "server0=10.0.0.53"},
        {"outside it", no_gateways + "server0=9.9.9.9", server0 | unreachable,
         "DNS server[0]" + is_unreachable + "9.9.9.9"},
        {"beyond a gateway", "server0=9.9.9.9 server1=fd00::53", valid},
        {"the network", "server0=10.0.0.0", server0 | network,
         "DNS server[0]" + is_network + "10.0.0.0"},
        {"the broadcast address", "server0=10.0.0.255", server0 | broadcast,
         "DNS server[0]" + is_broadcast + "10.0.0.255"},
        {"in the IPv6 subnet", no_gateways + "server1=2001:DB8::53", valid, "",
         "server1=2001:db8::53"},
        {"outside it", no_gateways + "server1=fd00::53", server1 | unreachable,
         "DNS server[1]" + is_unreachable + "fd00::53"},
        {"the IPv6 network", "server1=2001:db8::", server1 | network,
         "DNS server[1]" + is_network + "2001:db8::"},
        {"no IPv6 address", "server1=:", server1 | invalid, "DNS secondary server: :" + unknown},
        {"beside leases", no_gateways + "ipv4=DHCP ipv6=DHCP server0=9.9.9.9 server1=fd00::1",
         valid},
    });
    one({
        {"IPv4 is off", "ipv4=Off server0=8.8.8.8", server0 | unreachable,
         "Although IPv4 is OFF, DNS server[0] is IPv4 address: 8.8.8.8"},
        {"IPv6 is off", "ipv6=Off server0=fd00::1", server0 | unreachable,
         "Although IPv6 is OFF, DNS server[0] is IPv6 address: fd00::1"},
        {"no host bits", "server0=10.9.9.0", server0 | network,
         "DNS server[0]" + is_network + "10.9.9.0"},
        {"the second repeats the first", "server1=10.0.0.9", valid, "", "server1="},
        {"the second alone", "server0= server1=10.0.0.9", server0 | invalid},
        {"the third is not looked at", "server2=x", valid},
    });
    several({
        {"IPv4 is off", no_gateways + "ipv4=Off", server0 | unreachable,
         "DNS server[0]" + is_unreachable + "10.0.0.9"},
        {"IPv6 is off", no_gateways + "ipv6=Off server1=fd00::1", server1 | unreachable,
         "DNS server[1]" + is_unreachable + "fd00::1"},
        {"the third repeats the first", "server2=10.0.0.9", valid, "", "server0="},
        {"the third is no address", "server2=x", server2 | invalid, "IPv6 address: x" + unknown},
        {"the second's broadcast address", "eth1.ipv4=Manual server0=10.1.255.255",
         of_eth1 + (server0 | broadcast), "DNS server[0]" + is_broadcast + "10.1.255.255"},
        {"an interface learns",
         no_gateways + "eth1.ipv4=DHCP eth1.ipv6=Auto server0=9.9.9.9 server1=fd00::53", valid},
    });
}

TEST_F(Validate, AHostNameIsWellFormed) {
    const std::string label(62, 'a');
    both({
        {"64 characters", "hostname=a." + label, valid},
        {"65 characters", "hostname=aa." + label, hostname | syntax},
        {"a hyphen in front", "hostname=-a", hostname | syntax},
        {"none", "hostname=", valid, "Since hostname is empty, set \"localhost\"",
         "hostname=localhost"},
    });
}

TEST_F(Validate, TheModesAndTheResultAreLogged) {
    Setting one = make("ipv4=DHCP ipv6=Auto");
    check_one(one);
    EXPECT_EQ(take_log(), "6 vlsys_address_check: start (DHCP, Manual, Auto)\n"
                          "6 vlsys_address_check: OK (DHCP, Manual, Auto)\n");
    const std::pair<const char *, const char *> rows[] = {
        {"", "M_M_MMM4_"},
        {"ipv4=DHCP eth1.ipv6=Auto gw4.mode=DHCP server0=:: server1=1", "D_MA0MM64"},
        {"ipv4=Auto eth1.ipv6=DHCP gw4.mode=DHCP gw4.iface=eth1 dns=DHCP", "?_MD1MDDD"},
        {"ipv6=4 gw4.mode=Auto gw6.mode=Auto gw6.iface=eth1 dns=Auto", "M_?_?1???"},
        {"gw4.mode=DHCP gw4.iface=eth2 gw6.mode=Off dns=Off", "M_M_!____"},
    };
    for (const auto &[setting, letters] : rows) {
        Setting several = make(setting);
        check_several(several);
        EXPECT_TRUE(logged(LOG_INFO, std::string("start checking: mode: ") + letters));
    }
    EXPECT_TRUE(logged(LOG_INFO, "vlsys_address_check2: OK"));
    EXPECT_TRUE(logged(LOG_INFO, "vlsys_address_check2: NG (0x13b)"));
}
