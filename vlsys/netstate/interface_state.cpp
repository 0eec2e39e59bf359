#include "core/log.h"
#include "netconf/get_mode.h"
#include "netconf/interfaces.h"
#include "netstate/address.h"

#include <bit>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ifaddrs.h>
#include <memory>
#include <net/if.h>
#include <netpacket/packet.h>

namespace vlsys {

static constexpr unsigned int iff_lower_up = 0x10000; // <net/if.h> lacks it

namespace {

struct FreeEntries {
    void operator()(ifaddrs *entries) const { freeifaddrs(entries); }
};
using Entries = std::unique_ptr<ifaddrs, FreeEntries>;

} // namespace

template <size_t Size>
static uint8_t prefix_length(const uint8_t (&mask)[Size]) {
    uint8_t length = 0;
    for (const uint8_t byte : mask) {
        const int ones = std::countl_one(byte);
        length = static_cast<uint8_t>(length + ones);
        if (ones < 8)
            break;
    }
    return length;
}

static void read_link(const ifaddrs &entry, vlsys_ifconf *nif) {
    const auto *const link = reinterpret_cast<const sockaddr_ll *>(entry.ifa_addr);
    const auto *const mac = link->sll_addr;
    snprintf(nif->mac, sizeof nif->mac, "%02X-%02X-%02X-%02X-%02X-%02X", mac[0], mac[1], mac[2],
             mac[3], mac[4], mac[5]);
    nif->lower_up = (entry.ifa_flags & iff_lower_up) != 0;
}

template <size_t Size>
static int ipv4_text(const sockaddr *addr, char (&text)[Size], const char *label) {
    return addr_to_text(addr, sizeof(sockaddr_in), text, Size, label);
}

static int read_ipv4(const ifaddrs &entry, vlsys_ifconf *nif) {
    nif->up = (entry.ifa_flags & IFF_UP) != 0;
    // An address whose peer is 0.0.0.0 comes without either.
    const sockaddr *const broadaddr = entry.ifa_broadaddr ? entry.ifa_broadaddr : entry.ifa_addr;
    int result = ipv4_text(entry.ifa_addr, nif->addr, "addr");
    if (result == 0 && (entry.ifa_flags & IFF_BROADCAST) != 0)
        result = ipv4_text(broadaddr, nif->broadaddr, "broadaddr");
    if (result == 0)
        result = ipv4_text(entry.ifa_netmask, nif->netmask, "netmask");
    if (result != 0)
        return result;
    uint8_t mask[sizeof(in_addr)];
    memcpy(mask, &reinterpret_cast<const sockaddr_in *>(entry.ifa_netmask)->sin_addr, sizeof mask);
    nif->prefix = prefix_length(mask);
    return 0;
}

// Where an address goes in the record, with its scope.
static vlsys_addr6 *choose_slot(const in6_addr &address, vlsys_ifconf *nif) {
    int slot = 3;
    const char *scope = "global";
    if (IN6_IS_ADDR_LINKLOCAL(&address)) {
        slot = 1;
        scope = "link";
    } else if (IN6_IS_ADDR_SITELOCAL(&address)) {
        slot = 0;
        scope = "site";
    } else if (nif->addr6[0].addr[0] == '\0') {
        slot = 0;
    } else if (nif->addr6[2].addr[0] == '\0') {
        slot = 2;
    }
    vlsys_strlcpy(nif->addr6[slot].scope, scope, VLSYS_SCOPE_SIZE);
    return &nif->addr6[slot];
}

static int read_ipv6(const ifaddrs &entry, vlsys_ifconf *nif) {
    const auto *const address = reinterpret_cast<const sockaddr_in6 *>(entry.ifa_addr);
    vlsys_addr6 *const slot = choose_slot(address->sin6_addr, nif);
    const int result =
        addr_to_text(entry.ifa_addr, sizeof *address, slot->addr, sizeof slot->addr, "v6addr");
    if (result != 0)
        return result;
    const auto *const mask = reinterpret_cast<const sockaddr_in6 *>(entry.ifa_netmask);
    slot->prefix = prefix_length(mask->sin6_addr.s6_addr);
    nif->has_ipv6 = 1;
    return 0;
}

static int read_entry(const ifaddrs &entry, vlsys_ifconf *nif) {
    switch (entry.ifa_addr->sa_family) {
    case AF_PACKET:
        read_link(entry, nif);
        return 0;
    case AF_INET:
        return read_ipv4(entry, nif);
    case AF_INET6:
        return read_ipv6(entry, nif);
    default:
        return 0;
    }
}

// The entries of the interface, told by the beginning of their names: those of eth0:1 belong to
// eth0, and those of eth10 to eth1. `seen` tells whether there was one.
static int read_entries(const ifaddrs *entries, const char *ifname, vlsys_ifconf *nif, bool *seen) {
    const size_t length = strlen(ifname);
    for (const ifaddrs *entry = entries; entry; entry = entry->ifa_next) {
        if (!entry->ifa_addr || strncmp(entry->ifa_name, ifname, length) != 0)
            continue;
        *seen = true;
        const int result = read_entry(*entry, nif);
        if (result != 0)
            return result;
    }
    return 0;
}

} // namespace vlsys

using namespace vlsys;

int vlsys_get_netif(const char *ifname, vlsys_ifconf *nif) {
    if (!nif || !ifname)
        return EFAULT;
    unsigned int index = 0;
    const int missing = find_interface(ifname, &index);
    if (missing != 0)
        return -missing;
    ifaddrs *list = nullptr;
    if (getifaddrs(&list) != 0)
        return -log_errno("%s", "getifaddrs");
    const Entries entries(list);

    nif->up = 0;
    nif->has_ipv6 = 0;
    memset(nif->addr6, 0, sizeof nif->addr6);
    bool seen = false;
    const int result = read_entries(entries.get(), ifname, nif, &seen);
    if (result != 0)
        return result;
    if (seen) {
        vlsys_strlcpy(nif->name, ifname, sizeof nif->name);
        nif->index = static_cast<uint8_t>(index);
    } else {
        errno = EINVAL;
    }
    return get_mode(ifname, &nif->ipv4_mode, &nif->ipv6_mode);
}
