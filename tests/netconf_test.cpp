#include "fixture.h"
#include "netconf/edit.h"
#include "netconf/hostname.h"
#include "vlsys.h"

#include <cstring>

using namespace test;
using std::string;

static constexpr uint32_t off = VLSYS_MODE_OFF, manual = VLSYS_MODE_MANUAL;
static constexpr uint32_t dhcp = VLSYS_MODE_DHCP, automatic = VLSYS_MODE_AUTO;

using Netconf = Unit;

TEST_F(Netconf, TheEditorChangesTheFirstLineOfAKey) {
    const string huge(1 << 20, 'x');
    const struct {
        string why, before, after;
    } rows[] = {
        {"there is no file", "", "SET=1\nEMPTY=\n"},
        {"comments and empty lines go", "#\n\nSETS=2\nSET=\nEMPTY=2\n", "SETS=2\nSET=1\nEMPTY=\n"},
        {"further lines stay", "GO=1\nGO=2\nSET=2\nSET=3\n", "GO=2\nSET=1\nSET=3\nEMPTY=\n"},
        {"no line feed at the end", "B=2", "B=2\nSET=1\nEMPTY=\n"},
        {"a huge line is one line", huge + "SET=2\nGO=1\n", huge + "SET=2\nSET=1\nEMPTY=\n"},
    };
    const vlsys::edit_item items[] = {{.key = "SET", .value = "1"},
                                      {.remove = 1, .key = "GO", .value = ""},
                                      {.key = "EMPTY", .value = ""}};
    umask(077);
    for (const auto &row : rows) {
        if (!row.before.empty())
            write_file("/run/d/e/f", row.before);
        EXPECT_EQ(vlsys::edit("/run/d/e/f", items, 3), 0) << row.why;
        const Files expected = {{"e/f", row.after}}; // its mode is 0644; no temporary is left
        EXPECT_TRUE(unit_files("/run/d") == expected) << row.why;
    }
    EXPECT_EQ(umask(022), 077U) << "the umask is put back";
}

TEST_F(Netconf, NamesAreInNaturalOrder) {
    set_interfaces({"eth10", "virb", "virbr0", "eth2", "eth1", "eth01"});
    char(*names)[VLSYS_IFNAME_SIZE] = nullptr;
    ASSERT_EQ(vlsys_get_ifname_list(&names), 5) << "without lo and virbr*";
    const auto *next = names;
    for (const char *name : {"eth01", "eth1", "eth2", "eth10", "virb"})
        EXPECT_STREQ(*next++, name);
    free(names);
}

TEST_F(Netconf, ModesAreReadFromFileAndSwitches) {
    const struct {
        const char *why, *name, *disable, *autoconf, *file;
        uint32_t ipv4, ipv6;
    } rows[] = {
        {"in quotes", "eth0", "0", "1", "ONBOOT=\"yes\"\nBOOTPROTO=none\nIPADDR=\n", manual,
         automatic},
        {"not BOOTPROTO=none", "eth0", "0", "0", "ONBOOT=yes\nIPADDR=1\n", dhcp, off},
        {"no IPADDR", "eth0", "1", "1", "BOOTPROTO=none\nONBOOT=yes\n", off, off},
        {"not ONBOOT=yes", "eth0", "0", "1", "#ONBOOT=yes\n\nONBOOT=YES\nIPV6ADDR=\n", off, manual},
        {"DHCPV6C before IPV6ADDR", "eth0", "1", "0", "IPV6ADDR=1\nDHCPV6C=yes\n", off, dhcp},
        {"the loopback is fixed", "lo", "0", "1", "ONBOOT=yes\nIPADDR=1\n", manual, automatic},
        {"a bridge has no file", "virbr0", "0", "1", "ONBOOT=yes\n", off, automatic},
    };
    set_interfaces({"eth0", "virbr0"});
    for (const auto &row : rows) {
        write_file(ifcfg + row.name, row.file);
        const string switches = string("/proc/sys/net/ipv6/conf/") + row.name;
        write_file(switches + "/disable_ipv6", row.disable);
        write_file(switches + "/autoconf", row.autoconf);
        vlsys_ifconf nif = {};
        EXPECT_EQ(vlsys_get_netif(row.name, &nif), 0) << row.why;
        EXPECT_EQ(nif.ipv4_mode, row.ipv4) << row.why;
        EXPECT_EQ(nif.ipv6_mode, row.ipv6) << row.why;
    }
}

TEST_F(Netconf, AMissingSwitchIsWaitedForElevenSeconds) {
    run("mount -t tmpfs none /proc/sys/net/ipv6/conf");
    vlsys_ifconf nif = {};
    EXPECT_EQ(vlsys_get_netif("eth0", &nif), 0);
    EXPECT_EQ(take_waits(), std::vector<int64_t>(11, second));
}

TEST_F(Netconf, AnInterfaceIsOneOfTheKernels) {
    const Files before = unit_files();
    run("ip link property add dev eth0 altname other");
    const vlsys_ifconf nif = {};
    for (const char *name : {"eth7", "eth0:/../../x", "eth0:\nvm.x=1\n#", "other"})
        EXPECT_EQ(vlsys_set_netif(name, &nif), ENXIO) << name;
    EXPECT_EQ(changes(before), "");
}

TEST_F(Netconf, DnsNeedsAnInterfaceAndAServerUnlessOff) {
    const Files before = unit_files();
    const vlsys_dns nowhere = {.server = {"1"}, .mode = manual};
    EXPECT_EQ(vlsys_set_dns_settings(&nowhere), EINVAL);
    const vlsys_dns serverless = {.server = {"", "2"}, .iface = "eth0", .mode = manual};
    EXPECT_EQ(vlsys_set_dns_settings(&serverless), EINVAL);
    const vlsys_dns none = {.iface = "eth0", .mode = off};
    EXPECT_EQ(vlsys_set_dns_settings(&none), 0);
    EXPECT_EQ(take_log(LOG_INFO), "6 DNS OFF (eth0)\n");
    EXPECT_EQ(changes(before), "ifcfg-eth0 +PEERDNS=no ifcfg-eth1 +PEERDNS=no ");
}

