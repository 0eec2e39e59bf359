#include "netstate/mode_text.h"

#include "netstate/address.h"

#include <cstring>
#include <string_view>

namespace vlsys {

static constexpr const char *mode_names[] = {"Off", "Manual", "DHCP", "Auto"};

// By mode.
static constexpr std::string_view letters4 = "_MD";
static constexpr std::string_view letters6 = "_MDA";

const char *mode_name(uint32_t mode) {
    return mode < std::size(mode_names) ? mode_names[mode] : "";
}

static char mode_letter(std::string_view letters, uint32_t mode) {
    return mode < letters.size() ? letters[mode] : '?';
}

static char gateway_letter(std::string_view letters, uint32_t mode, const char *iface,
                           std::span<const vlsys_ifconf> nifs) {
    if (mode <= VLSYS_MODE_MANUAL || mode >= letters.size())
        return mode_letter(letters, mode);
    for (size_t i = 0; i < nifs.size(); i++)
        if (strncmp(nifs[i].name, iface, VLSYS_IFNAME_SIZE) == 0)
            return i == 0 ? '0' : '1';
    return '!';
}

static char server_letter(uint32_t mode, const char (&server)[VLSYS_ADDR6_SIZE]) {
    if (mode != VLSYS_MODE_MANUAL)
        return mode_letter(letters4, mode);
    if (server[0] == '\0')
        return '_';
    return is_ipv6_text(server) ? '6' : '4';
}

ModeSummary summarize_modes(std::span<const vlsys_ifconf> nifs, const vlsys_gw4 &gw4,
                            const vlsys_gw6 &gw6, const vlsys_dns &dns) {
    ModeSummary summary = {"_________"};
    const auto first_two = nifs.first(nifs.size() < 2 ? nifs.size() : 2);
    for (size_t i = 0; i < first_two.size(); i++) {
        summary.text[i] = mode_letter(letters4, first_two[i].ipv4_mode);
        summary.text[2 + i] = mode_letter(letters6, first_two[i].ipv6_mode);
    }
    summary.text[4] = gateway_letter(letters4, gw4.mode, gw4.iface, first_two);
    summary.text[5] = gateway_letter(letters6, gw6.mode, gw6.iface, first_two);
    summary.text[6] = mode_letter(letters4, dns.mode);
    summary.text[7] = server_letter(dns.mode, dns.server[0]);
    summary.text[8] = server_letter(dns.mode, dns.server[1]);
    return summary;
}

} // namespace vlsys
