// The editor, the interface list, the setters and the readers of the unit's files.
#include "fixture.h"
#include "netconf/edit.h"
#include "netconf/hostname.h"
#include "netconf/interfaces.h"
#include "vlsys.h"

#include <algorithm>
#include <cstring>
#include <sys/resource.h>

using namespace test;
using std::string;
using vlsys::edit_item;

enum Mode : uint32_t {
    off = VLSYS_MODE_OFF,
    manual = VLSYS_MODE_MANUAL,
    dhcp = VLSYS_MODE_DHCP,
    automatic = VLSYS_MODE_AUTO
};

static const string scripts = "/etc/sysconfig/network-scripts/ifcfg-";

class Netconf : public Unit {
  protected:
    void SetUp() override {
        Unit::SetUp();
        set_interfaces({"eth0", "eth1"});
        files_ = unit_files();
    }
    // What changed since the start or the last call, in one line.
    string changed() {
        const Files before = std::exchange(files_, unit_files());
        string text = changes(before, files_);
        std::replace(text.begin(), text.end(), '\n', ' ');
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
        {"set in place, or at the end; comments and empty lines go",
         "#\n\nB=1\nF=1\n",
         {{0, "A", ""}, {0, "B", "2"}},
         "B=2\nF=1\nA=\n"},
        {"an item acts once", "A=1\nA=2\nA=3\n", {{0, "A", "x"}, {1, "A", ""}}, "A=x\nA=3\n"},
        {"no line feed, then a new line", "A=1\nB=2", {{0, "C", "3"}}, "A=1\nB=2\nC=3\n"},
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
    set_interfaces({"eth10", "virbr0", "eth2", "eth1", "eth01"});
    char(*names)[VLSYS_IFNAME_SIZE] = nullptr;
    ASSERT_EQ(vlsys_get_ifname_list(&names), 4) << "without lo and virbr*";
    EXPECT_STREQ(names[0], "eth01");
    EXPECT_STREQ(names[1], "eth1");
    EXPECT_STREQ(names[2], "eth2");
    EXPECT_STREQ(names[3], "eth10");
    free(names);
    char primary[VLSYS_IFNAME_SIZE] = "";
    EXPECT_GT(vlsys::get_primary_ifname(primary), 0);
    set_interfaces({"eth0"});
    EXPECT_GT(vlsys::get_primary_ifname(primary), 0);
    EXPECT_STREQ(primary, "eth01") << "the first one found stays the primary one";
}

TEST_F(Netconf, ModesAreReadFromFileAndSwitches) {
    const struct {
        const char *why, *name, *disable, *autoconf, *file;
        Mode ipv4, ipv6;
    } rows[] = {
        {"quotes", "eth0", "0", "1", "ONBOOT=\"yes\"\nBOOTPROTO=none\nIPADDR=1\n", manual,
         automatic},
        {"not BOOTPROTO=none", "eth0", "0", "0", "ONBOOT=yes\nIPADDR=1\n", dhcp, off},
        {"none, no IPADDR", "eth0", "1", "1", "BOOTPROTO=none\nONBOOT=yes\n", off, off},
        {"not ONBOOT=yes", "eth0", "0", "1", "#ONBOOT=yes\n\nONBOOT=YES\nIPV6ADDR=\n", off, manual},
        {"DHCPV6C before IPV6ADDR", "eth0", "1", "0", "IPV6ADDR=1\nDHCPV6C=yes\n", off, dhcp},
        {"the loopback is fixed", "lo", "0", "1", "ONBOOT=yes\nIPADDR=1\n", manual, automatic},
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

TEST_F(Netconf, DnsNeedsAnInterfaceAndAServer) {
    const vlsys_dns nowhere = {.server = {"1"}, .mode = manual};
    EXPECT_EQ(vlsys_set_dns_settings(&nowhere), EINVAL);
    const vlsys_dns serverless = {.server = {"", "2"}, .iface = "eth0", .mode = manual};
    EXPECT_EQ(vlsys_set_dns_settings(&serverless), EINVAL);
    EXPECT_EQ(changed(), "");
    set_interfaces({});
    const vlsys_dns none = {};
    EXPECT_EQ(vlsys_set_dns_settings(&none), ENXIO);
}

TEST_F(Netconf, AGatewayTextStandsForTheRecord) {
    EXPECT_EQ(vlsys_set_ipv4_default_gateway("1"), 0);
    EXPECT_EQ(vlsys_set_ipv6_default_gateway("1::1"), 0);
    EXPECT_TRUE(changed().starts_with("network +GATEWAY=1 +IPV6_DEFAULTGW=1::1 "));
    EXPECT_EQ(vlsys_set_ipv4_default_gateway(""), 0);
    EXPECT_EQ(vlsys_set_ipv6_default_gateway(nullptr), 0);
    EXPECT_TRUE(changed().starts_with("network -GATEWAY -IPV6_DEFAULTGW ifcfg-eth0 +DEFROUTE=no"));
}

TEST_F(Netconf, DnsIsReadFromResolverAndFiles) {
    const struct {
        const char *why, *resolver, *eth0, *eth1;
        Mode mode;
        const char *domain, *server0, *server1;
    } rows[] = {
        {"one file lacks PEERDNS=no", "", "PEERDNS=no\n", "PEERDNS=yes\n", dhcp, "", "", ""},
        {"all files have it", "", "PEERDNS=no\n", "PEERDNS=no\n", off, "", "", ""},
        {"DOMAIN wins", "", "PEERDNS=no\n", "PEERDNS=no\nDOMAIN=\n", manual, "", "", ""},
        {"the last domain", "#\n;\n\ndomain a\nsearch b c\n", "", "", dhcp, "b", "", ""},
        {"servers in order", "nameserver 1\n nameserver\t2\n", "", "", dhcp, "", "1", "2"},
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
    run("rm " + scripts + "eth0");
    EXPECT_EQ(vlsys_get_dns_settings(&dns), ENOENT);
    set_interfaces({});
    EXPECT_EQ(vlsys_get_dns_settings(&dns), 0);
    EXPECT_EQ(dns.mode, off) << "there is no interface";
}

TEST_F(Netconf, AHostNameIsWellFormed) {
    const string l63(63, 'a');
    const string l254 = l63 + "." + l63 + "." + l63 + "." + string(62, 'a');
    for (const string &good : {string(), string("aAzZ-09.b"), string("a."), l254, l254 + "."})
        EXPECT_EQ(vlsys::check_hostname_format(good.c_str()), 0) << good;
    for (const char *bad : {"a--b", "-a", "a-", ".a", "a..b", "a.-b", "a-.b", "a_b", "\xe4"})
        EXPECT_EQ(vlsys::check_hostname_format(bad), -1) << bad;
    for (const string &too_long : {l254 + "a", l254 + "..", "b.a" + l63})
        EXPECT_EQ(vlsys::check_hostname_format(too_long.c_str()), -1) << too_long;
    EXPECT_TRUE(logged(LOG_ERR, l254 + "a: too long: 255"));
    EXPECT_TRUE(logged(LOG_ERR, "b.a" + l63 + ": label[1] \"a" + l63 + "\" is too long (64)"));
}

TEST_F(Netconf, AHostNameIsWrittenAndPutInForce) {
    const string longest = string(49, 'a') + "." + string(14, 'b');
    char name[VLSYS_HOSTNAME_SIZE] = "";
    EXPECT_EQ(vlsys_set_hostname("a_b"), 0) << "unchecked";
    EXPECT_TRUE(logged(LOG_INFO, "hostname: a_b"));
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
    EXPECT_EQ(vlsys_set_hostname_immediately("c_d"), VLSYS_HOSTNAME_REFUSED);
    EXPECT_EQ(vlsys_set_hostname_immediately((longest + "b").c_str()), VLSYS_HOSTNAME_REFUSED);
    EXPECT_EQ(changed(), "");
}
