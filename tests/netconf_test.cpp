// The editor, the interface list, the setters and the readers of the unit's files.
#include "fixture.h"
#include "netconf/edit.h"
#include "netconf/interfaces.h"
#include "vlsys.h"

#include <algorithm>
#include <cstring>
#include <sstream>
#include <sys/resource.h>

using namespace test;
using std::string;
using vlsys::edit_item;

enum Mode : uint32_t {
    off = VLSYS_MODE_OFF,
    manual = VLSYS_MODE_MANUAL,
    dhcp = VLSYS_MODE_DHCP,
    automatic = VLSYS_MODE_AUTO,
    unknown
};

static const string scripts = "/etc/sysconfig/network-scripts/ifcfg-";

// "KEY=o" for each key, a line each.
static string old_lines(const string &keys, const string &equals) {
    std::istringstream list(keys);
    string lines;
    for (string key; list >> key;)
        lines += key + equals + "o\n";
    return lines;
}

class Netconf : public Unit {
  protected:
    void SetUp() override {
        Unit::SetUp();
        set_interfaces({"eth0", "eth1"});
        put_old_files();
    }
    void put_old_files() {
        const string keys = "ONBOOT BOOTPROTO IPADDR NETMASK NM_CONTROLLED IPV6INIT IPV6_AUTOCONF "
                            "IPV6ADDR DHCPV6C PEERDNS DOMAIN DNS1 DNS2 DEFROUTE GATEWAY PREFIX "
                            "UUID HWADDR IPV6FORWARDING IPV6_ROUTER METRIC GATEWAYDEV";
        write_file(scripts + "eth0", old_lines(keys, "="));
        write_file(scripts + "eth1", old_lines(keys, "="));
        write_file("/etc/sysconfig/network", old_lines("HOSTNAME GATEWAY IPV6_DEFAULTGW", "="));
        write_file("/etc/sysctl.d/velmora",
                   old_lines("net.ipv6.conf.eth0.disable_ipv6 net.ipv6.conf.eth0.autoconf "
                             "net.ipv6.conf.eth0.accept_ra_pinfo",
                             " = "));
        files_ = unit_files();
        take_log();
    }
    // What changed since put_old_files, in one line; the old files are put again.
    string changed() {
        string text = changes(files_);
        std::replace(text.begin(), text.end(), '\n', ' ');
        put_old_files();
        return text;
    }

  private:
    Files files_;
};

static int edit(const char *path, const std::vector<edit_item> &items) {
    return vlsys::edit(path, items.data(), static_cast<uint32_t>(items.size()));
}

TEST_F(Netconf, TheEditorChangesTheFirstLineOfAKey) {
    const string huge(1 << 20, 'x');
    const struct {
        string why, before;
        std::vector<edit_item> items;
        string after;
    } rows[] = {
        {"set in place, or at the end",
         "B=1\nF=1\n",
         {{0, "A", ""}, {0, "B", "2"}},
         "B=2\nF=1\nA=\n"},
        {"comments and empty lines go", "#\n\nA=1\n", {{1, "B", ""}}, "A=1\n"},
        {"removed", "A=1\nB=2\nA=3\n", {{1, "A", ""}, {1, "C", ""}}, "B=2\nA=3\n"},
        {"an item acts once", "A=1\nA=2\nA=3\n", {{0, "A", "x"}, {1, "A", ""}}, "A=x\nA=3\n"},
        {"no line feed, then a new line", "A=1\nB=2", {{0, "C", "3"}}, "A=1\nB=2\nC=3\n"},
        {"no line feed, and none needed", "A=1\nB=2", {{0, "A", "3"}}, "A=3\nB=2"},
        {"a huge line is one",
         "A=1\n" + huge + "B=1\n",
         {{0, "A", huge.c_str()}, {1, "B", ""}},
         "A=" + huge + "\n" + huge + "B=1\n"},
    };
    run("mkdir /run/d");
    umask(077);
    for (const auto &row : rows) {
        write_file("/run/d/f", row.before);
        EXPECT_EQ(edit("/run/d/f", row.items), 0) << row.why;
        EXPECT_TRUE(read_file("/run/d/f") == row.after) << row.why;
        EXPECT_EQ(mode_of("/run/d/f"), 0644U) << row.why;
    }
    EXPECT_EQ(edit("/run/d/new/deep/f", {{0, "A", "1"}, {1, "B", ""}}), 0);
    EXPECT_EQ(read_file("/run/d/new/deep/f"), "A=1\n");
    EXPECT_EQ(umask(022), 077U);
    EXPECT_EQ(list_directory("/run/d"), "f\nnew\n");
}

