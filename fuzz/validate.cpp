// Both validators: a line of modes and prefix lengths, a character each, then a text a line.
#include "fuzz.h"

struct Setting {
    vlsys_ifconf nifs[2];
    vlsys_gw4 gw4;
    vlsys_gw6 gw6;
    vlsys_dns dns;
    char hostname[VLSYS_HOSTNAME_SIZE];
};

static Setting make(const std::string &text, const char *name) {
    std::vector<std::string> lines = lines_of(text);
    lines.resize(14);
    lines[0].resize(9);
    Setting s = {};
    size_t next = 0;
    for (uint32_t *const mode : {&s.nifs[0].ipv4_mode, &s.nifs[0].ipv6_mode, &s.nifs[1].ipv4_mode,
                                 &s.nifs[1].ipv6_mode, &s.gw4.mode, &s.gw6.mode, &s.dns.mode})
        *mode = lines[0][next++] & 3;
    next = 0;
    const auto take = [&](auto &field) { lines[++next].copy(field, sizeof field); };
    for (vlsys_ifconf &nif : s.nifs) {
        vlsys_strlcpy(nif.name, name, sizeof nif.name);
        take(nif.addr);
        take(nif.netmask);
        take(nif.addr6[0].addr);
        nif.prefix = nif.addr6[0].prefix = static_cast<uint8_t>(lines[0][8]);
    }
    take(s.gw4.addr);
    take(s.gw6.addr);
    for (auto &server : s.dns.server)
        take(server);
    take(s.dns.domain);
    lines[++next].copy(s.hostname, sizeof s.hostname - 1);
    return s;
}

static int validate(Setting &s, bool both) {
    if (both)
        return vlsys_address_check2(s.nifs, 2, &s.gw4, &s.gw6, &s.dns, s.hostname);
    return vlsys_address_check(s.nifs, s.gw4.addr, s.gw6.addr, &s.dns, s.hostname);
}

static std::string bytes_of(const Setting &s) {
    return {reinterpret_cast<const char *>(&s), sizeof s};
}

static void feed(const std::string &text) {
    for (const bool both : {false, true}) {
        Setting s = make(text, both ? "eth1" : "lo");
        const int code = validate(s, both);
        CHECK(code <= 0 || (VLSYS_CHECK_IS_CODE(code) && VLSYS_CHECK_POSITION(code) < 2));
        if (code != 0)
            continue;
        CHECK(validate(s, both) == 0); // a server may only now read like another, and be dropped
        const std::string before = bytes_of(s);
        CHECK(validate(s, both) == 0);
        CHECK(bytes_of(s) == before);
    }
}
