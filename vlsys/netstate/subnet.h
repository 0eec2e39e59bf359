// The subnet of an interface, as plain integers in host byte order. All zero stands for no fixed
// address: it holds every address and names none.
#pragma once

#include <cstdint>
#include <cstring>
#include <endian.h>
#include <netinet/in.h>

namespace vlsys {

struct Subnet4 {
    Subnet4() = default;
    Subnet4(uint32_t own_address, uint32_t own_mask)
        : address(own_address), mask(own_mask), broadcast(own_address | ~own_mask),
          network(own_address & own_mask) {}

    bool is_set() const { return mask != 0; }
    // A subnet contains its own network and broadcast address, too.
    bool contains(uint32_t other) const { return (other & mask) == network; }
    // A subnet of one address has neither a network nor a broadcast address.
    bool is_network(uint32_t other) const { return mask != UINT32_MAX && other == network; }
    bool is_broadcast(uint32_t other) const { return mask != UINT32_MAX && other == broadcast; }
    // The network address of some subnet with this mask.
    bool has_no_host_bits(uint32_t other) const {
        return mask != UINT32_MAX && (other & ~mask) == 0;
    }

    uint32_t address = 0;
    uint32_t mask = 0;
    uint32_t broadcast = 0;
    uint32_t network = 0;
};

struct Address6 {
    uint64_t high = 0;
    uint64_t low = 0;

    bool operator==(const Address6 &) const = default;
    Address6 operator&(const Address6 &other) const { return {high & other.high, low & other.low}; }
};

struct Subnet6 {
    Subnet6() = default;
    // The prefix length is 0 to 128.
    Subnet6(Address6 own_address, uint32_t prefix)
        : address(own_address), mask(prefix_mask(prefix)), network(own_address & mask) {}

    bool is_set() const { return address != Address6(); }
    bool contains(Address6 other) const { return (other & mask) == network; }
    bool is_network(Address6 other) const { return other == network; }

    Address6 address;
    Address6 mask;
    Address6 network;

  private:
    static uint64_t half_mask(uint32_t ones) { return ones == 0 ? 0 : UINT64_MAX << (64 - ones); }
    static Address6 prefix_mask(uint32_t prefix) {
        return prefix > 64 ? Address6{UINT64_MAX, half_mask(prefix - 64)}
                           : Address6{half_mask(prefix), 0};
    }
};

inline uint32_t host_order(const sockaddr_in &sa) {
    return ntohl(sa.sin_addr.s_addr);
}

inline Address6 host_order(const sockaddr_in6 &sa) {
    uint64_t words[2];
    memcpy(words, &sa.sin6_addr, sizeof words);
    return {be64toh(words[0]), be64toh(words[1])};
}

} // namespace vlsys