TEST_F(Netconf, NamesAreInNaturalOrder) {
    const struct {
        const char *why, *a, *b;
        int size, order;
    } rows[] = {
        {"by number", "eth2", "eth10", 16, 2 - 10},
        {"the longer number first", "eth01", "eth1", 16, '0' - '1'},
        {"the shorter text first", "eth", "eth1", 16, -1},
        {"beyond the size", "abc", "abd", 2, 0},
    };
    for (const auto &row : rows)
        EXPECT_EQ(vlsys::compare_natural(row.a, row.b, row.size), row.order) << row.why;
    set_interfaces({"eth10", "virbr0", "eth2", "virbr0-nic", "eth1"});
    char(*names)[VLSYS_IFNAME_SIZE] = nullptr;
    ASSERT_EQ(vlsys_get_ifname_list(&names), 3) << "without lo and virbr*";
    EXPECT_STREQ(names[0], "eth1");
    EXPECT_STREQ(names[1], "eth2");
    EXPECT_STREQ(names[2], "eth10");
    free(names);
    set_interfaces({"virbr0"});
    EXPECT_EQ(vlsys_get_ifname_list(nullptr), 0);
    char primary[VLSYS_IFNAME_SIZE] = "";
    EXPECT_EQ(vlsys::get_primary_ifname(primary), 0);
    set_interfaces({"eth3", "eth1"});
    EXPECT_GT(vlsys::get_primary_ifname(primary), 0);
    set_interfaces({"eth0"});
    EXPECT_GT(vlsys::get_primary_ifname(primary), 0);
    EXPECT_STREQ(primary, "eth1") << "the first one found stays the primary one";
}

TEST_F(Netconf, AnInterfacesModesAreWritten) {
    const string always = " -GATEWAY -PREFIX -UUID -HWADDR -IPV6FORWARDING -IPV6_ROUTER velmora ";
    const string learning = "+net.ipv6.conf.eth0.disable_ipv6 = 0 +net.ipv6.conf.eth0.autoconf = 1 "
                            "+net.ipv6.conf.eth0.accept_ra_pinfo = 1 ";
    const struct {
        const char *why;
        Mode ipv4, ipv6;
        string changes;
    } rows[] = {
        {"all off", off, off,
         "+ONBOOT=no +NM_CONTROLLED=no +IPV6INIT=no +IPV6_AUTOCONF=no -IPV6ADDR -DHCPV6C" + always +
             "+net.ipv6.conf.eth0.disable_ipv6 = 1 "},
        {"IPv6 alone", off, automatic,
         "+ONBOOT=yes +BOOTPROTO=none +NM_CONTROLLED=no +IPV6INIT=yes +IPV6_AUTOCONF=yes -IPADDR "
         "-NETMASK -IPV6ADDR -DHCPV6C" +
             always + learning},
        {"fixed", manual, manual,
         "+ONBOOT=yes +BOOTPROTO=none +IPADDR=10.0.0.9 +NETMASK=255.0.0.0 +NM_CONTROLLED=no "
         "+IPV6INIT=yes +IPV6_AUTOCONF=no +IPV6ADDR=2001:db8::5/64 -DHCPV6C" +
             always +
             "+net.ipv6.conf.eth0.disable_ipv6 = 0 +net.ipv6.conf.eth0.autoconf = 0 "
             "+net.ipv6.conf.eth0.accept_ra_pinfo = 0 "},
        {"leases", dhcp, dhcp,
         "+ONBOOT=yes +BOOTPROTO=dhcp +NM_CONTROLLED=no +IPV6INIT=yes +IPV6_AUTOCONF=yes "
         "+DHCPV6C=yes -IPADDR -NETMASK -IPV6ADDR" +
             always + learning},
        {"unknown modes", unknown, unknown,
         "+ONBOOT=yes +BOOTPROTO=dhcp +NM_CONTROLLED=no +IPV6INIT=yes +IPV6_AUTOCONF=yes -IPADDR "
         "-NETMASK -IPV6ADDR -DHCPV6C" +
             always + learning},
    };
    for (const auto &row : rows) {
        vlsys_ifconf nif = {};
        nif.ipv4_mode = row.ipv4;
        nif.ipv6_mode = row.ipv6;
        nif.addr6[0].prefix = 64;
        vlsys_strlcpy(nif.addr, "10.0.0.9", sizeof nif.addr);
        vlsys_strlcpy(nif.netmask, "255.0.0.0", sizeof nif.netmask);
        vlsys_strlcpy(nif.addr6[0].addr, "2001:db8::5", VLSYS_ADDR6_SIZE);
        EXPECT_EQ(vlsys_set_netif("eth0", &nif), 0) << row.why;
        EXPECT_EQ(changed(), "ifcfg-eth0 " + row.changes) << row.why;
    }
}

