#include "core/paths.h"
#include "fixture.h"
#include "netconf/edit.h"
#include "netconf/get_mode.h"
#include "netconf/hostname.h"
#include "netconf/interfaces.h"
#include "vlsys.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <sstream>
#include <tuple>
#include <unistd.h>

using namespace test;
using namespace vlsys;

using Netconf = Unit;
using Items = std::vector<edit_item>;

static int edit_all(const char *path, const Items &items) {
    return edit(path, items.data(), static_cast<uint32_t>(items.size()));
}

TEST_F(Netconf, EditRewritesLines) {
    const std::string huge(1 << 20, 'x');
    const std::string odd = std::string("A\0B=1\n", 6) + huge.substr(0, 8191);
    const std::tuple<std::string, Items, std::string> cases[] = {
        {"#\n\nB=y\nF=1\n", {{0, "B", "n"}, {0, "A", ""}}, "B=n\nF=1\nA=\n"},
        {"A=1\nB=2\nA=3\n", {{1, "A", ""}, {1, "C", ""}}, "B=2\nA=3\n"},
        {"A=1\nA=2\nA=3\n", {{0, "A", "x"}, {1, "A", ""}, {2, "Z", ""}}, "A=x\nA=3\nZ=\n"},
        {"AB=\"1\"\n AB=2\nAB =3\n", {{1, "A", ""}, {1, "ABC", ""}}, "AB=\"1\"\n AB=2\nAB =3\n"},
        {"A=1\nB=2", {{0, "C", "3"}, {0, "D", "4"}}, "A=1\nB=2\nC=3\nD=4\n"},
        {"A=1\nB=2", {{0, "A", "3"}}, "A=3\nB=2"},
        {"A=1\nB=2", {{0, "B", "3"}, {0, "C", "4"}}, "A=1\nB=3\nC=4\n"},
        {"A=1\n" + huge + "B=1\n", {{0, "A", huge.data()}}, "A=" + huge + "\n" + huge + "B=1\n"},
        {odd + "A=1\nA=2\n", {{1, "A", ""}}, odd + "A=1\n"},
    };
    run("mkdir /run/d && ln -s nowhere /run/d/link");
    const mode_t mask = umask(077);
    for (const auto &[before, items, after] : cases) {
        write_file("/run/d/f", before);
        EXPECT_EQ(edit_all("/run/d/f", items), 0);
        EXPECT_TRUE(read_file("/run/d/f") == after) << after.substr(0, 80);
        EXPECT_EQ(mode_of("/run/d/f"), 0644U);
    }
    EXPECT_EQ(umask(mask), 077U);
    for (const char *path : {"/run/d/link", "/run/d/new/deep/f"}) {
        EXPECT_EQ(edit_all(path, {{0, "A", "1"}, {1, "B", ""}, {0, "C", "2"}}), 0);
        EXPECT_EQ(read_file(path), "A=1\nC=2\n");
    }
    EXPECT_EQ(mode_of("/run/d/new/deep"), 0755U);
    EXPECT_EQ(list_directory("/run/d"), "f\nlink\nnew\n");
}

TEST_F(Netconf, EditFailsWithTheOldFileInPlace) {
    const Items items = {{0, "C", "2"}};
    EXPECT_EQ(edit(nullptr, items.data(), 1), -EFAULT);
    EXPECT_EQ(edit("/run/f", nullptr, 0), -EFAULT);
    run("mkdir -p /run/d/f /run/full && mount -t tmpfs -o size=64k none /run/full && cd /run/full "
        "&& echo A=1 >f && ln -s ../f g && (cat f; printf '#%01000d') >g; " // shows the last line
        "dd if=/dev/zero of=fill bs=4k status=none 2>&- || true");
    EXPECT_EQ(edit_all("/run/d/f", items), -EISDIR);
    EXPECT_TRUE(take_log().ends_with(", /run/d/f): Is a directory\n"));
    EXPECT_EQ(edit_all("/run/full/f", items), -ENOSPC); // seen when the stream is flushed
    EXPECT_EQ(take_log(), "3 fputs(C=2\n): No space left on device\n");
    EXPECT_EQ(edit_all("/run/full/g", {{1, "B", ""}}), -ENOSPC);
    EXPECT_EQ(take_log(), "3 fputs(A=1\n): No space left on device\n");
    EXPECT_EQ(list_directory("/run/d") + list_directory("/run/full") + read_file("/run/full/f"),
              "f\nf\nfill\ng\nA=1\n");
}

