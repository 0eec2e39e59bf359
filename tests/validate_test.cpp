#include "fixture.h"
#include "netstate/address.h"
#include "vlsys.h"

#include <cerrno>
#include <cstring>
#include <netdb.h>
#include <sstream>

using namespace test;

// A whole setting, written as "key=value" items on top of a default one.
struct Setting {
    vlsys_ifconf nif[3];
    vlsys_gw4 gw4;
    vlsys_gw6 gw6;
    vlsys_dns dns;
    char host[VLSYS_HOSTNAME_SIZE];
    int fail; // the n-th getnameinfo fails
};

// clang-format off
#define FIELD(key, member) {key, offsetof(Setting, member), sizeof(Setting::member)}
#define INTERFACE(at, i)                                                                           \
    FIELD(at "name", nif[i].name), FIELD(at "v4", nif[i].ipv4_mode), FIELD(at "a", nif[i].addr),   \
    FIELD(at "mask", nif[i].netmask), FIELD(at "len", nif[i].prefix),                              \
    FIELD(at "bcast", nif[i].broadaddr), FIELD(at "v6", nif[i].ipv6_mode),                         \
    FIELD(at "a6", nif[i].addr6[0].addr), FIELD(at "len6", nif[i].addr6[0].prefix)
static const struct { const char *key; size_t at, size; } fields[] = {
    INTERFACE("", 0), INTERFACE("1.", 1), INTERFACE("2.", 2), FIELD("gw4", gw4.addr),
    FIELD("gw4if", gw4.iface), FIELD("gw4mode", gw4.mode), FIELD("gw6", gw6.addr),
    FIELD("gw6if", gw6.iface), FIELD("gw6mode", gw6.mode), FIELD("dns", dns.mode),
    FIELD("domain", dns.domain), FIELD("s0", dns.server[0]), FIELD("s1", dns.server[1]),
    FIELD("s2", dns.server[2]), FIELD("dnsif", dns.iface), FIELD("host", host), FIELD("fail", fail),
};
// clang-format on

static const std::string defaults =
    "name=eth0 a=192.168.0.10 mask=255.255.255.0 len=24 bcast=192.168.0.255 a6=2001:db8::1 len6=64 "
    "1.name=eth1 1.a=10.1.0.1 1.mask=255.255.0.0 1.len=16 1.bcast=10.1.255.255 1.a6=fd00::1 "
    "1.len6=64 2.name=eth2 dnsif=eth0 host=unit ";

static Setting make(const std::string &items) {
    Setting setting = {};
    std::istringstream all(defaults + items);
    for (std::string key, value; std::getline(all >> std::ws, key, '=');) {
        std::getline(all, value, ' ');
        for (const auto &field : fields) {
            const auto number = static_cast<int>(strtol(value.c_str(), nullptr, 10));
            char *const at = reinterpret_cast<char *>(&setting) + field.at;
            if (key == field.key && field.size <= sizeof number)
                memcpy(at, &number, field.size);
            else if (key == field.key)
                strncpy(at, value.c_str(), field.size); // may leave it without a NUL
        }
    }
    return setting;
}

// The validator of one interface, or with a count that of several.
static int check(Setting &s, int count) {
    fail_call("getnameinfo", s.fail, EAI_AGAIN);
    return count == 0 ? vlsys_address_check(s.nif, s.gw4.addr, s.gw6.addr, &s.dns, s.host)
                      : vlsys_address_check2(s.nif, count, &s.gw4, &s.gw6, &s.dns, s.host);
}

class Validate : public Unit {
  protected:
    void SetUp() override {
        Unit::SetUp();
        set_interfaces({"eth0", "eth2"});
    }

    // Rows of setting, code, fields that change, and the log: all of it if the row says so by its
    // first line, else what is above information.
    static void expect(int count, const char *rows) {
        std::istringstream lines(rows);
        for (std::string line; std::getline(lines >> std::ws, line);) {
            std::string columns[4];
            std::istringstream row(line + "||||");
            for (std::string &column : columns) {
                std::getline(row >> std::ws, column, '|');
                column.erase(column.find_last_not_of(' ') + 1);
            }
            Setting result = make(columns[0]);
            const Setting expected = make(columns[0] + " " + columns[2]);
            EXPECT_EQ(check(result, count), std::stoi(columns[1], nullptr, 16)) << line;
            for (const auto &field : fields) {
                const char *const at = reinterpret_cast<char *>(&result) + field.at;
                const char *const wanted = reinterpret_cast<const char *>(&expected) + field.at;
                EXPECT_EQ(strncmp(at, wanted, field.size), 0) << line << ": " << field.key << at;
            }
            std::istringstream log(take_log());
            std::string seen;
            for (std::string entry; std::getline(log, entry);)
                if (entry[0] < '6' || columns[3][0] == '6')
                    seen += (seen.empty() ? "" : "; ") + entry;
            EXPECT_EQ(seen, columns[3]) << line;
        }
    }
};