TEST_F(Netconf, ModesAreReadFromFileAndSwitches) {
    const struct {
        const char *why, *name, *disable, *autoconf, *file;
        Mode ipv4, ipv6;
    } rows[] = {
        {"quotes", "eth0", "0", "1", "ONBOOT=\"yes\"\nBOOTPROTO=\"none\"\nIPADDR=\"1\"\n", manual,
         automatic},
        {"any BOOTPROTO but none", "eth0", "0", "0", "ONBOOT=yes\nBOOTPROTO=static\nIPADDR=1\n",
         dhcp, off},
        {"none without IPADDR", "eth0", "1", "1", "BOOTPROTO=none\nONBOOT=yes\nONBOOT=no\n", off,
         off},
        {"not ONBOOT=yes", "eth0", "0", "1", "#ONBOOT=yes\n\nONBOOT=YES\nIPV6ADDR=\n", off, manual},
        {"DHCPV6C before IPV6ADDR", "eth0", "1", "0", "IPV6ADDR=1\nDHCPV6C=yes\n", off, dhcp},
        {"a line without a key ends it", "eth0", "1", "0", "===\nONBOOT=yes\nDHCPV6C=yes\n", off,
         off},
        {"the loopback is fixed", "lo", "0", "1", "ONBOOT=yes\nIPADDR=127.0.0.1\n", manual,
         automatic},
        {"a bridge has no file", "virbr0", "0", "1", "ONBOOT=yes\n", off, automatic},
    };
    set_interfaces({"eth0", "virbr0"});
    for (const auto &row : rows) {
        write_file(scripts + row.name, row.file);
        const string switches = string("/proc/sys/net/ipv6/conf/") + row.name;
        write_file(switches + "/disable_ipv6", row.disable);
        write_file(switches + "/autoconf", row.autoconf);
        vlsys_ifconf nif = {};
        EXPECT_EQ(vlsys_get_netif(row.name, &nif), 0) << row.why;
        EXPECT_EQ(nif.ipv4_mode, row.ipv4) << row.why;
        EXPECT_EQ(nif.ipv6_mode, row.ipv6) << row.why;
    }
    run("mount -t tmpfs none /proc/sys/net/ipv6/conf");
    vlsys_ifconf nif = {};
    EXPECT_EQ(vlsys_get_netif("eth0", &nif), 0) << "without its switches";
    EXPECT_EQ(take_waits(), std::vector<int64_t>(11, second));
}

TEST_F(Netconf, AnInterfaceIsOneOfTheKernels) {
    run("ip link property add dev eth0 altname other");
    const vlsys_ifconf nif = {};
    for (const char *name : {"eth7", "eth0:/../../x", "eth0:\nvm.x=1\n#", "other"})
        EXPECT_EQ(vlsys_set_netif(name, &nif), ENXIO) << name;
    const rlimit few = {0, 4096};
    setrlimit(RLIMIT_NOFILE, &few);
    EXPECT_EQ(vlsys_set_netif("eth0", &nif), EMFILE) << "the kernel cannot be asked";
    const rlimit enough = {1024, 4096};
    setrlimit(RLIMIT_NOFILE, &enough);
    EXPECT_EQ(changed(), "");
}