TEST_F(Netconf, InterfacesAreInNaturalOrder) {
    const std::tuple<const char *, const char *, int, int> cases[] = {
        {"eth2", "eth10", 16, -8}, {"eth01", "eth1", 16, -1}, {"eth", "eth1", 16, -1},
        {"a9", "aA", 16, 9 - 'A'}, {"abc", "abd", 2, 0},      {"\xff", "a", 16, 0xff - 'a'},
        {"12", "13", 1, -1},       {"a", "b", 0, 0},          {"2147483648", "1", 16, 0x7FFFFFFF},
    };
    for (const auto &[a, b, n, order] : cases)
        EXPECT_EQ(compare_natural(a, b, n), order) << a << " " << b;
    char primary[VLSYS_IFNAME_SIZE];
    set_interfaces({"virbr0"});
    EXPECT_EQ(get_primary_ifname(primary), 0);
    set_interfaces({"eth10", "virbr0", "eth2", "virbr0-nic", "eth1", "lo0"});
    std::string names;
    for (const auto &name : InterfaceList())
        names.append(name).append(" ");
    EXPECT_EQ(names, "eth1 eth2 eth10 lo0 ");
    EXPECT_EQ(vlsys_get_ifname_list(nullptr), 4);
    const int index = get_primary_ifname(primary);
    EXPECT_STREQ(primary, "eth1");
    set_interfaces({"eth0", "enp0s25"}); // too late to become primary
    EXPECT_EQ(get_primary_ifname(primary), index);
    EXPECT_STREQ(primary, "eth1");
    set_interfaces({"1500000000", "3000000000", "0"}); // each is above another
    EXPECT_EQ(InterfaceList().count(), 3);
}

static const std::string l50 = std::string(49, 'a') + ".";
static const std::string l64 = l50 + "aaaaaaaaaaaaaa";
static const std::string l254 = l50 + l50 + l50 + l50 + l50 + "aaaa";

TEST_F(Netconf, HostNamesFollowTheRules) {
    const std::string l63(63, 'a');
    for (const std::string &good : {std::string(), "a-b.9.Z." + l63, l254, l254 + "."})
        EXPECT_EQ(check_hostname_format(good.c_str()), 0) << good;
    for (const char *bad : {"a--b", "-a", "a-", ".a", "a..b", "a.-b", "a-.b", "a_b", "\xe4"})
        EXPECT_EQ(check_hostname_format(bad), -1) << bad;
    for (const std::string &bad : {l254 + "a", l254 + "..", ".a.." + l63 + "a.b"})
        EXPECT_EQ(check_hostname_format(bad.c_str()), -1);
    EXPECT_EQ(take_log(), "3 " + l254 + "a: too long: 255\n3 " + l254 +
                              "..: too long: 256\n3 .a.." + l63 + "a.b: label[1] \"" + l63 +
                              "a\" is too long (64)\n");
}

// ---- Setters and readers of the unit's files

static const std::string prefix = ifcfg_prefix;

// The keys of a file that are no longer set to "o", in the order of the list; "-" marks removal.
static std::string changes(const std::string &path, const std::string &start,
                           const std::string &separator, const char *keys) {
    const std::string content = "\n" + read_file(path);
    std::istringstream list(keys);
    std::ostringstream old;
    std::string result;
    for (std::string key; list >> key; old << start << key << separator << "o\n") {
        std::string begin = start;
        begin.append(key).append(separator);
        const size_t at = content.find("\n" + begin) + 1;
        const std::string line = content.substr(at, content.find('\n', at) - at);
        if (line != begin + "o")
            result.append(at == 0 ? " -" : " ").append(at == 0 ? key : line.substr(start.length()));
    }
    write_file(path, old.str());
    return result.empty() ? "" : path.substr(path.find_last_of("/-") + 1) + ":" + result + "\n";
}

