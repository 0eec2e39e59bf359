#include "fixture.h"
#include "vlsys.h"

#include <cerrno>
#include <cstring>
#include <functional>

using namespace test;

static constexpr char scripts[] = "/etc/sysconfig/network-scripts/";

// A setting that passes and that the network scripts serve.
struct Setting {
    vlsys_ifconf nifs[2] = {
        {.name = "eth0",
         .addr = "192.168.1.10",
         .netmask = "24",
         .ipv4_mode = VLSYS_MODE_MANUAL,
         .ipv6_mode = VLSYS_MODE_AUTO},
        {.name = "eth1",
         .ipv4_mode = VLSYS_MODE_DHCP,
         .addr6 = {{.addr = "fd00:2::20", .prefix = 64}},
         .ipv6_mode = VLSYS_MODE_MANUAL},
    };
    vlsys_gw4 gw4 = {.addr = "192.168.1.1", .mode = VLSYS_MODE_MANUAL};
    vlsys_gw6 gw6 = {.iface = "eth0", .mode = VLSYS_MODE_AUTO};
    vlsys_dns dns = {.domain = "example.com", .server = {"192.168.1.1"}, .mode = VLSYS_MODE_MANUAL};
    char hostname[VLSYS_HOSTNAME_SIZE] = "studio-1";
};

static int apply(Setting &setting, int *step) {
    return vlsys_set_network(setting.nifs, 2, &setting.gw4, &setting.gw6, &setting.dns,
                             setting.hostname, step);
}

static std::string all_files() {
    return capture("cd /etc/sysconfig && cat network network-scripts/* /etc/sysctl.d/velmora").text;
}

class SetNetwork : public Unit {
  protected:
    void SetUp() override {
        Unit::SetUp();
        set_interfaces({"eth0", "eth1"});
    }
};

TEST_F(SetNetwork, WritesEveryPartOfTheSetting) {
    Setting setting;
    int step = -1;
    EXPECT_EQ(apply(setting, &step), 0);
    EXPECT_EQ(step, VLSYS_STEP_NONE);
    EXPECT_EQ(apply(setting, nullptr), 0) << "the step is not wanted";
    for (const char *line : {"IPADDR=192.168.1.10\n", "NETMASK=255.255.255.0\n", "BOOTPROTO=dhcp\n",
                             "IPV6ADDR=fd00:2::20/64\n", "GATEWAY=192.168.1.1\n",
                             "DNS1=192.168.1.1\n", "DOMAIN=example.com\n", "HOSTNAME=studio-1\n",
                             "net.ipv6.conf.eth0.accept_ra_defrtr = 1\n"})
        EXPECT_NE(all_files().find(line), std::string::npos) << line;
}

TEST_F(SetNetwork, KeepsTextThatTheCheckDoesNotReadOutOfTheFiles) {
    static constexpr char command[] = "$(touch x)";
    const struct {
        const char *why;
        std::function<void(Setting &)> change;
    } cases[] = {
        {"the address of an IPv4 gateway that is learnt",
         [](Setting &setting) {
             setting.gw4 = {.iface = "eth1", .mode = VLSYS_MODE_DHCP};
             strcpy(setting.gw4.addr, command);
         }},
        {"the address of an IPv6 gateway that is learnt",
         [](Setting &setting) { strcpy(setting.gw6.addr, command); }},
        {"domain and servers of DNS by DHCP",
         [](Setting &setting) {
             setting.dns.mode = VLSYS_MODE_DHCP;
             strcpy(setting.dns.domain, command);
             strcpy(setting.dns.server[0], command);
         }},
        {"the addresses of an interface that learns them",
         [](Setting &setting) {
             strcpy(setting.nifs[1].addr, command);
             strcpy(setting.nifs[0].addr6[0].addr, command);
         }},
    };
    for (const auto &row : cases) {
        SCOPED_TRACE(row.why);
        Setting setting;
        row.change(setting);
        EXPECT_EQ(apply(setting, nullptr), 0);
        EXPECT_EQ(all_files().find(command), std::string::npos);
        EXPECT_EQ(memmem(&setting, sizeof setting, command, strlen(command)), nullptr)
            << "the records are cleared, too";
    }
}

