/*
 * network_restart [ADDRESS]: gives a unit with two interfaces its network setting, puts it into
 * force and shows what came of it. ADDRESS is another IPv4 address for eth1; 192.168.1.20, which is
 * in eth0's subnet, shows a fault.
 */
#include <stdio.h>
#include <vlsys.h>

static vlsys_ifconf interfaces[] = {
    {.name = "eth0",
     .addr = "192.168.1.10",
     .netmask = "255.255.255.0",
     .ipv4_mode = VLSYS_MODE_MANUAL,
     .ipv6_mode = VLSYS_MODE_AUTO},
    {.name = "eth1",
     .addr = "192.168.2.20",
     .prefix = 24,
     .ipv4_mode = VLSYS_MODE_MANUAL,
     .addr6 = {{.addr = "FD00:2::20", .prefix = 64}},
     .ipv6_mode = VLSYS_MODE_MANUAL},
};
static vlsys_gw4 gateway4 = {.addr = "192.168.1.1", .mode = VLSYS_MODE_MANUAL};
static vlsys_gw6 gateway6 = {.iface = "eth0", .mode = VLSYS_MODE_AUTO};
static vlsys_dns dns = {
    .domain = "example.com", .server = {"192.168.1.1", "fd00:2::1"}, .mode = VLSYS_MODE_MANUAL};
static char hostname[VLSYS_HOSTNAME_SIZE] = "studio-1";

static const int count = sizeof interfaces / sizeof *interfaces;

static int set_network(void) {
    int step = VLSYS_STEP_NONE;
    const int error =
        vlsys_set_network(interfaces, count, &gateway4, &gateway6, &dns, hostname, &step);
    if (error != 0) {
        char text[160];
        vlsys_check_text(error, interfaces, count, text, sizeof text);
        printf("the setting cannot be %s: %s\n", step == VLSYS_STEP_CHECK ? "taken" : "written",
               text);
        return 1;
    }
    vlsys_openlog("network_restart", 0, -1); /* the report goes to standard output */
    vlsys_setlogmask(LOG_UPTO(LOG_INFO));
    return vlsys_network_restart() != 0;
}

int main(int argc, char **argv) {
    if (argc > 1)
        vlsys_strlcpy(interfaces[1].addr, argv[1], sizeof interfaces[1].addr);
    if (vlsys_init() != 0)
        return 1;
    const int status = set_network();
    vlsys_exit();
    return status;
}
