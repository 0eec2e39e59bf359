#include "core/lines.h"
#include "core/log.h"
#include "core/paths.h"
#include "core/text.h"
#include "netconf/ifcfg.h"
#include "netconf/interfaces.h"
#include "netconf/keys.h"

#include <cstring>
#include <iterator>
#include <string_view>

namespace vlsys {

namespace {

// The texts that the DNS interface's file may get from the record; server_2 is null when empty.
struct DnsTexts {
    const char *domain, *server_1, *server_2;
};

enum class DnsColumn : uint8_t { other_interface, off, manual, dhcp };

// What an interface's file says about DNS.
struct DnsSettings {
    bool peerdns_no;
    bool has_domain;
};

} // namespace

using enum Action;
static constexpr auto domain = &DnsTexts::domain;
static constexpr auto server_1 = &DnsTexts::server_1;
static constexpr auto server_2 = &DnsTexts::server_2;

// clang-format off
static constexpr KeyRow<DnsTexts, 4> dns_keys[] = {
    // DNS        other interface  Off      Manual    DHCP
    {"PEERDNS",  {"no",            "no",    "yes",    "yes"}},
    {"DOMAIN",   {removed,         removed, domain,   removed}},
    {"DNS1",     {removed,         removed, server_1, removed}},
    {"DNS2",     {removed,         removed, server_2, removed}},
};
// clang-format on

static DnsColumn column_of(const char *name, const vlsys_dns &dns) {
    if (strncmp(name, dns.iface, sizeof dns.iface) != 0)
        return DnsColumn::other_interface;
    switch (dns.mode) {
    case VLSYS_MODE_OFF:
        return DnsColumn::off;
    case VLSYS_MODE_DHCP:
        return DnsColumn::dhcp;
    default:
        return DnsColumn::manual;
    }
}

static void log_column(const char *name, DnsColumn column, const DnsTexts &texts) {
    switch (column) {
    case DnsColumn::other_interface:
        vlsys_log(LOG_DEBUG, "PEERDNS=no (%s)", name);
        break;
    case DnsColumn::off:
        vlsys_log(LOG_INFO, "DNS OFF (%s)", name);
        break;
    case DnsColumn::manual:
        vlsys_log(LOG_INFO, "DNS %s, %s, %s (%s)", texts.domain, texts.server_1,
                  texts.server_2 ? texts.server_2 : "", name);
        break;
    case DnsColumn::dhcp:
        vlsys_log(LOG_INFO, "DNS DHCP (%s)", name);
    }
}

static int set_dns_of(const char *name, const vlsys_dns &dns, const DnsTexts &texts) {
    const SystemPath path(ifcfg_prefix, name);
    vlsys_log(LOG_DEBUG, "%s", path.text);
    const DnsColumn column = column_of(name, dns);
    if (column == DnsColumn::manual && texts.server_1[0] == '\0')
        return -EINVAL;
    log_column(name, column, texts);

    edit_item array[std::size(dns_keys)];
    ItemList list(array);
    list.add_column(dns_keys, column, texts);
    const auto items = list.items();
    const int result = edit(path.text, items.data(), static_cast<uint32_t>(items.size()));
    if (result < 0)
        vlsys_log(LOG_ERR, "%s", "param: failed");
    return result;
}

static int set_dns(const vlsys_dns &dns) {
    if (dns.mode != VLSYS_MODE_OFF && dns.iface[0] == '\0')
        return -EINVAL;
    const InterfaceList interfaces;
    if (interfaces.count() == 0)
        return -ENXIO;
    const FieldText domain_text(dns.domain);
    const FieldText server_1_text(dns.server[0]);
    const FieldText server_2_text(dns.server[1]);
    const DnsTexts texts = {
        .domain = domain_text.text,
        .server_1 = server_1_text.text,
        .server_2 = server_2_text.is_empty() ? nullptr : server_2_text.text,
    };
    for (const auto &name : interfaces) {
        const int result = set_dns_of(name, dns, texts);
        if (result != 0)
            return result;
    }
    return 0;
}

// Returns 0, or the negated errno when the file cannot be read.
static int read_resolver(FILE *file, vlsys_dns *dns) {
    int servers = 0;
    char line[256];
    int result = 0;
    while ((result = read_line(file, line, sizeof line)) > 0) {
        if (line[0] == '#' || line[0] == ';' || line[0] == '\n')
            continue;
        char *rest = nullptr;
        const char *const word = strtok_r(line, " \t\n", &rest);
        if (!word)
            return 0;
        const std::string_view keyword = word;
        const char *value = strtok_r(nullptr, " \t\n", &rest);
        if (!value)
            value = "";
        if (starts_with(keyword, "domain") || starts_with(keyword, "search"))
            vlsys_strlcpy(dns->domain, value, sizeof dns->domain);
        else if (starts_with(keyword, "nameserver") && servers < VLSYS_DNS_COUNT &&
                 strlen(value) < VLSYS_ADDR6_SIZE) // cut, it would be another server
            vlsys_strlcpy(dns->server[servers++], value, VLSYS_ADDR6_SIZE);
    }
    return result;
}

// Returns 0, or the negated errno when the file cannot be read.
static int read_peerdns(FILE *file, DnsSettings *settings) {
    *settings = {};
    char line[256];
    Setting setting;
    int result = 0;
    while ((result = next_setting(file, line, sizeof line, Quotes::keep, &setting)) > 0) {
        settings->peerdns_no |=
            strcmp(setting.key, "PEERDNS") == 0 && strcmp(setting.value, "no") == 0;
        settings->has_domain |= strcmp(setting.key, "DOMAIN") == 0;
    }
    return result;
}

static int read_dns_of(const char *name, DnsSettings *settings) {
    static constexpr char self[] = "vlsys_get_dns_settings";
    Ifcfg ifcfg;
    int result = open_ifcfg(self, name, &ifcfg);
    if (result != 0)
        return result;
    result = read_peerdns(ifcfg.file.get(), settings);
    if (result != 0)
        return log_errno("%s: fgets(%s)", self, ifcfg.path.get());
    return 0;
}

// Off when the mode is still DHCP and every file read has PEERDNS=no, as the setter writes it.
static int read_dns_mode(const InterfaceList &interfaces, uint32_t *mode) {
    int files = 0;
    int files_with_no = 0;
    int result = 0;
    *mode = VLSYS_MODE_DHCP;
    for (const auto &name : interfaces) {
        DnsSettings settings;
        result = read_dns_of(name, &settings);
        if (result != 0)
            break;
        if (settings.has_domain) {
            *mode = VLSYS_MODE_MANUAL;
            return 0;
        }
        files++;
        files_with_no += settings.peerdns_no;
    }
    if (files_with_no > 0 && files_with_no == files)
        *mode = VLSYS_MODE_OFF;
    return result;
}

static int get_dns(vlsys_dns *dns) {
    *dns = {};
    File file(fopen(resolv_path, "re"));
    if (!file)
        return errno == ENOENT ? 0 : log_errno("%s", resolv_path);
    const int result = read_resolver(file.get(), dns);
    if (result != 0) {
        *dns = {};
        return log_errno("fgets(%s)", resolv_path);
    }
    file.reset(); // the list may need its descriptor
    const InterfaceList interfaces;
    return interfaces.count() == 0 ? 0 : read_dns_mode(interfaces, &dns->mode);
}

} // namespace vlsys

using namespace vlsys;

int vlsys_set_dns_settings(const vlsys_dns *dns) {
    return dns ? -set_dns(*dns) : EFAULT;
}

int vlsys_get_dns_settings(vlsys_dns *dns) {
    return -get_dns(dns);
}
