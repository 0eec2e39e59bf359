// Both validators: a line of modes and prefix lengths, a character each, then a text a line.
#include "fuzz.h"

struct Setting {
    vlsys_ifconf nifs[2];
    vlsys_gw4 gw4;
    vlsys_gw6 gw6;
    vlsys_dns dns;
    char hostname[VLSYS_HOSTNAME_SIZE];
};

static Setting make(const std::string &text) {
    std::vector<std::string> lines = lines_of(text);
    lines.resize(14);
    lines[0].resize(9);
    Setting s = {};
    uint32_t *const modes[] = {&s.nifs[0].ipv4_mode, &s.nifs[0].ipv6_mode, &s.nifs[1].ipv4_mode,
                               &s.nifs[1].ipv6_mode, &s.gw4.mode,          &s.gw6.mode,
                               &s.dns.mode};
    for (size_t i = 0; i < std::size(modes); i++)
        *modes[i] = lines[0][i] & 3;
    s.nifs[0].prefix = static_cast<uint8_t>(lines[0][7]);
    s.nifs[0].addr6[0].prefix = s.nifs[1].addr6[0].prefix = static_cast<uint8_t>(lines[0][8]);
    size_t next = 0;
    const auto take = [&](auto &field) { lines[++next].copy(field, sizeof field); };
    for (vlsys_ifconf &nif : s.nifs) {
        vlsys_strlcpy(nif.name, "lo", sizeof nif.name);
        take(nif.addr);
        take(nif.netmask);
        take(nif.addr6[0].addr);
    }
    take(s.gw4.addr);
    take(s.gw6.addr);
    for (auto &server : s.dns.server)
        take(server);
    take(s.dns.domain);
    lines[++next].copy(s.hostname, sizeof s.hostname - 1);
    return s;
}

static int check_one(Setting &s) {
    return vlsys_address_check(s.nifs, s.gw4.addr, s.gw6.addr, &s.dns, s.hostname);
}

static int check_both(Setting &s) {
    return vlsys_address_check2(s.nifs, 2, &s.gw4, &s.gw6, &s.dns, s.hostname);
}

static void feed(const std::string &text) {
    for (int (*const validate)(Setting &) : {check_one, check_both}) {
        Setting s = make(text);
        if (validate == check_both) // one of them may be missing
            for (vlsys_ifconf &nif : s.nifs)
                vlsys_strlcpy(nif.name, "eth1", sizeof nif.name);
        const int code = validate(s);
        CHECK(code <= 0 || VLSYS_CHECK_IS_CODE(code));
        if (code > 0) {
            CHECK(VLSYS_CHECK_POSITION(code) < 2);
            CHECK(VLSYS_CHECK_FIELD(code) >= 1 && VLSYS_CHECK_FIELD(code) <= 11);
            CHECK(VLSYS_CHECK_KIND(code) >= 1 && VLSYS_CHECK_KIND(code) <= 11);
        }
        if (code != 0)
            continue;
        CHECK(validate(s) == 0); // a server may only now read like another, and be dropped
        const Setting before = s;
        CHECK(validate(s) == 0);
        CHECK(memcmp(&s, &before, sizeof s) == 0);
    }
}