// The result of a call, what it changed, and what it logged but for traces. The files are old again
// afterwards.
static std::string outcome(int result) {
    const char *const keys = "ONBOOT BOOTPROTO IPADDR NETMASK NM_CONTROLLED PREFIX UUID HWADDR "
                             "IPV6INIT IPV6_AUTOCONF IPV6ADDR DHCPV6C IPV6FORWARDING IPV6_ROUTER "
                             "PEERDNS DOMAIN DNS1 DNS2 DEFROUTE METRIC GATEWAY GATEWAYDEV";
    std::string text = std::to_string(result) + "\n";
    text += changes(prefix + "eth0", "", "=", keys) + changes(prefix + "eth1", "", "=", keys);
    text += changes(network_path, "", "=", "HOSTNAME GATEWAY IPV6_DEFAULTGW");
    text += changes(sysctl_path, "net.ipv6.conf.", " = ",
                    "eth0.disable_ipv6 eth0.autoconf eth0.accept_ra_pinfo eth0.accept_ra_defrtr "
                    "eth1.accept_ra_defrtr");
    std::istringstream log(take_log());
    for (std::string line; getline(log, line);)
        text += line[0] == '7' ? "" : line + "\n";
    return text;
}

// The IPv4 mode's digit, then the IPv6 mode's; 9 is not written.
static uint32_t read_modes(const char *name, int expected = 0) {
    uint32_t ipv4 = 9;
    uint32_t ipv6 = 9;
    EXPECT_EQ(get_mode(name, &ipv4, &ipv6), expected);
    return ipv4 * 10 + ipv6;
}

class Setters : public Unit {
  protected:
    void SetUp() override {
        Unit::SetUp();
        set_interfaces({"eth0", "eth1"});
        outcome(0);
    }
};

TEST_F(Setters, InterfaceSettingsAreWrittenAndReadBack) {
    const std::pair<std::string, std::string> ipv4[] = {
        {" ONBOOT=yes BOOTPROTO=none -IPADDR -NETMASK", "OFF\n"},
        {" ONBOOT=yes BOOTPROTO=none IPADDR=10.0.0.9 NETMASK=255.0.0.0", "10.0.0.9/8\n"},
        {" ONBOOT=yes BOOTPROTO=dhcp -IPADDR -NETMASK", "DHCP\n"}};
    const std::pair<std::string, std::string> ipv6[] = {
        {" IPV6INIT=no IPV6_AUTOCONF=no -IPV6ADDR -DHCPV6C", "OFF\n"},
        {" IPV6INIT=yes IPV6_AUTOCONF=no IPV6ADDR=2001:db8::5/64 -DHCPV6C", "2001:db8::5/64\n"},
        {" IPV6INIT=yes IPV6_AUTOCONF=yes -IPV6ADDR DHCPV6C=yes", "DHCP\n"},
        {" IPV6INIT=yes IPV6_AUTOCONF=yes -IPV6ADDR -DHCPV6C", "AUTO\n"}};
    const std::string rest = " -IPV6FORWARDING -IPV6_ROUTER -GATEWAY\nvelmora: eth0.disable_ipv6 =";
    const std::string switches[] = {" 1", " 0 eth0.autoconf = 0 eth0.accept_ra_pinfo = 0",
                                    " 0 eth0.autoconf = 1 eth0.accept_ra_pinfo = 1"};
    vlsys_ifconf record = {
        0, "", 0, "", 0, "10.0.0.9", "", "255.0.0.0", 8, 0, 0, {{"2001:db8::5", 64, ""}}, 0};
    for (uint32_t i = 0; i < 20; i++) {
        record.ipv4_mode = i / 5;
        record.ipv6_mode = i % 5;
        const uint32_t mode4 = std::min(i / 5, 2U); // 3 is DHCP
        const uint32_t mode6 = std::min(i % 5, 3U); // 4 is Auto
        const int result = vlsys_set_netif("eth0", &record);
        run("grep -v '= o' /etc/sysctl.d/velmora | sysctl -q -p -");
        EXPECT_EQ(read_modes("eth0"), mode4 * 10 + mode6);
        EXPECT_EQ(outcome(result), "0\neth0:" + (i == 0 ? " ONBOOT=no" : ipv4[mode4].first) +
                                       " NM_CONTROLLED=no -PREFIX -UUID -HWADDR" +
                                       ipv6[mode6].first + rest + switches[std::min(mode6, 2U)] +
                                       "\n6 IPv4 (eth0): " + ipv4[mode4].second +
                                       "6 IPv6 (eth0): " + ipv6[mode6].second);
    }
    EXPECT_EQ(outcome(vlsys_set_netif("eth7", &record)), "6\n");
}