TEST_F(SetNetwork, RefusesBeforeAnythingIsWritten) {
    const struct {
        const char *why;
        std::function<void(Setting &)> change;
        int result;
    } cases[] = {
        {"IPv4 cannot be Auto",
         [](Setting &setting) { setting.nifs[1].ipv4_mode = VLSYS_MODE_AUTO; }, EINVAL},
        {"no such mode of IPv6", [](Setting &setting) { setting.nifs[0].ipv6_mode = 4; }, EINVAL},
        {"the IPv4 gateway cannot be Auto",
         [](Setting &setting) { setting.gw4.mode = VLSYS_MODE_AUTO; }, EINVAL},
        {"no such mode of the IPv6 gateway", [](Setting &setting) { setting.gw6.mode = 4; },
         EINVAL},
        {"DNS cannot be Auto", [](Setting &setting) { setting.dns.mode = VLSYS_MODE_AUTO; },
         EINVAL},
        {"the check finds a fault", [](Setting &setting) { strcpy(setting.gw4.addr, "router"); },
         VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_IPV4_GATEWAY, VLSYS_CHECK_KIND_INVALID)},
    };
    const std::string before = all_files();
    for (const auto &row : cases) {
        SCOPED_TRACE(row.why);
        Setting setting;
        row.change(setting);
        int step = -1;
        EXPECT_EQ(apply(setting, &step), row.result);
        EXPECT_EQ(step, VLSYS_STEP_CHECK);
        EXPECT_EQ(all_files(), before);
    }
}

TEST_F(SetNetwork, NamesTheStepThatFailed) {
    Setting setting;
    int step = -1;
    run("rm /etc/sysconfig/network && mkdir -p /etc/sysconfig/network/full");
    EXPECT_EQ(apply(setting, &step), EISDIR);
    EXPECT_EQ(step, VLSYS_STEP_IPV4_GATEWAY);
    set_interfaces({"eth0"}); // the check lets a missing eth1 pass
    EXPECT_EQ(apply(setting, &step), ENXIO);
    EXPECT_EQ(step, VLSYS_STEP_NETIF);
}

TEST_F(SetNetwork, SetsTheServersThatTheCheckLeaves) {
    Setting setting;
    for (int i : {0, 2})
        strcpy(setting.dns.server[i], "192.168.1.1");
    strcpy(setting.dns.server[1], "192.168.1.2");
    EXPECT_EQ(apply(setting, nullptr), 0);
    EXPECT_STREQ(setting.dns.server[0], "192.168.1.2");
    EXPECT_STREQ(setting.dns.server[1], "192.168.1.1");
    EXPECT_STREQ(setting.dns.server[2], "");
    EXPECT_NE(read_file(std::string(scripts) + "ifcfg-eth0").find("DNS1=192.168.1.2\n"),
              std::string::npos);
}

TEST_F(SetNetwork, WarnsOfWhatTheScriptsDoNotServe) {
    const struct {
        const char *why;
        std::function<void(Setting &)> change;
        const char *warning;
    } cases[] = {
        {"all is served", [](Setting &) {}, nullptr},
        {"a link-local gateway is served",
         [](Setting &setting) {
             setting.gw6 = {.addr = "fe80::1%eth0", .mode = VLSYS_MODE_MANUAL};
         },
         nullptr},
        {"a global gateway in a learnt subnet",
         [](Setting &setting) { setting.gw6 = {.addr = "fd00:9::1", .mode = VLSYS_MODE_MANUAL}; },
         "4 the network scripts install no global IPv6 gateway in a learnt subnet: fd00:9::1\n"},
        {"a link-local address",
         [](Setting &setting) { strcpy(setting.nifs[1].addr6[0].addr, "fe80::20%eth1"); },
         "4 eth1: the network scripts refuse a link-local IPv6 address: fe80::20%eth1\n"},
        {"an IPv4 gateway beyond the lease",
         [](Setting &setting) { strcpy(setting.gw4.addr, "10.9.9.1"); },
         "4 the network scripts install no IPv4 gateway outside the fixed subnets: 10.9.9.1\n"},
    };
    for (const auto &row : cases) {
        SCOPED_TRACE(row.why);
        Setting setting;
        row.change(setting);
        take_log();
        EXPECT_EQ(apply(setting, nullptr), 0);
        const std::string log = take_log();
        if (row.warning)
            EXPECT_NE(log.find(row.warning), std::string::npos) << log;
        else
            EXPECT_EQ(log.find("network scripts"), std::string::npos) << log;
    }
}

