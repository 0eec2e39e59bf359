#include "core/owners.h"
#include "core/text.h"
#include "fixture.h"
#include "netstate/routes.h"
#include "vlsys.h"

#include <cstring>
#include <ifaddrs.h>
#include <sstream>

using namespace test;
using vlsys::format_text;

using Netstate = Unit;
using Row = std::pair<std::string, std::string>;

static const std::string scripts = "/etc/sysconfig/network-scripts/ifcfg-",
                         missing = ": No such file or directory\n";

// clang-format off
// Anew, with the hardware addresses 02:00:00:00:00:01 and so on.
static void set_fixed_interfaces(const std::vector<std::string> &names) {
    set_interfaces({});
    set_interfaces(names);
    for (size_t i = 0; i < names.size(); i++)
        run("n=" + names[i] + "; ip link set $n down address 02:00:00:00:00:0" +
            std::to_string(i + 1) + " && ip link set $n up && "
            "until ip -6 addr show $n | grep -q fe80; do sleep 0.01; done");
}

static std::string show(const vlsys_ifconf &nif) {
    std::string text = format_text("%s %d %s %d %s/%s/%d/%s %d", nif.name, nif.lower_up, nif.mac,
        nif.up, nif.addr, nif.netmask, nif.prefix, nif.broadaddr, nif.has_ipv6).get();
    for (const auto &addr6 : nif.addr6)
        text += format_text(" %s/%u%s", addr6.addr, addr6.prefix, addr6.scope).get();
    return text;
}

template <class Gateway>
static std::string show(int result, const Gateway &gw) {
    return format_text("%d %s %s %u", result, gw.addr, gw.iface, gw.mode).get();
}

TEST_F(Netstate, InterfaceStateIsTheKernels) {
    const std::string down = "eth1 0 02-00-00-00-00-01 ";
    const std::string up = "eth1 1 02-00-00-00-00-01 ";
    const std::string link = " fe80::ff:fe00:1%eth1/64link";
    const std::string only_link = "1 /0" + link + " /0 /0";
    const Row rows[] = {
        {"ip addr add 10.1.0.5/32 dev eth1; ip link set eth1 down",
         down + "0 10.1.0.5/255.255.255.255/32/10.1.0.5 0 /0 /0 /0 /0"},
        {"ip addr add 10.1.0.5/20 brd + dev eth1; ip -n outside link set eth1 down",
         down + "1 10.1.0.5/255.255.240.0/20/10.1.15.255 " + only_link},
        {"ip addr add 10.1.0.5/24 dev eth1; ip addr add 10.2.0.4/31 dev eth1 label eth1:1",
         up + "1 10.2.0.4/255.255.255.254/31/10.2.0.4 " + only_link},
        {"for i in 1/128 2/3 3/64 4/65 5/127; do ip addr add fd00::$i dev eth1; done",
         up + "0 //0/ 1 fd00::5/127global" + link + " fd00::4/65global fd00::1/128global"},
        {"for i in fec0::1/48 fe80::5/10 fd00::2/64; do ip addr add $i dev eth1; done",
         up + "0 //0/ 1 fec0::1/48site" + link + " /0 /0"},
        {"ip link add eth10 address 02:00:00:00:00:09 type veth peer name x netns outside",
         "eth1 0 02-00-00-00-00-09 0 //0/ " + only_link}};
    for (const auto &[commands, state] : rows) {
        set_fixed_interfaces({"eth1"});
        run(commands);
        vlsys_ifconf nif = {};
        EXPECT_EQ(vlsys_get_netif("eth1", &nif), 0);
        EXPECT_EQ(show(nif), state) << commands;
    }
}