// What follows a full field in its record shows up when a setter reads on.
TEST_F(Setters, FullFieldsEndWhereTheFieldEnds) {
    const std::string x16(16, 'x');
    const std::string x46(46, 'x');
    const std::string x1025(1025, 'x');
    vlsys_ifconf record;
    memset(&record, 'x', sizeof record);
    record.ipv4_mode = record.ipv6_mode = VLSYS_MODE_MANUAL;
    vlsys_dns dns;
    memset(&dns, 'x', sizeof dns);
    strcpy(dns.iface, "eth0");
    write_file(prefix + "eth0", "");
    EXPECT_EQ(vlsys_set_netif("eth0", &record) + vlsys_set_dns_settings(&dns), 0);
    EXPECT_EQ(read_file(prefix + "eth0"),
              "NM_CONTROLLED=no\nONBOOT=yes\nBOOTPROTO=none\nIPADDR=" + x16 + "\nNETMASK=" + x16 +
                  "\nIPV6INIT=yes\nIPV6_AUTOCONF=no\nIPV6ADDR=" + x46 +
                  "/20\nPEERDNS=yes\nDOMAIN=" + x1025 + "\nDNS1=" + x46 + "\nDNS2=" + x46 + "\n");
    EXPECT_EQ(vlsys_set_hostname((x1025 + "y").c_str()), 0);
    EXPECT_NE(read_file(network_path).find("=" + x1025 + "\n"), std::string::npos);
}

TEST_F(Setters, DnsIsWrittenForOneInterface) {
    const auto set = [](vlsys_dns dns) { return outcome(vlsys_set_dns_settings(&dns)); };
    const std::string no = " PEERDNS=no -DOMAIN -DNS1 -DNS2\n";
    const std::string off0 = "0\neth0:" + no;
    EXPECT_EQ(set({"d", {"1", "2"}, "", 0}), off0 + "eth1:" + no);
    EXPECT_EQ(set({"d", {"1", "2"}, "eth1", 0}), off0 + "eth1:" + no + "6 DNS OFF (eth1)\n");
    EXPECT_EQ(set({"d", {"", "2"}, "eth1", 2}),
              off0 + "eth1: PEERDNS=yes -DOMAIN -DNS1 -DNS2\n6 DNS DHCP (eth1)\n");
    EXPECT_EQ(set({"d", {"1"}, "eth0", 1}),
              "0\neth0: PEERDNS=yes DOMAIN=d DNS1=1 -DNS2\neth1:" + no + "6 DNS d, 1,  (eth0)\n");
    EXPECT_EQ(set({"", {"1", "2"}, "eth1", 3}),
              off0 + "eth1: PEERDNS=yes DOMAIN= DNS1=1 DNS2=2\n6 DNS , 1, 2 (eth1)\n");
    EXPECT_EQ(set({"d", {"", "2"}, "eth1", 1}), "22\neth0:" + no);
    EXPECT_EQ(set({"", {}, "lo", 2}), off0 + "eth1:" + no);
    EXPECT_EQ(set({"d", {"1", "2"}, "", 1}), "22\n");
    set_interfaces({});
    EXPECT_EQ(set({}), "6\n");
}

