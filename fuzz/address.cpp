// Address texts under any field, and host names.
#include "netstate/address.h"
#include "fuzz.h"
#include "netconf/hostname.h"

static int convert(bool ipv6, std::string &text, int code) {
    sockaddr_in6 out;
    return ipv6 ? vlsys::check_ipv6_text(&out, text.data(), code)
                : vlsys::check_ipv4_text(reinterpret_cast<sockaddr_in *>(&out), text.data(), 46,
                                         code);
}

static void check(Input &in) {
    const int code = 0x110 + static_cast<int>(in[1].size() % 10) * 0x10;
    for (const bool ipv6 : {false, true}) {
        std::string text = in[0].substr(0, 46).append(46, '\0');
        std::string same = text;
        const int result = convert(ipv6, text, code);
        assert(result == (code | 1) || result == (code | 8) ? text == same : result <= 0);
        assert(result != 0 || (convert(ipv6, same = text, code) == 0 && same == text));
        const auto start = strtoul(text.c_str(), nullptr, ipv6 ? 16 : 10); // the first group
        if (result == 0)
            assert(ipv6 ? start >> 13 == 1 || start >> 9 == 0x7e || start >> 6 == 0x3fa
                        : code == 0x120 || (start != 127 && start < 224));
    }
    const std::string name = in[0].substr(0, in[0].find('\0'));
    if (vlsys::check_hostname_format(name.c_str()) == 0)
        for (const char *wrong : {"..", ".-", "-.", "--", "_", "/", " ", ":"})
            assert(!has("." + name, wrong) && name.size() < 256);
}