TEST_F(Netconf, ADotInANameIsASlashInItsSwitches) {
    set_interfaces({"eth0.7"});
    const vlsys_ifconf nif = {};
    EXPECT_EQ(vlsys_set_netif("eth0.7", &nif), 0);
    EXPECT_EQ(vlsys_set_ipv6_default_gateway(""), 0);
    EXPECT_TRUE(read_file("/etc/sysctl.d/velmora")
                    .ends_with("net.ipv6.conf.eth0/7.disable_ipv6 = 1\n"
                               "net.ipv6.conf.eth0/7.accept_ra_defrtr = 0\n"));
}

TEST_F(Netconf, DnsIsWrittenForOneInterface) {
    const string eth0 = "ifcfg-eth0 ";
    const string eth1 = "ifcfg-eth1 ";
    const string without = " -DOMAIN -DNS1 -DNS2 ";
    const string no = "+PEERDNS=no" + without;
    const struct {
        const char *why;
        Mode mode;
        const char *iface, *server1, *server2;
        int result;
        string changes;
    } rows[] = {
        {"off", off, "eth1", "1", "2", 0, eth0 + no + eth1 + no},
        {"from a lease", dhcp, "eth1", "", "", 0, eth0 + no + eth1 + "+PEERDNS=yes" + without},
        {"fixed", manual, "eth0", "1", "2", 0,
         eth0 + "+PEERDNS=yes +DOMAIN=d +DNS1=1 +DNS2=2 " + eth1 + no},
        {"one server", unknown, "eth0", "1", "", 0,
         eth0 + "+PEERDNS=yes +DOMAIN=d +DNS1=1 -DNS2 " + eth1 + no},
        {"no server", manual, "eth1", "", "2", EINVAL, eth0 + no},
        {"no interface", manual, "", "1", "2", EINVAL, ""},
        {"another interface", dhcp, "lo", "", "", 0, eth0 + no + eth1 + no},
    };
    for (const auto &row : rows) {
        vlsys_dns dns = {"d", {}, "", row.mode};
        vlsys_strlcpy(dns.iface, row.iface, sizeof dns.iface);
        vlsys_strlcpy(dns.server[0], row.server1, sizeof dns.server[0]);
        vlsys_strlcpy(dns.server[1], row.server2, sizeof dns.server[1]);
        EXPECT_EQ(vlsys_set_dns_settings(&dns), row.result) << row.why;
        EXPECT_EQ(changed(), row.changes) << row.why;
    }
    const vlsys_dns none = {};
    run("cd /etc/sysconfig/network-scripts; rm ifcfg-eth1; mkdir ifcfg-eth1");
    EXPECT_EQ(vlsys_set_dns_settings(&none), EISDIR);
    EXPECT_TRUE(logged(LOG_ERR, "param: failed"));
    set_interfaces({});
    EXPECT_EQ(vlsys_set_dns_settings(&none), ENXIO) << "there is no interface";
}

TEST_F(Netconf, AnIpv4GatewayDecidesWhoHasADefaultRoute) {
    const string rest = " -GATEWAY -METRIC -GATEWAYDEV ";
    const string no0 = "ifcfg-eth0 +DEFROUTE=no" + rest;
    const string no1 = "ifcfg-eth1 +DEFROUTE=no" + rest;
    const string yes0 = "ifcfg-eth0 -DEFROUTE" + rest;
    const string yes1 = "ifcfg-eth1 -DEFROUTE" + rest;
    const struct {
        const char *why;
        vlsys_gw4 gateway;
        string changes, log;
    } rows[] = {
        {"an address",
         {"", "1.1.1.1", off},
         "network +GATEWAY=1.1.1.1 " + yes0 + yes1,
         "IPv4 GW 1.1.1.1\n"},
        {"fixed to none", {"", "", manual}, "network -GATEWAY " + yes0 + yes1, "IPv4 GW none\n"},
        {"off", {"eth", "", off}, "network -GATEWAY " + no0 + no1, "IPv4 GW none\n"},
        {"learnt on one", {"eth1", "", dhcp}, "network -GATEWAY " + no0 + yes1, "IPv4 GW dhcp\n"},
    };
    for (const auto &row : rows) {
        EXPECT_EQ(vlsys_set_ipv4_default_gateway2(&row.gateway), 0) << row.why;
        EXPECT_TRUE(take_log(LOG_INFO).starts_with(row.log)) << row.why;
        EXPECT_EQ(changed(), row.changes) << row.why;
    }
    EXPECT_EQ(vlsys_set_ipv4_default_gateway(""), 0);
    EXPECT_EQ(changed(), "network -GATEWAY " + no0 + no1);
}