TEST_F(Setters, GatewaysDecideWhoHasADefaultRoute) {
    const auto set4 = [](vlsys_gw4 gw) { return outcome(vlsys_set_ipv4_default_gateway2(&gw)); };
    const auto set6 = [](vlsys_gw6 gw) { return outcome(vlsys_set_ipv6_default_gateway2(&gw)); };
    const std::string rest = " -METRIC -GATEWAY -GATEWAYDEV\n";
    const std::string no0 = "0\neth0: DEFROUTE=no" + rest;
    const std::string no1 = "eth1: DEFROUTE=no" + rest;
    const std::string yes0 = "0\neth0: -DEFROUTE" + rest;
    const std::string yes1 = "eth1: -DEFROUTE" + rest;
    const std::string fixed = yes0 + yes1 + "network: GATEWAY=1.1.1.1\n6 IPv4 GW 1.1.1.1\n";
    const std::string none = "network: -GATEWAY\n6 IPv4 GW none\n";
    const std::string dhcp = "network: -GATEWAY\n6 IPv4 GW dhcp\n";
    EXPECT_EQ(set4({"", "1.1.1.1", 0}), fixed);
    EXPECT_EQ(set4({"eth0", "", 1}), yes0 + yes1 + none);
    EXPECT_EQ(set4({"eth", "", 0}), no0 + no1 + none);
    EXPECT_EQ(set4({"eth1", "", 3}), no0 + yes1 + dhcp);
    EXPECT_EQ(outcome(vlsys_set_ipv4_default_gateway("")), no0 + no1 + dhcp);

    const std::string start = "0\nnetwork: -IPV6_DEFAULTGW\nvelmora: eth0.accept_ra_defrtr = ";
    const std::string next = " eth1.accept_ra_defrtr = ";
    const std::string auto0 = "6 IPv6 GW auto (eth0)\n";
    const std::string auto1 = "6 IPv6 GW auto (eth1)\n";
    EXPECT_EQ(set6({"", "", 1}), start + "1" + next + "1\n6 IPv6 GW none\n" + auto0 + auto1);
    EXPECT_EQ(set6({"eth0", "", 0}), start + "1" + next + "0\n6 IPv6 GW none\n" + auto0);
    EXPECT_EQ(set6({"eth1", "", 2}), start + "0" + next + "1\n6 IPv6 GW dhcp\n" + auto1);
    EXPECT_EQ(outcome(vlsys_set_ipv6_default_gateway("")),
              start + "0" + next + "0\n6 IPv6 GW auto\n");
    set_interfaces({});
    EXPECT_EQ(outcome(vlsys_set_ipv6_default_gateway("fe80::1")),
              "0\nnetwork: IPV6_DEFAULTGW=fe80::1\n6 IPv6 GW fe80::1\n");
}

