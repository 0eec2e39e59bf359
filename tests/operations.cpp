#include "operations.h"

#include "fixture.h"

#include <filesystem>
#include <sys/wait.h>
#include <unistd.h>

namespace fs = std::filesystem;

int factory_main(); // the tool

namespace test {

const Records given = make("eth1.ipv4=DHCP gw6=2001:db8::2 server1=2001:db8::2");

int check_one(Records &r) {
    return vlsys_address_check(r.nifs, r.gw4.addr, r.gw6.addr, &r.dns, r.text);
}

int check_both(Records &r) {
    return vlsys_address_check2(r.nifs, 2, &r.gw4, &r.gw6, &r.dns, r.text);
}

int set_network(Records &r) {
    return vlsys_set_network(r.nifs, 2, &r.gw4, &r.gw6, &r.dns, r.text, &r.step);
}

static long list_interfaces(Records & /*r*/) {
    char(*names)[VLSYS_IFNAME_SIZE] = nullptr;
    const int count = vlsys_get_ifname_list(&names);
    free(names);
    return count;
}

static long restart_network(Records &r) {
    const int result = vlsys_network_restart();
    const std::string hostname = read_file("/proc/sys/kernel/hostname");
    vlsys_strlcpy(r.text, hostname.c_str(), sizeof r.text);
    return result;
}

static long connect_and_close(Records & /*r*/) {
    const int socket = vlsys_surrogate_connect(0, VLSYS_SURROGATE_PORT);
    if (socket >= 0)
        close(socket);
    return socket < 0 ? -1 : 0;
}

static long read_and_close(Records & /*r*/) {
    FILE *const stream = vlsys_popen("true");
    if (!stream)
        return -1;
    while (getc(stream) != EOF)
        continue;
    return vlsys_pclose(stream);
}

static long spawn_and_wait(Records & /*r*/) {
    const pid_t child = vlsys_spawn("true");
    int status = 0;
    if (child > 0)
        waitpid(child, &status, 0);
    return child < 0 ? child : status;
}

// Runs an operation in a network of its own, where no surrogate parent listens.
template <class Run>
static auto alone(Run run) {
    return [run](Records &r) {
        if (unshare(CLONE_NEWNET) != 0)
            abort();
        return run(r);
    };
}

// Name, good result, results of a failure, the call, what it passes over.
const std::vector<Operation> operations = {
    {"init", 8, "-errno",
     [](auto &r) { return vlsys_init() < 0 ? -errno : vlsys_get_path_data(r.text, 9); }},
    {"log", 0, "", [](auto &) { return vlsys_log(LOG_ERR, "text"), 0; }},

    {"set_timezone", 0, "-errno", [](auto &) { return vlsys_set_timezone("Etc/GMT"); }},
    {"get_timezone", 3, "0", [](auto &r) { return vlsys_get_timezone(r.text, 9); }},
    {"get_utc_offset", 5, "0", [](auto &r) { return vlsys_get_utc_offset(r.text, 9); }},

    {"get_ifname_list", 2, "0", list_interfaces},
    {"set_netif", 0, "errno", [](auto &r) { return vlsys_set_netif("eth0", r.nifs); }},
    {"get_netif", 0, "errno", [](auto &r) { return vlsys_get_netif("eth0", r.nifs); }, "fopen"},
    {"set_dns_settings", 0, "errno ENXIO", [](auto &r) { return vlsys_set_dns_settings(&r.dns); }},
    {"get_dns_settings", 0, "errno", [](auto &r) { return vlsys_get_dns_settings(&r.dns); },
     "if_nameindex calloc"},
    {"set_ipv4_default_gateway2", 0, "errno",
     [](auto &r) { return vlsys_set_ipv4_default_gateway2(&r.gw4); }, "if_nameindex calloc"},
    {"get_ipv4_default_gateway", 0, "errno",
     [](auto &r) { return vlsys_get_ipv4_default_gateway(r.text); }},
    {"set_ipv6_default_gateway2", 0, "errno",
     [](auto &r) { return vlsys_set_ipv6_default_gateway2(&r.gw6); }, "if_nameindex calloc"},
    {"get_ipv6_default_gateway", 0, "errno",
     [](auto &r) { return vlsys_get_ipv6_default_gateway(r.text); }},
    {"set_hostname", 0, "errno", [](auto &) { return vlsys_set_hostname("unit"); }},
    {"set_hostname_immediately", 0, "errno",
     [](auto &) { return vlsys_set_hostname_immediately("unit"); }},
    {"get_hostname", 0, "errno silent", [](auto &r) { return vlsys_get_hostname(r.text); }},
    {"network_restart", 0, "errno -errno -1", restart_network, "fopen unlink"},
    {"address_check", 0, "errno", check_one, "getnameinfo"},
    {"address_check2", 0, "errno", check_both, "getnameinfo"},
    {"set_network", 0, "errno ENXIO", set_network, "getnameinfo if_nameindex calloc"},

    {"surrogate_connect", 0, "-1", connect_and_close},
    {"system", 0, "-1", [](auto &) { return vlsys_system("true"); }},
    {"spawn", 0, "-1", spawn_and_wait},
    {"popen", 0, "-1", read_and_close},
    {"system_alone", 0, "-1", alone([](auto &) { return vlsys_system("true"); })},
    {"spawn_alone", 0, "-1", alone(spawn_and_wait)},
    {"popen_alone", 0, "-1", alone(read_and_close)},
    {"fc_cache", 0, "-errno", [](auto &) { return vlsys_fc_cache(); }},

    {"avio_read_config", 0, "-1", [](auto &) { return vlsys_avio_read_config(); }},
    // No board, or VLSYS_AVIO_NO_DRIVER.
    {"avio_scan_alive", VLSYS_AVIO_READY, "0 1024", [](auto &) { return vlsys_avio_scan_alive(); }},
    {"avio_wait_ready", 1, "0", [](auto &) { return vlsys_avio_wait_ready(); }},
    {"get_fps", 59, "", [](auto &) { return vlsys_get_fps(); }},
    {"get_hdcp_capability", 1, "0", [](auto &) { return vlsys_get_hdcp_capability(); }},
    {"get_serial_number", 8, "-errno", [](auto &r) { return vlsys_get_serial_number(r.text, 9); }},
    {"get_version", 0, "", [](auto &r) { return vlsys_get_version(r.text, 9, &r.time), 0; },
     "fopen fstat reading"},

    {"mkdir", 0, "-1", [](auto &) { return vlsys_mkdir("/run/tree/a/b", 0755); }},
    // When it is run again, the tree is gone.
    {"remove_tree", 0, "errno",
     [](auto &) { return access("/run/tree", F_OK) ? 0 : vlsys_remove_tree("/run/tree"); }},
    {"realpath", 8, "-errno", [](auto &r) { return vlsys_realpath(r.text, "/run/../run/sda", 9); }},
    {"get_block_device_size", 4096, "-errno",
     [](auto &) { return vlsys_get_block_device_size("/run/sda"); }},

    {"tool", 0, "-1", [](auto &) { return factory_main(); }, "if_nameindex calloc"},
};

void PrintTo(const Operation &operation, std::ostream *stream) {
    *stream << operation.name;
}

void prepare_operations() {
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
    fs::last_write_time("/etc/velmora-version", fs::file_time_type()); // the same each time
    fs::remove("/etc/localtime.new");
    fs::remove_all("/etc/sysctl.d"); // a setter makes it
    for (const char *command : {"/usr/bin/fc-cache", "/usr/sbin/service"}) {
        fs::remove(command);
        fs::create_symlink("/usr/bin/true", command);
    }
    fs::create_directories("/run/tree/c/d");
    write_file("/etc/resolv.conf", "nameserver 192.168.0.1\n");
    sethostname("localhost", 9);
}

} // namespace test
