// The rules that the two validators of a network setting share. Each check returns 0, a check code
// or a result of the address conversions; a fault that needs words has been logged.
#pragma once

#include "netstate/subnet.h"
#include "vlsys.h"

namespace vlsys {

// The validator of one interface, and that of several.
enum class Validator { single, multi };

// The code of a field before a kind is ORed in.
constexpr int field_code(int field, int position = 0) {
    return VLSYS_CHECK_CODE(position, field, 0);
}

// Faults: each logs its message and returns the field code with its kind in it.
int same_as_network(const char *label, const char *text, int fieldcode);
int same_as_broadcast(const char *label, const char *text, int fieldcode);
int unreachable(const char *label, const char *text, int fieldcode);

// The address must not be the subnet's network or broadcast address.
int check_not_reserved(const Subnet4 &subnet, uint32_t address, const char *label, const char *text,
                       int fieldcode);
int check_not_reserved(const Subnet6 &subnet, const Address6 &address, const char *label,
                       const char *text, int fieldcode);

// The fixed addressing of one interface: brings address and netmask into form and makes the subnet.
int check_static_ipv4(Validator validator, vlsys_ifconf *nif, int position, Subnet4 *subnet);
int check_static_ipv6(vlsys_ifconf *nif, int position, Subnet6 *subnet);

// Fills broadaddr. Returns the result of its conversion, which is no fault and has been logged.
int set_broadcast(vlsys_ifconf *nif, const Subnet4 &subnet);

// One server of a DNS record, as the rules and messages name it.
struct DnsServer {
    DnsServer(vlsys_dns *dns, int index);
    bool is_ipv6() const;

    char (&text)[VLSYS_ADDR6_SIZE];
    int field; // the third server has that of the IPv6 address
    int fieldcode;
    char label[16];
};

int check_domain(const vlsys_dns &dns);

// An empty host name becomes "localhost".
int check_hostname(char *hostname);

} // namespace vlsys
