#include "netconf/get_mode.h"

#include "core/lines.h"
#include "core/log.h"
#include "core/paths.h"
#include "core/text.h"
#include "netconf/ifcfg.h"
#include "netconf/interfaces.h"

#include <cstring>

namespace vlsys {

static File open_switch(const char *path) {
    for (int tries = 0; tries < 11; tries++) {
        File file(fopen(path, "re"));
        if (file || errno != ENOENT)
            return file;
        const SavedErrno missing;
        vlsys_log(LOG_DEBUG, "%s: retry(%s)", "is_sysctl_on", path);
        sleep(1);
    }
    return nullptr;
}

int is_sysctl_on(const char *path) {
    const File file = open_switch(path);
    if (!file) {
        vlsys_log(LOG_ERR, "%s: fopen(%s): %m", "is_sysctl_on", path);
        return -1;
    }
    return fgetc(file.get()) == '1' ? 1 : 0;
}

static int get_switches_mode(const char *name, uint32_t *mode) {
    const Text disable = format_text("%s/%s/disable_ipv6", ipv6_conf_path, name);
    if (!disable) {
        vlsys_log(LOG_ERR, "asprintf(\"%s/%s/disable_ipv6\"): %m", ipv6_conf_path, name);
        return errno;
    }
    *mode = VLSYS_MODE_OFF;
    if (is_sysctl_on(disable.get()) != 0)
        return 0;
    const Text autoconf = format_text("%s/%s/autoconf", ipv6_conf_path, name);
    if (!autoconf) {
        vlsys_log(LOG_ERR, "asprintf(\"%s/%s/autoconf\"): %m", ipv6_conf_path, name);
        return errno;
    }
    if (is_sysctl_on(autoconf.get()) > 0)
        *mode = VLSYS_MODE_AUTO;
    return 0;
}

namespace {

// What an interface's file says about its addresses.
struct Settings {
    bool onboot;
    bool fixed;
    bool has_address;
    bool has_address6;
    bool dhcpv6;
};

} // namespace

static Settings read_settings(FILE *file) {
    Settings settings = {};
    char line[256];
    Setting setting;
    while (next_setting(file, line, sizeof line, Quotes::remove, &setting) > 0) {
        const auto is = [&](const char *key) { return strcmp(setting.key, key) == 0; };
        const auto has = [&](const char *value) { return strcmp(setting.value, value) == 0; };
        settings.onboot |= is("ONBOOT") && has("yes");
        settings.fixed |= is("BOOTPROTO") && has("none");
        settings.has_address |= is("IPADDR");
        settings.has_address6 |= is("IPV6ADDR");
        settings.dhcpv6 |= is("DHCPV6C") && has("yes");
    }
    return settings;
}

static uint32_t ipv4_mode_of(const Settings &settings) {
    if (!settings.onboot)
        return VLSYS_MODE_OFF;
    if (!settings.fixed)
        return VLSYS_MODE_DHCP;
    return settings.has_address ? VLSYS_MODE_MANUAL : VLSYS_MODE_OFF;
}

int get_mode(const char *name, uint32_t *ipv4_mode, uint32_t *ipv6_mode) {
    const int result = get_switches_mode(name, ipv6_mode);
    if (result != 0)
        return result;
    if (is_virtual_bridge(name)) {
        *ipv4_mode = VLSYS_MODE_OFF;
        return 0;
    }
    const File file = open_ifcfg("get_mode", name);
    if (!file)
        return errno;
    Settings settings = read_settings(file.get());
    settings.fixed |= strcmp(name, "lo") == 0;
    *ipv4_mode = ipv4_mode_of(settings);
    if (settings.dhcpv6)
        *ipv6_mode = VLSYS_MODE_DHCP;
    else if (settings.has_address6)
        *ipv6_mode = VLSYS_MODE_MANUAL;
    return 0;
}

} // namespace vlsys