TEST_F(Setters, ModesAreReadFromFileAndSwitches) {
    const std::tuple<std::string, const char *, const char *, uint32_t, const char *> cases[] = {
        {"eth0", "0", "1", 23, "ONBOOT=\"yes\"\nBOOTPROTO=dhcp\n"},
        {"eth0", "0", "0", 20, "ONBOOT=yes\nBOOTPROTO=static\nIPADDR=1\n"},
        {"eth0", "1", "1", 10, "BOOTPROTO=none\nIPADDR=\nONBOOT=yes\nONBOOT=no\nDHCPV6C=no\n"},
        {"eth0", "0", "1", 1, "#ONBOOT=yes\n\nONBOOT=YES\nIPV6ADDR=\n"},
        {"eth0", "1", "0", 2, "IPV6ADDR=1\nDHCPV6C=yes\n===\nONBOOT=yes\n"},
        {"lo", "0", "1", 13, "ONBOOT=yes\nIPADDR=127.0.0.1\n"},
        {"virbr0", "0", "1", 3, "ONBOOT=yes\n"},
    };
    set_interfaces({"eth0", "virbr0"});
    for (const auto &[name, disable, autoconf, modes, file] : cases) {
        write_file(prefix + name, file);
        write_file("/proc/sys/net/ipv6/conf/" + name + "/disable_ipv6", disable);
        write_file("/proc/sys/net/ipv6/conf/" + name + "/autoconf", autoconf);
        EXPECT_EQ(read_modes(name.c_str()), modes) << name << ": " << file;
    }
    EXPECT_EQ(read_modes("no", ENOENT), 90U);
    EXPECT_EQ(take_waits(), std::vector<int64_t>(11, 1000000000));
    const char *const reason = "fopen(/proc/sys/net/ipv6/conf/no/disable_ipv6): No such file";
    EXPECT_NE(take_log().find(reason), std::string::npos);
}

static std::string read_dns() {
    vlsys_dns dns;
    memset(&dns, 'x', sizeof dns);
    const int result = vlsys_get_dns_settings(&dns);
    return std::to_string(result) + dns.iface + std::to_string(dns.mode) + dns.domain + " " +
           dns.server[0] + " " + dns.server[1] + " " + dns.server[2];
}

TEST_F(Setters, DnsIsReadFromResolverAndFiles) {
    const std::tuple<const char *, const char *, const char *, const char *> cases[] = {
        {"02   ", "PEERDNS=no\n", "PEERDNS=yes\n", ""},
        {"02   ", "PEERDNS=no\nPEERDNS=no\n", "PEERDNS=\"no\"\n", ""},
        {"00   ", "PEERDNS=no\n", "PEERDNS=no\n", ""},
        {"01   ", "PEERDNS=no\n", "PEERDNS=no\nDOMAIN=\n", "\n#\n;\n"},
        {"02c   ", "#DOMAIN=\n==\nDOMAIN=\n", "PEERDNS=no\n", "search a b\n\ndomains\tc\n"},
        {"02  1 2", "", "",
         "nameserver\n nameserver 1\nnameservers 2\nnameserver 3\n \ndomain d\n"},
    };
    for (const auto &[expected, eth0, eth1, resolver] : cases) {
        write_file(resolv_path, resolver);
        write_file(prefix + "eth0", eth0);
        write_file(prefix + "eth1", eth1);
        EXPECT_EQ(read_dns(), expected);
    }
    run("rm " + prefix + "eth0");
    EXPECT_EQ(read_dns(), "22  1 2");
    set_interfaces({});
    EXPECT_EQ(read_dns(), "00  1 2");
    run("rm /etc/resolv.conf");
    EXPECT_EQ(read_dns(), "00   ");
}

TEST_F(Setters, HostNameIsWrittenAndPutInForce) {
    const std::string self = "vlsys_set_hostname_immediately: ";
    const auto set = [](const std::string &name) {
        return outcome(vlsys_set_hostname_immediately(name.c_str()));
    };
    EXPECT_EQ(outcome(vlsys_set_hostname("a_b")), "0\nnetwork: HOSTNAME=a_b\n6 hostname: a_b\n");
    EXPECT_EQ(outcome(vlsys_set_hostname("")),
              "0\nnetwork: HOSTNAME=localhost\n6 hostname: localhost\n");
    EXPECT_EQ(set("c_d"),
              "420\n3 " + self + "hostname(c_d) is not correct format: Invalid argument\n");
    EXPECT_EQ(vlsys_set_hostname_immediately((l64 + "a").c_str()), 420);
    take_log();
    EXPECT_EQ(set(l64), "0\nnetwork: HOSTNAME=" + l64 + "\n6 hostname: " + l64 + "\n");
    EXPECT_EQ(set(l64), "0\n6 " + self + "do not set up for the same hostname: " + l64 + "\n");
}
