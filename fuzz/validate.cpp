// The two validators: modes and prefix lengths, a character each, then the texts of a setting.
#include "fuzz.h"

static const int kinds[16] = {0,     0x562, 6,    0x96a, 0x810, 0x16a,
                              0x16a, 0x56a, 0x80, 0x92a, 0x10}; // of fault, by field

struct Setting {
    vlsys_ifconf nif[2];
    vlsys_gw4 gw4;
    vlsys_gw6 gw6;
    vlsys_dns dns;
    char host[VLSYS_HOSTNAME_SIZE];
};

static int validate(Setting &s, int count) {
    return count > 0 ? vlsys_address_check2(s.nif, count, &s.gw4, &s.gw6, &s.dns, s.host)
                     : vlsys_address_check(s.nif, s.gw4.addr, s.gw6.addr, &s.dns, s.host);
}

static void check(Input &in) {
    for (const int count : {0, 1, 2}) {
        Setting s = {};
        auto &[nif, gw4, gw6, dns, host] = s;
        in[0].resize(9);
        size_t at = 0;
        for (uint32_t *mode : {&nif[0].ipv4_mode, &nif[0].ipv6_mode, &nif[1].ipv4_mode,
                               &nif[1].ipv6_mode, &gw4.mode, &gw6.mode, &dns.mode})
            *mode = in[0][at++] & 3;
        nif[0].addr6[0].prefix = nif[1].addr6[0].prefix = static_cast<uint8_t>(in[0][7]);
        nif[0].prefix = static_cast<uint8_t>(in[0][8]);
        at = 0;
        const auto take = [&](auto &...texts) { (in[++at].copy(texts, sizeof texts), ...); };
        take(nif[0].addr, nif[0].netmask, nif[0].addr6[0].addr, gw4.addr, gw6.addr, dns.server[0],
             dns.server[1], dns.server[2], dns.domain, host, nif[1].addr, nif[1].netmask,
             nif[1].addr6[0].addr, gw4.iface, gw6.iface);
        host[sizeof host - 1] = '\0';
        vlsys_strlcpy(nif[0].name, count > 0 ? "eth1" : "lo", sizeof nif[0].name);
        vlsys_strlcpy(nif[1].name, "eth1", sizeof nif[1].name);

        const int code = validate(s, count);
        assert(code <= 0 || (code / 0x200 <= 1 && kinds[code / 16 % 16] >> code % 16 & 1));
        if (code != 0)
            continue;
        assert(validate(s, count) == 0); // a server may only now read like another, and be dropped
        const std::string before = bytes_of(s);
        assert(validate(s, count) == 0 && bytes_of(s) == before && host[0]);
        const in_addr_t ip = inet_addr(nif[0].addr);
        const in_addr_t mask = inet_addr(nif[0].netmask);
        const bool is_fixed = nif[0].ipv4_mode == VLSYS_MODE_MANUAL;
        assert(!is_fixed || inet_addr(nif[0].broadaddr) == (ip | ~mask));
        if (is_fixed && count == 0 && gw4.addr[0])
            assert(((ip ^ inet_addr(gw4.addr)) & mask) == 0);
    }
}