TEST_F(Netstate, InterfaceQueryFails) {
    set_fixed_interfaces({"eth0"});
    vlsys_ifconf nif = {};
    nif.up = nif.has_ipv6 = 1;
    vlsys_strlcpy(nif.addr6[3].addr, "stale", VLSYS_ADDR6_SIZE);
    EXPECT_EQ(vlsys_get_netif(nullptr, &nif) + vlsys_get_netif("eth0", nullptr), 2 * EFAULT);
    EXPECT_EQ(vlsys_get_netif("eth", &nif), ENXIO);
    fail_call("getifaddrs", 1, ENOMEM);
    EXPECT_EQ(vlsys_get_netif("eth0", &nif), ENOMEM);
    EXPECT_EQ(take_log(), "3 getifaddrs: Cannot allocate memory\n");
    EXPECT_EQ(show(nif), " 0  1 //0/ 1 /0 /0 /0 stale/0");
    before_call("getifaddrs", [] { unlink((scripts + "eth0").c_str()); });
    EXPECT_EQ(vlsys_get_netif("eth0", &nif), ENOENT);
    EXPECT_EQ(show(nif), "eth0 1 02-00-00-00-00-01 0 //0/ 1 /0 fe80::ff:fe00:1%eth0/64link /0 /0");
    before_call("getifaddrs", [] { set_interfaces({}); });
    nif = {};
    nif.has_ipv6 = 1;
    EXPECT_EQ(vlsys_get_netif("eth0", &nif), ENOENT);
    EXPECT_EQ(show(nif), " 0  0 //0/ 0 /0 /0 /0 /0");
}

template <class Gateway>
static std::string read(int (*reader)(FILE *, Gateway *), const std::string &table) {
    Gateway gw = {};
    const vlsys::File file(fmemopen(const_cast<char *>(table.data()), table.length(), "r"));
    return show(reader(file.get(), &gw), gw);
}

TEST_F(Netstate, RoutingTablesAreReadLineByLine) {
    const std::string any(32, '0');
    const std::string piece(159, 'x');
    const std::string to_any = any + " 00 " + any + " 00 ";
    const std::string via = to_any + "20010db8000000000000000000000001 ";
    const Row ipv6[] = {
        {any + "\n" + via + "0 1 0 1 a\n" + via + "0 1 0 2 b\n1" + via.substr(1) + "0 1 0 3 c\n" +
         piece + via + "0 1 0 3 d\n", "0   0"},
        {any + " 40" + via.substr(35) + "0 00000001 0 00450003\n" + via, "0 2001:db8::1  1"},
        {to_any + "20010db8 0 100000001 0 fffffffff over_15_letters_",
         "0 2001:db8:: over_15_letters 3"},
        {to_any + "febf0000000000000000000000000001\t0 0 0 3 eth0", "0 febf::1%eth0 eth0 3"}};
    const Row ipv4[] = {
        {"Iface\tDestination\tGateway\na 1 1 3 0 0 0 0\nb 0 2 3 0 0 0 1\nc 0 3\n" + piece +
         "d 0 4 3 0 0 0 0\ne 0 5 3 0 0 0 100000000\nf 100000000 6 3 0 0 0 0\n", "0   0"},
        {"a\t0\t0101A8C0\t3\t0\t0\t0\t00000000\nb 0 7 3 0 0 0 0\n", "0 192.168.1.1 a 0"},
        {"over_15_letters_ 0 1FFFFFFFF 0 0 0 0 0", "0 255.255.255.255 over_15_letters 0"}};
    for (const auto &[table, gateway] : ipv6)
        EXPECT_EQ(read(vlsys::read_ipv6_gateway, table), gateway) << table;
    for (const auto &[table, gateway] : ipv4)
        EXPECT_EQ(read(vlsys::read_ipv4_gateway, table), gateway) << table;
}