TEST_F(Netconf, AGatewayTextIsAFixedGatewayAndNoTextALearntOne) {
    set_interfaces({"eth0"});
    for (const char *text : {"", "1", static_cast<const char *>(nullptr)}) {
        EXPECT_EQ(vlsys_set_ipv4_default_gateway(text), 0);
        EXPECT_EQ(vlsys_set_ipv6_default_gateway(text), 0);
    }
    EXPECT_EQ(take_log(LOG_INFO), "6 IPv4 GW dhcp\n6 IPv6 GW auto\n"
                                  "6 IPv4 GW 1\n6 IPv6 GW 1\n6 IPv6 GW auto (eth0)\n"
                                  "6 IPv4 GW dhcp\n6 IPv6 GW auto\n");
}

TEST_F(Netconf, ADotInASwitchesInterfaceIsWrittenAsASlash) {
    set_interfaces({"eth0.7"});
    const Files before = unit_files();
    EXPECT_EQ(vlsys_set_ipv6_default_gateway(""), 0);
    EXPECT_EQ(changes(before), "velmora +net.ipv6.conf.eth0/7.accept_ra_defrtr = 0 ");
}

TEST_F(Netconf, DnsIsReadFromResolverAndFiles) {
    const struct {
        const char *why, *resolver, *eth0, *eth1;
        uint32_t mode;
        const char *domain, *server;
    } rows[] = {
        {"one file lacks PEERDNS=no", "", "PEERDNS=no\n", "PEERDNS=yes\n", dhcp, "", ""},
        {"all files have PEERDNS=no", "", "PEERDNS=no\n", "PEERDNS=no\n", off, "", ""},
        {"one file has DOMAIN", "", "PEERDNS=no\n", "PEERDNS=no\nDOMAIN=\n", manual, "", ""},
        {"the last line counts", "#\n;\n\ndomain a\nsearch b c\n", "", "", dhcp, "b", ""},
        {"the first server", " nameserver\t1\nnameserver 2\n", "", "", dhcp, "", "1"},
    };
    for (const auto &row : rows) {
        write_file("/etc/resolv.conf", row.resolver);
        write_file(ifcfg + "eth0", row.eth0);
        write_file(ifcfg + "eth1", row.eth1);
        vlsys_dns dns;
        memset(&dns, 'x', sizeof dns); // nothing of it may stay
        EXPECT_EQ(vlsys_get_dns_settings(&dns), 0) << row.why;
        EXPECT_EQ(dns.mode, row.mode) << row.why;
        EXPECT_STREQ(dns.domain, row.domain) << row.why;
        EXPECT_STREQ(dns.server[0], row.server) << row.why;
    }
}

TEST_F(Netconf, OnlyAWellFormedHostNamePasses) {
    const string label(63, 'a');
    const string name = label + "." + label + "." + label + "." + string(62, 'a'); // 254 characters
    for (const string &good : {string(), string("aAzZ-09.b"), string("a."), name, name + "."})
        EXPECT_EQ(vlsys::check_hostname_format(good.c_str()), 0) << good;
    for (const char *bad : {"a--b", "-a", "a-", ".a", "a..b", "a.-b", "a-.b", "a_b", "\xe4"})
        EXPECT_EQ(vlsys::check_hostname_format(bad), -1) << bad;
    EXPECT_EQ(vlsys::check_hostname_format((name + "..").c_str()), -1);
    take_log();
    EXPECT_EQ(vlsys::check_hostname_format((name + "a").c_str()), -1);
    EXPECT_EQ(vlsys::check_hostname_format(("b.a" + label).c_str()), -1);
    EXPECT_EQ(take_log(), "3 " + name + "a: too long: 255\n" + "3 b.a" + label + ": label[1] \"a" +
                              label + "\" is too long (64)\n");
}

TEST_F(Netconf, AHostNameIsWrittenAndPutInForce) {
    run("cd /etc/sysconfig; mv network real; ln -s real network"); // the link is replaced
    const Files before = unit_files();
    const string longest = string(49, 'a') + "." + string(14, 'b');
    EXPECT_EQ(vlsys_set_hostname(""), 0);
    EXPECT_EQ(changes(before),
              "network +NETWORKING=yes +HOSTNAME=localhost +GATEWAY=192.168.1.1 -link to real ");
    EXPECT_EQ(vlsys_set_hostname_immediately(longest.c_str()), 0);
    EXPECT_EQ(vlsys_set_hostname_immediately(longest.c_str()), 0) << "it is the running one";
    EXPECT_EQ(vlsys_set_hostname_immediately((longest + "b").c_str()), VLSYS_HOSTNAME_REFUSED);
    EXPECT_EQ(changes(before), "network +NETWORKING=yes +HOSTNAME=" + longest +
                                   " +GATEWAY=192.168.1.1 -link to real ");
    char name[VLSYS_HOSTNAME_SIZE] = "";
    EXPECT_EQ(vlsys_get_hostname(name), 0);
    EXPECT_EQ(name, longest);
    const string self = "vlsys_set_hostname_immediately: ";
    EXPECT_EQ(take_log(), "6 hostname: localhost\n6 hostname: " + longest + "\n6 " + self +
                              "do not set up for the same hostname: " + longest + "\n3 " + self +
                              "hostname(" + longest +
                              "b) is not correct format: Invalid argument\n");
}