TEST_F(Validate, OneInterface) {
    expect(0, R"(
        name=eth9 v4=4 v6=3 dns=2 host=-       | 1b9 | | 6 vlsys_address_check: start (, DHCP, Auto)
        name=eth0eth0eth0eth0                  | 1b9
        v4=1 a=192.168.0.300                   | 111 | | 3 IPv4 address: 192.168.0.300: Name or service not known
        v4=1 a=0300.0250.0.0010                | 0   | a=192.168.0.8
        v4=1 a=224.0.0.1                       | 118
        v4=1 a=127.255.0.1                     | 118
        v4=1 a=0.0.0.1                         | 0   | bcast=0.0.0.255
        v4=1 a=192.168.0.0                     | 115 | | 3 IP address is the same as network address: 192.168.0.0
        v6=2 dns=2                             | 0
        v4=5 dns=2                             | 0   | dns=0 | 4 A setup of DNS was set to DHCP although neither of IPv4 and IPv6 of the setup was DHCP. DNS setting is fallback to OFF.
        v6=1 a6=3fff::1                        | 0
        v6=3 gw6=x                             | 191 | | 3 IPv6 default gateway: x: Name or service not known
        v4=2 dns=1 s0=x                        | 151 | | 3 DNS primary server: x: Name or service not known
        v4=1 fail=3 dns=1 s0=192.168.0.1       | 0   | | 3 broadaddr: getnameinfo: Temporary failure in name resolution
        v4=1 fail=3                            | -3  | | 3 broadaddr: getnameinfo: Temporary failure in name resolution
        v4=1 fail=3 gw4=192.168.0.1            | 0   | | 3 broadaddr: getnameinfo: Temporary failure in name resolution
        v4=1 fail=3 v6=1                       | 0   | | 3 broadaddr: getnameinfo: Temporary failure in name resolution
        v4=1 mask=8 len=24 gw4=192.168.0.01    | 0   | mask=255.0.0.0 bcast=192.255.255.255 gw4=192.168.0.1
        v4=1 mask=30 v6=3 dns=2                | 0   | mask=255.255.255.252 bcast=192.168.0.11 dns=0 | 4 A setup of DNS was set to DHCP although neither of IPv4 and IPv6 of the setup was DHCP. DNS setting is fallback to OFF.
        v4=1 mask=31                           | 122 | mask=0.0.0.31 | 3 wrang bit pattern: 0.0.0.31(0000001f)
        v4=1 mask=0.0.0.0 gw4=8.8.8.8          | 0   | bcast=255.255.255.255
        v4=1 mask=255.255.255.255 gw4=192.168.0.10 | 0 | bcast=192.168.0.10
        v4=1 gw4=192.168.0.255                 | 136 | | 3 gateway address is the same as broadcast address: 192.168.0.255
        v4=5 gw4=x                             | 131 | | 3 IPv4 defautl gateway : x: Name or service not known
        v6=1 a6=2001:DB8::0:6 len6=128         | 175 | a6=2001:db8::6 | 3 IPv6 address is the same as network address: 2001:db8::6
        v6=1 len6=129                          | 187
        v6=1 len6=72 gw6=2001:db8:0:1::1       | 193 | | 3 IPv6 gateway address is unreachable: 2001:db8:0:1::1
        v6=1 a6=4000::1                        | 178
        v6=1 a6=::ffff:10.0.0.1                | 178
        v6=3 gw6=fec0::1                       | 198
        v6=1 len6=0 gw6=fc00::0001             | 0   | gw6=fc00::1
        v6=1 gw6=2001:db9::1                   | 193 | | 3 IPv6 gateway address is unreachable: 2001:db9::1
        v6=1 gw6=febf::01%eth0 dns=1 s0=fd00::9 | 0  | gw6=febf::1%eth0
        v6=3 gw6=fe80::1                       | 191
        gw4=x gw6=x dns=1 s0=x dnsif=x         | 0   | dns=0 dnsif=eth0 | 4 Since both setup of IPv4 and IPv6 was OFF, DNS also turns OFF a setup.
        v4=2 dns=1 domain=a_b                  | 144
        v4=2 dns=1 s1=8.8.8.8                  | 151
        v4=2 dns=1 s0=8.8.2056 s1=8.8.8.8 s2=x | 0   | s0=8.8.8.8 s1=
        v6=3 dns=1 s0=8.8.8.8                  | 153 | | 3 Although IPv4 is OFF, DNS server[0] is IPv4 address: 8.8.8.8
        v4=2 dns=1 s0=8.8.8.8 s1=2001:db8::2   | 163 | | 3 Although IPv6 is OFF, DNS server[1] is IPv6 address: 2001:db8::2
        v4=1 mask=255.255.255.255 dns=1 s0=10.9.9.9 | 153 | bcast=192.168.0.10 | 3 DNS server[0] address is unreachable: 10.9.9.9
        v4=1 dns=1 s0=192.168.0.255            | 156 | | 3 DNS server[0] address is the same as broadcast address: 192.168.0.255
        v4=1 gw4=192.168.0.1 dns=1 s0=10.9.9.9 s1=10.0.0.0 | 165 | | 3 DNS server[1] address is the same as network address: 10.0.0.0
        v6=1 dns=1 s0=2001:db8::9 s1=2001:db8:: | 165 | | 3 DNS server[1] address is the same as network address: 2001:db8::
        v4=2 dns=2 dnsif=x host=a234567890123456789012345678901234567890.12345678901234567890123  | 0   | dnsif=eth0
        v4=2 dnsif=x host=a234567890123456789012345678901234567890.123456789012345678901234 | 1a4 | dnsif=eth0
        v4=1 mask=24 v6=2 host=                | 0   | mask=255.255.255.0 host=localhost | 6 vlsys_address_check: start (Manual, Off, DHCP); 7 netmask: 24 -> 0xffffff00; 4 Since hostname is empty, set "localhost"; 6 vlsys_address_check: OK (Manual, Off, DHCP))");
}

