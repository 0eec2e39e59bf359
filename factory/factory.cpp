// The factory set-up tool: run once on a unit, puts its system settings into their factory state.
#include "vlsys.h"

#include <csignal>
#include <cstring>

// The numbers are fixed: technicians know each failure by its own.
static int failed(const char *function, int number) {
    printf("ERROR: factory.cpp %s %d\n", function, number);
    return -1;
}

static const char *zone_of(const char *destination) {
    if (strcmp(destination, "CN") == 0)
        return "Asia/Shanghai";
    if (strcmp(destination, "SY") == 0)
        return "Etc/GMT";
    return nullptr;
}

static int factory_init_timezone() {
    char destination[16];
    if (vlsys_get_destination(destination, sizeof destination) < 0)
        return failed(__func__, 22);
    printf("dest: %s\n", destination);

    const char *const zone = zone_of(destination);
    if (!zone)
        return failed(__func__, 35);
    printf("timezone: %s\n", zone);
    if (vlsys_set_timezone(zone) < 0)
        return failed(__func__, 42);
    return 0;
}

// The host name goes into a file that scripts source as root, and the serial number comes from
// whoever answered in the surrogate parent's place.
static bool is_shell_text(const char *serial) {
    return strpbrk(serial, "$`\\\"';&|<>()") != nullptr;
}

// Model word and serial number; of the number at most 8 characters fit into the tool's 16 bytes.
static int factory_make_hostname(char *hostname, size_t size) {
    char serial[16] = "00000"; // what a unit without a serial number is named after
    if (vlsys_get_serial_number(serial, sizeof serial) < 0)
        return failed(__func__, 53);
    if (is_shell_text(serial))
        return -1;
    return snprintf(hostname, size, "rhx416-%s", serial) < 0 ? -1 : 0;
}

static int factory_init_network() {
    const vlsys_ifconf off = {};
    const vlsys_dns no_dns = {};
    char hostname[16];

    if (vlsys_set_netif("eth0", &off) != 0)
        return failed(__func__, 74);
    if (vlsys_set_ipv4_default_gateway(nullptr) != 0)
        return failed(__func__, 78);
    if (vlsys_set_ipv6_default_gateway(nullptr) != 0)
        return failed(__func__, 82);
    if (vlsys_set_dns_settings(&no_dns) != 0)
        return failed(__func__, 86);
    if (factory_make_hostname(hostname, sizeof hostname) != 0)
        return failed(__func__, 90);
    if (vlsys_set_hostname(hostname) != 0)
        return failed(__func__, 94);
    return 0;
}

// What the tool was started with must not decide how it ends.
static void make_independent_of_caller() {
    setvbuf(stdout, nullptr, _IOLBF, 0); // into a pipe, too: the technician sees where it stands
    signal(SIGCHLD, SIG_DFL);            // ignored, no command's exit status would reach the tool
    signal(SIGPIPE, SIG_IGN);            // a reader that leaves must not stop it half-way
}

int main() {
    make_independent_of_caller();
    if (vlsys_init() != 0)
        return failed(__func__, 112);
    if (factory_init_timezone() != 0)
        return -1;
    if (factory_init_network() != 0)
        return -1;
    if (vlsys_fc_cache() != 0)
        return failed(__func__, 125);
    vlsys_exit();
    return 0;
}