TEST_F(Netstate, GatewaysAreReadFromKernelAndFiles) {
    const Row rows[] = {
        {"echo GATEWAY= >../network; rm ifcfg-eth1", "0   1, 0   0\n"},
        {"for i in 4 6; do ip -$i route add default dev eth0; done;echo BOOTPROTO=dhcp >ifcfg-eth0",
         "0 0.0.0.0 eth0 2, 0   0\n"},
        {"echo BOOTPROTO=dhcp >ifcfg-eth0; rm ifcfg-eth1",
         "2   2, 0   0\n3 /run" + scripts + "eth1" + missing},
        {"ip addr add 10.1.0.5/24 dev eth0; ip route add default via 10.1.0.1; rm ../network",
         "2 10.1.0.1 eth0 0, 0   0\n3 /run/etc/sysconfig/network" + missing}};
    setenv("VL_ROOT", "/run", 1);
    vlsys_exit();
    vlsys_init();
    unsetenv("VL_ROOT");
    vlsys_gw4 gw4 = {};
    vlsys_gw6 gw6 = {};
    const std::string prepare = "mkdir -p /run" + scripts + "; cd /run" + scripts + "/..; "
        "echo '#GATEWAY=\nGATEWAYDEV=1' >../network; echo 'BOOTPROTO=\"dhcp\"' >ifcfg-eth1; "
        "echo 'BOOTPROTO=dhcp\nDEFROUTE=no' >ifcfg-eth0; ";
    for (const auto &[commands, gateways] : rows) {
        set_fixed_interfaces({"eth0", "eth1"});
        run(prepare + commands);
        take_log();
        std::string state = show(vlsys_get_ipv4_default_gateway2(&gw4), gw4);
        state += ", " + show(vlsys_get_ipv6_default_gateway2(&gw6), gw6) + "\n";
        EXPECT_EQ(state + take_log(), gateways);
    }
    EXPECT_EQ(vlsys_get_ipv4_default_gateway(gw4.addr), ENOENT);
    EXPECT_STREQ(gw4.addr, "");
}

static const std::string label(63, 'd'), domain = label + "." + label + ".example";

// Writes a setting by the modes of eth0 and eth1, and restarts; the gateways are eth0's.
static int restart_with(const uint32_t (&v4)[2], const uint32_t (&v6)[2], uint32_t dns_mode) {
    vlsys_ifconf nif[] = {
        {0, "eth0", 0, "", 0, "192.168.1.9", "", "", 24, v4[0], 0, {{"fd00:1::9", 64, ""}}, v6[0]},
        {0, "eth1", 0, "", 0, "192.168.2.9", "", "", 24, v4[1], 0, {{"fd00:2::9", 64, ""}}, v6[1]}};
    vlsys_gw4 gw4 = {"eth0", "", v4[0]};
    vlsys_gw6 gw6 = {"eth0", "", v6[0]};
    vlsys_dns dns = {"", {}, "eth0", dns_mode};
    domain.copy(dns.domain, domain.length());
    vlsys_strlcpy(gw4.addr, v4[0] == VLSYS_MODE_MANUAL ? "192.168.1.1" : "", sizeof gw4.addr);
    vlsys_strlcpy(gw6.addr, v6[0] == VLSYS_MODE_MANUAL ? "fd00:1::1" : "", sizeof gw6.addr);
    vlsys_strlcpy(dns.server[0], v4[0] ? "192.168.1.1" : "fd00:1::1", VLSYS_ADDR6_SIZE);
    char hostname[VLSYS_HOSTNAME_SIZE] = "studio-1";
    const int fault = vlsys_address_check2(nif, 2, &gw4, &gw6, &dns, hostname);
    if (fault != 0)
        return fault;
    EXPECT_EQ(vlsys_set_netif("eth0", &nif[0]) + vlsys_set_netif("eth1", &nif[1]) +
              vlsys_set_ipv4_default_gateway2(&gw4) + vlsys_set_ipv6_default_gateway2(&gw6) +
              vlsys_set_dns_settings(&dns) + vlsys_set_hostname(hostname), 0);
    return vlsys_network_restart();
}

// The messages of a restart from its own first one on, without traces.
static std::string take_report() {
    std::istringstream log(take_log());
    std::string report;
    for (std::string line; std::getline(log, line);)
        if (line[0] != '7' && (!report.empty() || line.find("k_restart: ") != std::string::npos))
            report += line + "\n";
    return report;
}

static const std::string me = " vlsys_network_restart: ",
                         end = "6" + me + "exited (service network restart), ";