TEST_F(Validate, SeveralInterfaces) {
    expect(1, R"(
        name=lo v4=2 v6=1 1.v4=2 1.v6=2 gw4mode=2 gw4if=eth1 gw6mode=2 gw6if=lo dns=2 | 1b9 | | 6 start checking: mode: D_M_!0DDD; 7 nif->name: lo; 6 vlsys_address_check2: NG (0x1b9))");
    expect(3, R"(
        2.name=eth9 v4=3 v6=4 1.v6=1 gw4mode=3 gw6mode=4 dns=3 | 3b9 | gw4mode=3 | 6 start checking: mode: ?_?M?????; 7 nif->name: eth9; 6 vlsys_address_check2: NG (0x3b9)
        v4=1 1.v4=2 1.v6=3 gw4mode=2 gw4if=eth1 gw6mode=3 gw6if=eth7 dns=1 domain=a.b s0=192.168.0.1 s1=fd00::1 host= | 0 | host=localhost | 6 start checking: mode: MD_A1!M46; 7 netmask: 24 -> 0xffffff00; 7 dns->mode: 1; 7 domain: a.b; 7 server[0]: 192.168.0.1; 7 server[1]: fd00::1; 7 dns->iface: eth0; 4 Since hostname is empty, set "localhost"; 6 vlsys_address_check2: OK
        v4=1 mask=x 1.v4=1 1.mask=10 1.len=31 1.bcast= 1.a=192.168.9.9 | 11a | mask=255.255.255.0 1.mask=255.192.0.0 1.len=10 1.bcast=192.191.255.255 | 3 192.168.0.10/24 and 192.168.9.9/10 have overlapped
        v4=1 1.v4=1 1.mask=x 1.len=0           | 221 | | 3 IPv4 netmask: x: Name or service not known
        v4=1 fail=3                            | 0   | | 3 broadaddr: getnameinfo: Temporary failure in name resolution
        1.v4=1 fail=2                          | -3  | 1.mask=0xffff0000 | 3 IPv4 netmask: getnameinfo: Temporary failure in name resolution
        v4=1 len=0 mask=255.255.255.254        | 121
        v4=1 len=0 mask=254.0.0.0              | 121
        v4=1 len=0 mask=255.0.255.0            | 122 | len=8 | 3 wrang bit pattern: 255.0.255.0(ff00ff00)
        v4=1 1.v4=1 1.a=192.168.0.10 gw4=x     | 11a | 1.bcast=192.168.255.255 | 3 eth0 and eth1 is same address: 192.168.0.10
        1.v4=1 gw4mode=1 gw4=10.1.0.0 gw4if=x  | 235 | gw4if=eth1 | 3 gateway address is the same as network address: 10.1.0.0
        v4=2 gw4mode=1 gw4if=eth0 gw6mode=4    | 0   | gw4mode=0 gw4if= gw6mode=0
        v4=2 gw4mode=2                         | 131
        v4=1 gw4mode=2 gw4if=eth0              | 13b
        1.v6=1 1.len6=129                      | 287
        v6=1 len6=0 1.v6=1                     | 17a
        v6=1 len6=0                            | 0
        gw4mode=1 gw4=10.1.0.1                 | 13b
        gw6mode=1 gw6=fd00::1                  | 19b
        v4=2 v6=3 gw4mode=1 gw4=10.9.9.9 gw6mode=1 gw6=fd00:9::1 | 0
        v4=1 v6=1 gw4mode=1 gw4=192.168.0.1 gw6mode=1 gw6=2001:db8::2 dns=1 s0=10.9.9.9 s1=fd00:9::9 | 0 | gw4if=eth0
        gw4mode=2 gw4if=eth0                   | 13b
        gw6=fd00::1 gw6if=eth0 gw6mode=4       | 0   | gw6= gw6if= gw6mode=0
        v4=1 1.v4=1 1.len=16 1.a=192.168.9.9   | 11a | 1.mask=255.255.0.0 1.bcast=192.168.255.255 | 6 start checking: mode: MM_______; 7 netmask: 24 -> 0xffffff00; 7 netmask: 16 -> 0xffff0000; 7 (c0a8000a & ffff0000) == c0a80000; 3 192.168.0.10/24 and 192.168.9.9/16 have overlapped; 6 vlsys_address_check2: NG (0x11a)
        gw4mode=2 gw4if=eth7 gw6mode=3 gw6if=eth7 | 0
        v6=1 gw6mode=1 gw6=fe80:0000:0000:0000:0000:0000:0000:0001%000001 | 0 | gw6=fe80::1%lo
        v4=2 v6=1 gw6mode=2 gw6if=eth0         | 19b
        dns=1 domain=-                         | 14b | | 3 DNS is enable although all the network interfaces are OFF.
        v4=3 v6=3 dns=2                        | 14b | | 3 A setup of DNS is DHCP although no setup of a network interface is DHCP.
        v4=1 2.v6=2 dns=2                      | 0   | dnsif=eth2
        1.v6=3 2.v6=2 dns=1 s2=fd00::9         | 0   | dnsif=eth1
        v4=2 dns=0 dnsif=fullfullfullfull      | 0
        v4=2 dns=1 domain=a_b                  | 144
        v4=2 dns=1                             | 151
        v4=2 dns=1 s0=x s1=9.9.2313 s2=x       | 171 | s0= s1=9.9.9.9 | 3 IPv6 address: x: Name or service not known
        v4=2 dns=1 s1=fd00:0000000000000000000000000000000000000:0:9 s2=x | 163 | | 3 DNS server[1] address is unreachable: fd00:0000000000000000000000000000000000000:0:9
        v4=1 gw4mode=2 gw4if=eth7 dns=1 s0=10.9.9.0 | 153 | | 3 DNS server[0] address is unreachable: 10.9.9.0
        1.v4=1 dns=1 s2=10.1.255.255           | 276 | | 3 DNS server[2] address is the same as broadcast address: 10.1.255.255
        v4=2 host=-a                           | 1a4)");
}