TEST(CheckText, SaysEveryResultInWords) {
    const vlsys_ifconf nifs[] = {
        {.name = "eth0", .ipv6_mode = VLSYS_MODE_AUTO},
        {.name = "eth1", .ipv6_mode = VLSYS_MODE_MANUAL},
    };
    const struct {
        const char *why;
        int code;
        const char *text;
    } cases[] = {
        {"of one interface",
         VLSYS_CHECK_CODE(1, VLSYS_CHECK_FIELD_IPV4_NETMASK, VLSYS_CHECK_KIND_NETMASK),
         "eth1: the IPv4 netmask has a gap"},
        {"of the whole setting",
         VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_HOSTNAME, VLSYS_CHECK_KIND_SYNTAX),
         "the host name is not well-formed"},
        {"an overlap does not say of which two",
         VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_IPV4_ADDR, VLSYS_CHECK_KIND_OVERLAP),
         "the IPv4 address is in the subnet of another interface"},
        {"a gateway that is an interface's broadcast address",
         VLSYS_CHECK_CODE(1, VLSYS_CHECK_FIELD_IPV4_GATEWAY, VLSYS_CHECK_KIND_BROADCAST),
         "eth1: the IPv4 gateway is the broadcast address of the network"},
        {"the mode of DNS",
         VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_DNS_DOMAIN, VLSYS_CHECK_KIND_MODE),
         "the DNS mode does not go with the modes of the interfaces"},
        {"an IPv6 address",
         VLSYS_CHECK_CODE(1, VLSYS_CHECK_FIELD_IPV6_ADDR, VLSYS_CHECK_KIND_INVALID),
         "eth1: the IPv6 address is missing or not valid"},
        {"eth0 has no fixed IPv6 address",
         VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_IPV6_ADDR, VLSYS_CHECK_KIND_INVALID),
         "the third DNS server is missing or not valid"},
        {"an address is never unreachable",
         VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_IPV6_ADDR, VLSYS_CHECK_KIND_UNREACHABLE),
         "the third DNS server cannot be reached"},
        {"an interface beyond the list",
         VLSYS_CHECK_CODE(2, VLSYS_CHECK_FIELD_IFNAME, VLSYS_CHECK_KIND_NO_IFACE),
         "interface 3: the interface name names no interface"},
        {"no field", VLSYS_CHECK_CODE(0, 0, VLSYS_CHECK_KIND_SYNTAX), "unknown fault 0x104"},
        {"no kind", VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_HOSTNAME, 12), "unknown fault 0x1ac"},
        {"no fault", 0, "no fault"},
        {"an errno", EFAULT, "error 14: Bad address"},
        {"a resolver code", -10, "error -10: Memory allocation failure"},
    };
    for (const auto &row : cases) {
        SCOPED_TRACE(row.why);
        char text[160];
        EXPECT_EQ(vlsys_check_text(row.code, nifs, 2, text, sizeof text), strlen(row.text));
        EXPECT_STREQ(text, row.text);
    }
    char cut[4];
    EXPECT_EQ(vlsys_check_text(0, nullptr, 0, cut, sizeof cut), strlen("no fault"));
    EXPECT_STREQ(cut, "no ");
    EXPECT_EQ(vlsys_check_text(0, nullptr, 0, nullptr, 9), strlen("no fault"));
}
