#include "netconf/get_mode.h"

#include "core/lines.h"
#include "core/log.h"
#include "core/paths.h"
#include "core/text.h"
#include "core/wait.h"
#include "netconf/ifcfg.h"
#include "netconf/interfaces.h"

#include <cstring>

namespace vlsys {

namespace {

// What an interface's file says about its addresses.
struct AddressSettings {
    bool onboot;
    bool fixed;
    bool has_address;
    bool has_address6;
    bool dhcpv6;
};

} // namespace

static constexpr int not_opened = -1; // of is_sysctl_on

static File open_switch(const char *path) {
    for (int tries = 0; tries < 11; tries++) {
        File file(fopen(path, "re"));
        if (file || errno != ENOENT)
            return file;
        const SavedErrno missing;
        vlsys_log(LOG_DEBUG, "%s: retry(%s)", "is_sysctl_on", path);
        wait_seconds(1);
    }
    return nullptr;
}

int is_sysctl_on(const char *path) {
    const File file = open_switch(path);
    if (!file) {
        log_errno("%s: fopen(%s)", "is_sysctl_on", path);
        return not_opened;
    }
    const int first = next_byte(file.get());
    if (first == EOF && ferror(file.get()))
        return log_errno("%s: fgets(%s)", "is_sysctl_on", path);
    return first == '1' ? 1 : 0;
}

static int read_switches(const char *name, uint32_t *mode) {
    const Text disable = format_text("%s/%s/disable_ipv6", ipv6_conf_path, name);
    if (!disable)
        return log_errno("asprintf(\"%s/%s/disable_ipv6\")", ipv6_conf_path, name);
    const int disabled = is_sysctl_on(disable.get());
    if (disabled < not_opened)
        return disabled;
    if (disabled != 0) {
        *mode = VLSYS_MODE_OFF;
        return 0;
    }
    const Text autoconf = format_text("%s/%s/autoconf", ipv6_conf_path, name);
    if (!autoconf)
        return log_errno("asprintf(\"%s/%s/autoconf\")", ipv6_conf_path, name);
    const int automatic = is_sysctl_on(autoconf.get());
    if (automatic < not_opened)
        return automatic;
    *mode = automatic == 1 ? VLSYS_MODE_AUTO : VLSYS_MODE_OFF;
    return 0;
}

// Returns 0, or the negated errno when the file cannot be read.
static int read_addresses(FILE *file, AddressSettings *settings) {
    *settings = {};
    char line[256];
    Setting setting;
    int result = 0;
    while ((result = next_setting(file, line, sizeof line, Quotes::remove, &setting)) > 0) {
        const auto is = [&](const char *key) { return strcmp(setting.key, key) == 0; };
        const auto has = [&](const char *value) { return strcmp(setting.value, value) == 0; };
        settings->onboot |= is("ONBOOT") && has("yes");
        settings->fixed |= is("BOOTPROTO") && has("none");
        settings->has_address |= is("IPADDR");
        settings->has_address6 |= is("IPV6ADDR");
        settings->dhcpv6 |= is("DHCPV6C") && has("yes");
    }
    return result;
}

static int read_ifcfg(const char *name, AddressSettings *settings) {
    Ifcfg ifcfg;
    int result = open_ifcfg("get_mode", name, &ifcfg);
    if (result != 0)
        return result;
    result = read_addresses(ifcfg.file.get(), settings);
    if (result != 0)
        return log_errno("%s: fgets(%s)", "get_mode", ifcfg.path.get());
    settings->fixed |= strcmp(name, "lo") == 0;
    return 0;
}

static uint32_t ipv4_mode_of(const AddressSettings &settings) {
    if (!settings.onboot)
        return VLSYS_MODE_OFF;
    if (!settings.fixed)
        return VLSYS_MODE_DHCP;
    return settings.has_address ? VLSYS_MODE_MANUAL : VLSYS_MODE_OFF;
}

int get_mode(const char *name, uint32_t *ipv4_mode, uint32_t *ipv6_mode) {
    int result = read_switches(name, ipv6_mode);
    if (result != 0)
        return -result;
    if (is_virtual_bridge(name)) {
        *ipv4_mode = VLSYS_MODE_OFF;
        return 0;
    }
    AddressSettings settings;
    result = read_ifcfg(name, &settings);
    if (result != 0)
        return -result;
    *ipv4_mode = ipv4_mode_of(settings);
    if (settings.dhcpv6)
        *ipv6_mode = VLSYS_MODE_DHCP;
    else if (settings.has_address6)
        *ipv6_mode = VLSYS_MODE_MANUAL;
    return 0;
}

} // namespace vlsys