TEST_F(Netstate, SettingInForceIsTheSettingWritten) {
    const std::string ipv4[] = {"", "192.168.1.9/24", "192.168.1.100/24"};
    const std::string ipv6[] = {"", "fd00:1::9/64, fe80::ff:fe00:1%eth0/64",
                                "fd00:1::100/64, fe80::ff:fe00:1%eth0/64, fd00:1::ff:fe00:1/64",
                                "fd00:1::ff:fe00:1/64, fe80::ff:fe00:1%eth0/64"};
    set_fixed_interfaces({"eth0", "eth1", "eth2"});
    EXPECT_EQ(restart_with({2, 1}, {3, 1}, 1), 0);
    EXPECT_EQ(take_report(), end + "status: 0\n6 hostname: studio-1\n6 mode: DMAM0MM44\n"
                             "6 eth0: link up, MAC: 02-00-00-00-00-01\n"
                             "6 192.168.1.100/24, fd00:1::ff:fe00:1/64, fe80::ff:fe00:1%eth0/64\n"
                             "6 eth1: link up, MAC: 02-00-00-00-00-02\n"
                             "6 192.168.2.9/24, fd00:2::9/64, fe80::ff:fe00:2%eth1/64\n"
                             "6 gw4 192.168.1.1 (eth0) [dhcp], gw6 fe80::1%eth0 (eth0) [static]\n"
                             "6 DNS domain: " + domain + "  server: 19\n"); // 159 characters
    int restarts = 0;
    for (uint32_t i = 0; i < 36; i++) {
        const uint32_t mode4 = i / 12;
        const uint32_t mode6 = i / 3 % 4;
        const uint32_t mode = i % 3;
        const int result = restart_with({mode4, 0}, {mode6, 0}, mode);
        const std::string log = take_log();
        if (VLSYS_CHECK_IS_CODE(result))
            continue; // DNS without a family that carries it
        restarts++;
        EXPECT_TRUE(take_waits().empty() || mode6 != 0); // IPv6 Off is queried once
        EXPECT_EQ(result, 0);
        std::string modes = log.substr(log.find(" mode: "), 16); // as the validator names them
        modes[12] = mode6 ? 'M' : '_'; // the kernel counts one reference to a route not in use
        if (mode == VLSYS_MODE_MANUAL && (mode4 == VLSYS_MODE_DHCP || mode6 == VLSYS_MODE_DHCP))
            modes[15] = mode6 == VLSYS_MODE_DHCP ? '6' : '4'; // the last lease's server stays
        const std::string link = mode4 + mode6 == 0 ? "no carrier, MAC: 02-00-00-00-00-01" :
            "link up, MAC: 02-00-00-00-00-01\n6 " + ipv4[mode4] +
            (mode4 && mode6 ? ", " : "") + ipv6[mode6];
        const auto lines = format_text("\n6%s\n6 eth0: %s\n6 ", modes.c_str(), link.c_str());
        EXPECT_NE(log.find(lines.get()), std::string::npos) << log;
    }
    EXPECT_EQ(restarts, 12 + 11 + 6);
}