TEST_F(Netconf, AnIpv6GatewayDecidesWhoTakesADefaultRoute) {
    const string zero = "+net.ipv6.conf.eth0.accept_ra_defrtr = 0 ";
    const string one = "+net.ipv6.conf.eth0.accept_ra_defrtr = 1 ";
    const string zero1 = "+net.ipv6.conf.eth1.accept_ra_defrtr = 0 ";
    const string one1 = "+net.ipv6.conf.eth1.accept_ra_defrtr = 1 ";
    const string removed = "network -IPV6_DEFAULTGW velmora ";
    const struct {
        const char *why;
        vlsys_gw6 gateway;
        string changes, log;
    } rows[] = {
        {"an address",
         {"", "fe80::1", off},
         "network +IPV6_DEFAULTGW=fe80::1 velmora " + one + one1,
         "IPv6 GW fe80::1\n"},
        {"fixed to none", {"", "", manual}, removed + one + one1, "IPv6 GW none\n"},
        {"off", {"", "", off}, removed + zero + zero1, "IPv6 GW none\n"},
        {"from a lease", {"eth1", "", dhcp}, removed + zero + one1, "IPv6 GW dhcp\n"},
        {"learnt on one", {"eth0", "", automatic}, removed + one + zero1, "IPv6 GW auto\n"},
    };
    for (const auto &row : rows) {
        EXPECT_EQ(vlsys_set_ipv6_default_gateway2(&row.gateway), 0) << row.why;
        EXPECT_TRUE(take_log(LOG_INFO).starts_with(row.log)) << row.why;
        EXPECT_EQ(changed(), row.changes) << row.why;
    }
    EXPECT_EQ(vlsys_set_ipv6_default_gateway(nullptr), 0);
    EXPECT_EQ(changed(), removed + zero + zero1);
    set_interfaces({});
    EXPECT_EQ(vlsys_set_ipv6_default_gateway("fe80::1"), 0) << "there is no interface";
    EXPECT_EQ(changed(), "network +IPV6_DEFAULTGW=fe80::1 ");
}

TEST_F(Netconf, DnsIsReadFromResolverAndFiles) {
    const struct {
        const char *why, *resolver, *eth0, *eth1;
        Mode mode;
        const char *domain, *server0, *server1;
    } rows[] = {
        {"one file lacks PEERDNS=no", "", "PEERDNS=no\n", "PEERDNS=yes\n", dhcp, "", "", ""},
        {"twice in one file", "", "PEERDNS=no\nPEERDNS=no\n", "", dhcp, "", "", ""},
        {"all files have it", "", "PEERDNS=no\n", "PEERDNS=no\n", off, "", "", ""},
        {"DOMAIN wins", "", "PEERDNS=no\n", "PEERDNS=no\nDOMAIN=\n", manual, "", "", ""},
        {"the last domain", "#\n;\n\ndomain a\nsearch b c\n", "", "", dhcp, "b", "", ""},
        {"servers in order", "nameserver\n nameserver\t1\nnameserver 2\n", "", "", dhcp, "", "",
         "1"},
        {"blanks end it", " \ndomain d\n", "", "", dhcp, "", "", ""},
    };
    for (const auto &row : rows) {
        write_file("/etc/resolv.conf", row.resolver);
        write_file(scripts + "eth0", row.eth0);
        write_file(scripts + "eth1", row.eth1);
        vlsys_dns dns;
        memset(&dns, 'x', sizeof dns);
        EXPECT_EQ(vlsys_get_dns_settings(&dns), 0) << row.why;
        EXPECT_EQ(dns.mode, row.mode) << row.why;
        EXPECT_STREQ(dns.domain, row.domain) << row.why;
        EXPECT_STREQ(dns.server[0], row.server0) << row.why;
        EXPECT_STREQ(dns.server[1], row.server1) << row.why;
    }
    vlsys_dns dns = {};
    run("cd /etc/sysconfig/network-scripts; rm ifcfg-eth0; mkdir ifcfg-eth0");
    EXPECT_EQ(vlsys_get_dns_settings(&dns), EISDIR) << "a file that cannot be read";
    run("rmdir " + scripts + "eth0");
    EXPECT_EQ(vlsys_get_dns_settings(&dns), ENOENT);
    set_interfaces({});
    EXPECT_EQ(vlsys_get_dns_settings(&dns), 0);
    EXPECT_EQ(dns.mode, off) << "there is no interface";
    run("rm /etc/resolv.conf; mkdir /etc/resolv.conf");
    EXPECT_EQ(vlsys_get_dns_settings(&dns), EISDIR) << "a file that cannot be read";
}

