#include "netstate/report.h"

#include "core/log.h"
#include "core/wait.h"
#include "netconf/interfaces.h"
#include "netstate/mode_text.h"

#include <algorithm>
#include <cstdarg>
#include <cstring>
#include <netdb.h>
#include <span>

namespace vlsys {

static constexpr int shown_interfaces = 2;
static constexpr int ipv6_tries = 10; // 1 second apart

// By mode.
static constexpr const char *gateway_modes[] = {"off", "static", "dhcp", "auto"};

namespace {

// What does not fit into the line is dropped.
class Line {
  public:
    [[gnu::format(printf, 2, 3)]] void append(const char *format, ...);
    bool is_empty() const { return length_ == 0; }
    void log() const { vlsys_log(LOG_INFO, "%s", text_); }

  private:
    char text_[160] = "";
    size_t length_ = 0;
};

} // namespace

void Line::append(const char *format, ...) {
    va_list arguments;
    va_start(arguments, format);
    const int length = vsnprintf(text_ + length_, sizeof text_ - length_, format, arguments);
    va_end(arguments);
    if (length > 0)
        length_ = std::min(length_ + static_cast<size_t>(length), sizeof text_ - 1);
}

static void query(const char *name, int exit_code, vlsys_ifconf *nif) {
    for (int tries = 1; tries <= ipv6_tries; tries++) {
        *nif = {};
        vlsys_log(LOG_DEBUG, "q: %s", name);
        const int result = vlsys_get_netif(name, nif);
        if (result != 0) {
            vlsys_log(LOG_ERR, "vlsys_get_netif(%s): %s", name,
                      result < 0 ? gai_strerror(result) : strerror(result));
            return;
        }
        if (exit_code != 0 || nif->ipv6_mode == VLSYS_MODE_OFF || nif->has_ipv6)
            return;
        wait_seconds(1);
        vlsys_log(LOG_DEBUG, "%s: retry vlsys_get_netif(%s) %d times", "print_network_info", name,
                  tries);
    }
}

static void log_failure(const char *reader, int result) {
    if (result != 0)
        vlsys_log(LOG_ERR, "%s: %s", reader, strerror(result));
}

static void report_link(const char *name, const vlsys_ifconf &nif) {
    Line line;
    line.append("%s: %s", name, nif.lower_up ? "link up" : "no carrier");
    if (nif.mac[0] != '\0')
        line.append(", MAC: %s", nif.mac);
    line.log();
}

static void append_address(Line *line, const char *addr, uint32_t prefix) {
    line->append("%s%s/%u", line->is_empty() ? "" : ", ", addr, prefix);
}

// No line for an interface without an address in force.
static void report_addresses(const vlsys_ifconf &nif) {
    Line line;
    if (nif.up)
        append_address(&line, nif.addr, nif.prefix);
    for (const vlsys_addr6 &addr6 : nif.addr6)
        if (nif.has_ipv6 && addr6.addr[0] != '\0')
            append_address(&line, addr6.addr, addr6.prefix);
    if (!line.is_empty())
        line.log();
}

static void append_gateway(Line *line, std::span<const char *const> modes, uint32_t mode,
                           const char *addr, const char *iface) {
    if (mode == VLSYS_MODE_OFF) {
        line->append("[off]");
        return;
    }
    char number[11];
    snprintf(number, sizeof number, "%u", mode);
    line->append("%s (%s) [%.7s]", addr, iface, mode < modes.size() ? modes[mode] : number);
}

static void report_gateways(const vlsys_gw4 &gw4, const vlsys_gw6 &gw6) {
    const std::span<const char *const> modes(gateway_modes);
    Line line;
    line.append("gw4 ");
    append_gateway(&line, modes.first(3), gw4.mode, gw4.addr, gw4.iface);
    line.append(", gw6 ");
    append_gateway(&line, modes, gw6.mode, gw6.addr, gw6.iface);
    line.log();
}

static void report_dns(const vlsys_dns &dns) {
    Line line;
    line.append("DNS domain: %s  server: ", dns.domain);
    for (const auto &server : dns.server)
        if (server[0] != '\0')
            line.append("%s%s", &server == dns.server ? "" : ", ", server);
    line.log();
}

void print_network_info(int exit_code) {
    const InterfaceList interfaces;
    if (interfaces.count() == 0) {
        vlsys_log(LOG_ERR, "%s", "no netif exist");
        return;
    }
    const std::span shown(interfaces.begin(),
                          static_cast<size_t>(std::min(interfaces.count(), shown_interfaces)));
    vlsys_ifconf nifs[shown_interfaces] = {};
    for (size_t i = 0; i < shown.size(); i++)
        query(shown[i], exit_code, &nifs[i]);

    vlsys_gw4 gw4 = {};
    vlsys_gw6 gw6 = {};
    vlsys_dns dns = {};
    log_failure("vlsys_get_ipv4_default_gateway2", vlsys_get_ipv4_default_gateway2(&gw4));
    log_failure("vlsys_get_ipv6_default_gateway2", vlsys_get_ipv6_default_gateway2(&gw6));
    log_failure("vlsys_get_dns_settings", vlsys_get_dns_settings(&dns));

    vlsys_log(LOG_INFO, "mode: %s", summarize_modes(nifs, gw4, gw6, dns).text);
    for (size_t i = 0; i < shown.size(); i++) {
        report_link(shown[i], nifs[i]);
        report_addresses(nifs[i]);
    }
    report_gateways(gw4, gw6);
    report_dns(dns);
}

} // namespace vlsys