TEST_F(Netstate, ReportShowsWhatTheNetworkScriptsMadeOfTheFiles) {
    const struct {
        const char *why, *commands;
        int result;
        const char *line;
    } rows[] = {
        {"an interface that fails leaves the others alone",
         "ip -n outside link set eth0 down; "
         "echo 'DEVICE=eth1\nIPADDR=192.168.2.9\nNETMASK=255.255.255.0' >ifcfg-eth1",
         1, "\n6 192.168.2.9/24, "},
        {"a file without DEVICE does not come up", "echo ONBOOT=yes >ifcfg-eth1", 1,
         "\n6 eth1: link up, MAC: 02-00-00-00-00-02\n6 fe80::ff:fe00:2%eth1/64\n"},
        {"a killed writer's interface file counts", "touch ifcfg-eth0-AbCd12", 1,
         "\n6 192.168.1.100/24, "},
        {"a killed writer's switches win",
         "echo net.ipv6.conf.eth0.disable_ipv6=1 >/etc/sysctl.d/velmora-AbCd12", 0,
         "\n6 192.168.1.100/24\n"},
        {"a gateway outside the lease's subnet gives none", "echo GATEWAY=192.168.2.1 >>../network",
         0, "\n6 gw4  () [static], "},
        {"a global gateway of a prefix that is yet to come is lost",
         "echo IPV6_DEFAULTGW=fd00:1::1 >>../network; "
         "echo net.ipv6.conf.eth0.accept_ra_defrtr=0 >>/etc/sysctl.d/velmora",
         0, ", gw6 [off]\n"},
        {"a link-local gateway is not",
         "echo IPV6_DEFAULTGW=fe80::1%eth0 >>../network; "
         "echo net.ipv6.conf.eth0.accept_ra_defrtr=0 >>/etc/sysctl.d/velmora",
         0, ", gw6 fe80::1%eth0 (eth0) [static]\n"},
        {"an empty DOMAIN keeps the lease's", "echo 'DNS1=10.0.0.1\nDOMAIN=' >>ifcfg-eth0", 0,
         "\n6 DNS domain: lan1.example  server: 10.0.0.1, 192.168.1.1\n"},
        {"an advertisement may come after the report", "echo 1 >/run/advertisement-delay", 0,
         "\n6 192.168.1.100/24, fe80::ff:fe00:1%eth0/64\n"},
    };
    for (const auto &row : rows) {
        SCOPED_TRACE(row.why);
        unit::make_unit_files("sy");
        set_fixed_interfaces({"eth0", "eth1"});
        ASSERT_EQ(chdir("/etc/sysconfig/network-scripts"), 0);
        run(row.commands);
        take_log();
        EXPECT_EQ(vlsys_network_restart(), row.result);
        const std::string report = take_report();
        EXPECT_NE(report.find(row.line), std::string::npos) << report;
    }
    run("until ip -6 addr show eth0 | grep -q fd00:1::ff:fe00:1/64; do sleep 0.1; done");
}

TEST_F(Netstate, RestartGivesTheResultOfTheCommand) {
    const std::string name(65, 'x');
    const std::string network = "/etc/sysconfig/network";
    const std::string no_carrier =
        "\n6 hostname: x\n6 mode: D_A_M____\n6 eth0: no carrier, MAC: 02-00-00-00-00-01\n"
        "6 gw4  () [static], gw6 [off]\n6 DNS domain:   server: \n";
    // Commands, status from the surrogate parent, messages, result, waits.
    const std::tuple<std::string, std::string, std::string, int, size_t> rows[] = {
        {"", "0", end + "status: 0" + no_carrier, 0, 10},
        {"", "256", end + "status: 1" + no_carrier, 1, 0},
        {"", "9", end + "abnormally, signaled: 9" + no_carrier, 256, 0},
        {"mkdir /etc/resolv.conf", "", "4" + me + "unlink(/etc/resolv.conf): Is a directory\n"
         "6 CMD: service network restart\n3" + me + "vlsys_system(service network restart): "
         "Connection reset by peer\n", -1, 0},
        {"echo HOSTNAME=" + name + " >" + network, "", "3" + me + "sethostname(" + name +
         ", 65): Invalid argument\n", -EINVAL, 0},
        {"rm " + network + " " + scripts + "eth0", "", "", ENOENT, 0},
        {"test -z \"$(hostname)\"; rmdir /etc/resolv.conf; ip link del eth0", "32512",
         end + "status: 127\n6 hostname: \n3 no netif exist\n", 127, 0}};
    set_fixed_interfaces({"eth0"});
    run("ip link set eth0 down");
    write_file(network, "#HOSTNAME=y\n\nGATEWAY=1\nHOSTNAME=\"x\"y\nHOSTNAME=z\n");
    for (const auto &[commands, status, log, result, waits] : rows) {
        run("true; " + commands);
        const ScriptedSurrogate surrogate(status, ScriptedSurrogate::Then::close);
        EXPECT_EQ(vlsys_network_restart(), result);
        EXPECT_EQ(take_waits(), std::vector<int64_t>(waits, 1000000000));
        EXPECT_EQ(take_report(), log);
    }
    unlink("/usr/sbin/service");
    EXPECT_EQ(vlsys_network_restart(), 127);
}