TEST_F(Netconf, AHostNameIsWellFormed) {
    const string l63(63, 'a');
    const string l254 = l63 + "." + l63 + "." + l63 + "." + string(62, 'a');
    for (const string &good : {string(), string("aAzZ-09.b"), string("a."), l254, l254 + "."})
        EXPECT_EQ(vlsys::check_hostname_format(good.c_str()), 0) << good;
    for (const char *bad : {"a--b", "-a", "a-", ".a", "a..b", "a.-b", "a-.b", "a_b", "\xe4"})
        EXPECT_EQ(vlsys::check_hostname_format(bad), -1) << bad;
    EXPECT_EQ(take_log(), "");
    EXPECT_EQ(vlsys::check_hostname_format((l254 + "a").c_str()), -1);
    EXPECT_TRUE(logged(LOG_ERR, l254 + "a: too long: 255"));
    EXPECT_EQ(vlsys::check_hostname_format((l254 + "..").c_str()), -1);
    EXPECT_EQ(vlsys::check_hostname_format(("b.a" + l63).c_str()), -1);
    EXPECT_TRUE(logged(LOG_ERR, "b.a" + l63 + ": label[1] \"a" + l63 + "\" is too long (64)"));
}

TEST_F(Netconf, AHostNameIsWrittenAndPutInForce) {
    const string longest = string(49, 'a') + "." + string(14, 'b');
    char name[VLSYS_HOSTNAME_SIZE] = "";
    EXPECT_EQ(vlsys_set_hostname("a_b"), 0) << "unchecked";
    EXPECT_TRUE(logged(LOG_INFO, "hostname: a_b"));
    EXPECT_EQ(changed(), "network +HOSTNAME=a_b ");
    EXPECT_EQ(vlsys_set_hostname(""), 0);
    EXPECT_EQ(changed(), "network +HOSTNAME=localhost ");
    EXPECT_EQ(vlsys_set_hostname_immediately(longest.c_str()), 0);
    EXPECT_EQ(changed(), "network +HOSTNAME=" + longest + " ");
    EXPECT_EQ(vlsys_get_hostname(name), 0);
    EXPECT_EQ(name, longest);
    EXPECT_EQ(vlsys_set_hostname_immediately(longest.c_str()), 0) << "it is the running one";
    EXPECT_TRUE(logged(LOG_INFO, "vlsys_set_hostname_immediately: do not set up for the same "
                                 "hostname: " +
                                     longest));
    EXPECT_EQ(vlsys_set_hostname_immediately("c_d"), 420);
    EXPECT_TRUE(logged(LOG_ERR, "vlsys_set_hostname_immediately: hostname(c_d) is not correct "
                                "format: Invalid argument"));
    EXPECT_EQ(vlsys_set_hostname_immediately((longest + "b").c_str()), 420);
    EXPECT_EQ(changed(), "");
}
