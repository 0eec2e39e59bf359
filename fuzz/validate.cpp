// Both validators, on records of any bytes. The result is 0, a negative resolver code, or a check
// code that can be taken apart. A setting that passes once passes again.
#include "vlsys.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <syslog.h>

#define CHECK(condition) ((condition) ? void() : abort())

struct Setting {
    vlsys_gw4 gw4;
    vlsys_gw6 gw6;
    vlsys_ifconf nifs[2];
    vlsys_dns dns;
    char hostname[VLSYS_HOSTNAME_SIZE];
};

static int validate(Setting &s, bool is_several) {
    if (is_several)
        return vlsys_address_check2(s.nifs, 2, &s.gw4, &s.gw6, &s.dns, s.hostname);
    return vlsys_address_check(s.nifs, s.gw4.addr, s.gw6.addr, &s.dns, s.hostname);
}

extern "C" int LLVMFuzzerTestOneInput(const char *data, size_t size) {
    vlsys_setlogmask(LOG_MASK(LOG_EMERG));
    for (const bool is_several : {false, true}) {
        Setting s = {};
        memcpy(&s, data, std::min(size, sizeof s));
        s.hostname[sizeof s.hostname - 1] = '\0';
        for (vlsys_ifconf &nif : s.nifs)
            vlsys_strlcpy(nif.name, is_several ? "eth1" : "lo", sizeof nif.name);
        const int code = validate(s, is_several);
        CHECK(code <= 0 || (VLSYS_CHECK_IS_CODE(code) && VLSYS_CHECK_POSITION(code) < 2));
        CHECK(code != 0 || validate(s, is_several) == 0);
    }
    return 0;
}