TEST_F(Validate, ArgumentsAndCounts) {
    Setting s = make("v4=2");
    for (int i = 0; i < 6; i++) {
        const auto given = [&](int n, auto *argument) { return n == i ? nullptr : argument; };
        EXPECT_EQ(vlsys_address_check(given(0, s.nif), given(1, s.gw4.addr), given(2, s.gw6.addr),
                                      given(3, &s.dns), given(4, s.host)),
                  i < 5 ? EFAULT : 0);
        EXPECT_EQ(vlsys_address_check2(given(0, s.nif), i < 5, given(1, &s.gw4), given(2, &s.gw6),
                                       given(3, &s.dns), given(4, s.host)),
                  EFAULT);
    }
    errno = EPERM;
    EXPECT_EQ(vlsys::check_ipv4_text(nullptr, nullptr, 16, 0x160), EFAULT);
    EXPECT_EQ(vlsys::check_ipv4_text(nullptr, s.host, 16, 0x100), EINVAL);
    EXPECT_EQ(take_log(), "6 vlsys_address_check: start (DHCP, Off, Off)\n"
                          "6 vlsys_address_check: OK (DHCP, Off, Off)\n"
                          "3 DNS secondary server: str: Operation not permitted\n");
    EXPECT_EQ(vlsys::parse_uint("100000000", 16), -1);
    EXPECT_EQ(vlsys::parse_uint("80000000", 16), INT32_MIN);

    std::vector<vlsys_ifconf> nifs(1000, s.nif[0]);
    EXPECT_EQ(vlsys_address_check2(nifs.data(), 1000, &s.gw4, &s.gw6, &s.dns, s.host), 0);
    nifs[999].name[0] = '-';
    EXPECT_EQ(vlsys_address_check2(nifs.data(), 1000, &s.gw4, &s.gw6, &s.dns, s.host),
              VLSYS_CHECK_CODE(999, VLSYS_CHECK_FIELD_IFNAME, VLSYS_CHECK_KIND_NO_IFACE));
}
