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

/* Other faults are of the setting as a whole, and their code's position says nothing. */
static int is_of_one_interface(int fault) {
    switch (VLSYS_CHECK_FIELD(fault)) {
    case VLSYS_CHECK_FIELD_IPV4_ADDR:
    case VLSYS_CHECK_FIELD_IPV4_NETMASK:
    case VLSYS_CHECK_FIELD_IPV6_ADDR:
    case VLSYS_CHECK_FIELD_IPV6_PREFIX:
    case VLSYS_CHECK_FIELD_IFNAME:
        return VLSYS_CHECK_KIND(fault) != VLSYS_CHECK_KIND_OVERLAP;
    default:
        return 0;
    }
}

static void print_fault(int fault) {
    static const char *const fields[] = {
        [VLSYS_CHECK_FIELD_IPV4_ADDR] = "IPv4 address",
        [VLSYS_CHECK_FIELD_IPV4_NETMASK] = "IPv4 netmask",
        [VLSYS_CHECK_FIELD_IPV4_GATEWAY] = "IPv4 gateway",
        [VLSYS_CHECK_FIELD_DNS_DOMAIN] = "DNS domain",
        [VLSYS_CHECK_FIELD_DNS_PRIMARY] = "first DNS server",
        [VLSYS_CHECK_FIELD_DNS_SECONDARY] = "second DNS server",
        [VLSYS_CHECK_FIELD_IPV6_ADDR] = "IPv6 address",
        [VLSYS_CHECK_FIELD_IPV6_PREFIX] = "IPv6 prefix length",
        [VLSYS_CHECK_FIELD_IPV6_GATEWAY] = "IPv6 gateway",
        [VLSYS_CHECK_FIELD_HOSTNAME] = "host name",
        [VLSYS_CHECK_FIELD_IFNAME] = "interface name",
    };
    static const char *const kinds[] = {
        [VLSYS_CHECK_KIND_INVALID] = "is missing or not valid",
        [VLSYS_CHECK_KIND_NETMASK] = "has a gap",
        [VLSYS_CHECK_KIND_UNREACHABLE] = "cannot be reached",
        [VLSYS_CHECK_KIND_SYNTAX] = "is not well-formed",
        [VLSYS_CHECK_KIND_NETWORK] = "is the address of a network",
        [VLSYS_CHECK_KIND_BROADCAST] = "is a broadcast address",
        [VLSYS_CHECK_KIND_PREFIX] = "is out of range",
        [VLSYS_CHECK_KIND_RANGE] = "is not allowed here",
        [VLSYS_CHECK_KIND_NO_IFACE] = "names no interface",
        [VLSYS_CHECK_KIND_OVERLAP] = "is in the subnet of another",
        [VLSYS_CHECK_KIND_MODE] = "does not go with the interfaces' modes",
    };
    if (!VLSYS_CHECK_IS_CODE(fault)) {
        printf("the setting cannot be checked: %d\n", fault);
        return;
    }
    if (is_of_one_interface(fault))
        printf("%s: ", interfaces[VLSYS_CHECK_POSITION(fault)].name);
    printf("the %s %s\n", fields[VLSYS_CHECK_FIELD(fault)], kinds[VLSYS_CHECK_KIND(fault)]);
}

static int write_setting(void) {
    int error = 0;
    for (int i = 0; i < count && error == 0; i++)
        error = vlsys_set_netif(interfaces[i].name, &interfaces[i]);
    if (error == 0)
        error = vlsys_set_ipv4_default_gateway2(&gateway4);
    if (error == 0)
        error = vlsys_set_ipv6_default_gateway2(&gateway6);
    if (error == 0)
        error = vlsys_set_dns_settings(&dns);
    if (error == 0)
        error = vlsys_set_hostname(hostname);
    return error;
}

static int set_network(void) {
    const int fault = vlsys_address_check2(interfaces, count, &gateway4, &gateway6, &dns, hostname);
    if (fault != 0) {
        print_fault(fault);
        return 1;
    }
    const int error = write_setting();
    if (error != 0) {
        printf("the setting cannot be written: %d\n", error);
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
