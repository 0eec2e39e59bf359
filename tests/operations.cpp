#include "operations.h"

#include "fixture.h"

#include <filesystem>
#include <sys/wait.h>
#include <unistd.h>

namespace fs = std::filesystem;

int factory_main(); // the tool

namespace test {

static const vlsys_ifconf manual = {
    .name = "eth0",
    .addr = "192.168.0.10",
    .netmask = "255.255.255.0",
    .prefix = 24,
    .ipv4_mode = VLSYS_MODE_MANUAL,
    .addr6 = {{.addr = "2001:db8::5", .prefix = 64}},
    .ipv6_mode = VLSYS_MODE_MANUAL,
};
static const vlsys_gw4 gw4 = {.iface = "eth0", .addr = "192.168.0.1", .mode = VLSYS_MODE_MANUAL};
static const vlsys_gw4 learnt_gw4 = {.iface = "eth0", .mode = VLSYS_MODE_DHCP};
static const vlsys_gw6 gw6 = {.iface = "eth0", .addr = "2001:db8::1", .mode = VLSYS_MODE_MANUAL};
static const vlsys_dns dns = {
    .domain = "example.com",
    .server = {"192.168.0.1", "2001:db8::1"},
    .iface = "eth0",
    .mode = VLSYS_MODE_MANUAL,
};

static long start(Records &records) {
    const int result = vlsys_init();
    vlsys_get_path_data(records.text, sizeof records.text);
    vlsys_exit();
    return result;
}

static long list_interfaces(Records &records) {
    char(*names)[VLSYS_IFNAME_SIZE] = nullptr;
    const int count = vlsys_get_ifname_list(&names);
    for (int i = 0; i < count && i < 4; i++)
        vlsys_strlcpy(records.names[i], names[i], VLSYS_IFNAME_SIZE);
    free(names);
    return count;
}

static long check_one(Records &records) {
    records.nifs[0] = manual;
    records.gw4 = gw4;
    records.gw6 = gw6;
    records.dns = dns;
    return vlsys_address_check(records.nifs, records.gw4.addr, records.gw6.addr, &records.dns,
                               records.text);
}

static void fill_two(Records &records) {
    records.nifs[0] = manual;
    records.nifs[1] = {.name = "eth1", .ipv4_mode = VLSYS_MODE_DHCP};
    records.gw4 = gw4;
    records.gw6 = gw6;
    records.dns = dns;
}

static long check_two(Records &records) {
    fill_two(records);
    return vlsys_address_check2(records.nifs, 2, &records.gw4, &records.gw6, &records.dns,
                                records.text);
}

static long set_network(Records &records) {
    fill_two(records);
    vlsys_strlcpy(records.text, "unit", sizeof records.text);
    return vlsys_set_network(records.nifs, 2, &records.gw4, &records.gw6, &records.dns,
                             records.text, nullptr);
}

static long connect_and_close(Records & /*records*/) {
    const int socket = vlsys_surrogate_connect(0, VLSYS_SURROGATE_PORT);
    if (socket >= 0)
        close(socket);
    return socket < 0 ? -1 : 0;
}

static long wait_for(pid_t child) {
    int status = 0;
    if (child > 0)
        waitpid(child, &status, 0);
    return child < 0 ? child : status;
}

static long read_and_close(Records & /*records*/) {
    FILE *const stream = vlsys_popen("true");
    if (!stream)
        return -1;
    while (getc(stream) != EOF)
        continue;
    return vlsys_pclose(stream);
}

static long read_version(Records &records) {
    time_t when = 0;
    vlsys_get_version(records.text, sizeof records.text, &when);
    return 0;
}

// The bits that say why not are no failure of a call.
static long scan_boards(Records & /*records*/) {
    const int boards = vlsys_avio_scan_alive();
    return boards == VLSYS_AVIO_NO_DRIVER || boards == 0 ? -1 : boards;
}

static long run_tool(Records & /*records*/) {
    const int result = factory_main();
    vlsys_exit(); // as the process would end
    return result;
}

// No surrogate parent listens in a network of one's own.
template <class Run>
static auto alone(Run run) {
    return [run](Records &records) {
        unshare(CLONE_NEWNET);
        return run(records);
    };
}

const std::vector<Operation> operations = {
    {"init", 0, Failure::negative_errno, "", "", start, Trait::starts_library},
    {"log", 0, Failure::never, "", "", [](Records &) { return vlsys_log(LOG_ERR, "text"), 0; }},

    {"set_timezone", 0, Failure::negative_errno, "clock localtime", "",
     [](Records &) { return vlsys_set_timezone("Etc/GMT"); }},
    {"get_timezone", 3, Failure::zero, "", "",
     [](Records &r) { return vlsys_get_timezone(r.text, sizeof r.text); }},
    {"get_utc_offset", 5, Failure::zero, "", "",
     [](Records &r) { return vlsys_get_utc_offset(r.text, sizeof r.text); }},

    {"get_ifname_list", 2, Failure::zero, "", "", list_interfaces},
    {"set_netif", 0, Failure::errno_value, "ifcfg-eth0 velmora", "",
     [](Records &) { return vlsys_set_netif("eth0", &manual); }},
    {"get_netif", 0, Failure::errno_value, "", "fopen reading",
     [](Records &r) { return vlsys_get_netif("eth0", r.nifs); }},
    {"set_dns_settings", 0, Failure::errno_or_enxio, "ifcfg-eth0 ifcfg-eth1", "",
     [](Records &) { return vlsys_set_dns_settings(&dns); }},
    {"get_dns_settings", 0, Failure::errno_value, "", "if_nameindex calloc",
     [](Records &r) { return vlsys_get_dns_settings(&r.dns); }},
    {"set_ipv4_default_gateway2", 0, Failure::errno_value, "network ifcfg-eth0 ifcfg-eth1",
     "if_nameindex calloc", [](Records &) { return vlsys_set_ipv4_default_gateway2(&learnt_gw4); }},
    {"get_ipv4_default_gateway2", 0, Failure::errno_value, "", "",
     [](Records &r) { return vlsys_get_ipv4_default_gateway2(&r.gw4); }},
    {"set_ipv6_default_gateway2", 0, Failure::errno_value, "network velmora", "if_nameindex calloc",
     [](Records &) { return vlsys_set_ipv6_default_gateway2(&gw6); }},
    {"get_ipv6_default_gateway2", 0, Failure::errno_value, "", "",
     [](Records &r) { return vlsys_get_ipv6_default_gateway2(&r.gw6); }},
    {"set_hostname", 0, Failure::errno_value, "network", "",
     [](Records &) { return vlsys_set_hostname("unit"); }},
    {"set_hostname_immediately", 0, Failure::errno_value, "network", "",
     [](Records &) { return vlsys_set_hostname_immediately("unit"); }},
    {"get_hostname", 0, Failure::errno_value, "", "",
     [](Records &r) { return vlsys_get_hostname(r.text); }, Trait::logs_nothing},
    {"network_restart", 0, Failure::mixed, "resolv.conf", "unlink",
     [](Records &) { return vlsys_network_restart(); }},
    {"address_check", 0, Failure::errno_value, "", "getnameinfo", check_one},
    {"address_check2", 0, Failure::errno_value, "", "getnameinfo", check_two},
    {"set_network", 0, Failure::errno_or_enxio, "ifcfg-eth0 ifcfg-eth1 network velmora",
     "getnameinfo if_nameindex calloc", set_network},

    {"surrogate_connect", 0, Failure::minus_one, "", "", connect_and_close},
    {"system", 0, Failure::minus_one, "", "", [](Records &) { return vlsys_system("true"); }},
    {"spawn", 0, Failure::minus_one, "", "",
     [](Records &) { return vlsys_spawn("true") < 0 ? -1 : 0; }},
    {"popen", 0, Failure::minus_one, "", "", read_and_close},
    {"system_alone", 0, Failure::minus_one, "", "",
     alone([](Records &) { return vlsys_system("true"); })},
    {"spawn_alone", 0, Failure::minus_one, "", "",
     alone([](Records &) { return wait_for(vlsys_spawn("true")); })},
    {"popen_alone", 0, Failure::minus_one, "", "", alone(read_and_close)},
    {"fc_cache", 0, Failure::negative_errno, "", "", [](Records &) { return vlsys_fc_cache(); }},

    {"avio_read_config", 0, Failure::minus_one, "", "",
     [](Records &) { return vlsys_avio_read_config(); }},
    {"avio_get_config", 0, Failure::minus_one, "", "",
     [](Records &) { return vlsys_avio_get_config(VLSYS_AVIO_KRD31); }},
    {"avio_scan_alive", VLSYS_AVIO_READY, Failure::minus_one, "", "", scan_boards},
    {"avio_wait_ready", 1, Failure::zero, "", "",
     [](Records &) { return vlsys_avio_wait_ready(); }},
    {"get_destination", 2, Failure::never, "", "",
     [](Records &r) { return vlsys_get_destination(r.text, sizeof r.text); }},
    {"get_fps", 59, Failure::never, "", "", [](Records &) { return vlsys_get_fps(); }},
    {"get_hdcp_capability", 1, Failure::zero, "", "",
     [](Records &) { return vlsys_get_hdcp_capability(); }},
    {"get_serial_number", 8, Failure::negative_errno, "", "",
     [](Records &r) { return vlsys_get_serial_number(r.text, sizeof r.text); }},
    {"get_version", 0, Failure::never, "", "fopen fstat reading", read_version},

    {"mkdir", 0, Failure::minus_one, "", "",
     [](Records &) { return vlsys_mkdir("/run/tree/a/b", 0755); }},
    {"remove_tree", 0, Failure::errno_value, "", "",
     [](Records &) { return access("/run/tree", F_OK) ? 0 : vlsys_remove_tree("/run/tree"); }},
    {"realpath", 8, Failure::negative_errno, "", "",
     [](Records &r) { return vlsys_realpath(r.text, "/run/../run/sda", sizeof r.text); }},
    {"get_block_device_size", 4096, Failure::negative_errno, "", "",
     [](Records &) { return vlsys_get_block_device_size("/run/sda"); }},

    {"tool", 0, Failure::minus_one, "clock localtime network ifcfg-eth0 ifcfg-eth1 velmora",
     "if_nameindex calloc", run_tool, Trait::starts_library},
};

void PrintTo(const Operation &operation, std::ostream *stream) {
    *stream << operation.name;
}

void prepare_operations() {
    set_interfaces({"eth0", "eth1"});
    run("for name in eth0 eth1; do"
        "    ip link set $name addrgenmode none && ip -6 addr flush dev $name;"
        " done;"
        "ip addr add 192.168.0.9/24 dev eth0;"
        "ip addr add 2001:db8::9/64 dev eth0 nodad;"
        "ip route add default via 192.168.0.1;"
        "ip route add default via 2001:db8::1 dev eth0;"
        "mount -t tmpfs none /sys/block;"
        "mkdir -p /sys/block/sda;"
        "echo 8 >/sys/block/sda/size;"
        "touch /run/sda");
}

void reset_files() {
    unit::make_unit_files("sy");
    fs::remove("/etc/localtime.new");
    fs::remove_all("/etc/sysctl.d"); // is made anew
    for (const char *command : {"/usr/bin/fc-cache", "/usr/sbin/service"}) {
        fs::remove(command);
        fs::create_symlink("/usr/bin/true", command);
    }
    fs::create_directories("/run/tree/c/d");
    write_file("/etc/resolv.conf", "nameserver 192.168.0.1\n");
    sethostname("localhost", 9);
}

} // namespace test
