// Mode names, and the nine-letter summary of a whole network setting.
#pragma once

#include "vlsys.h"

#include <span>

namespace vlsys {

// "Off", "Manual", "DHCP", "Auto"; empty for any other value.
const char *mode_name(uint32_t mode);

// One letter each: IPv4 mode of the first and the second interface, their IPv6 modes, the IPv4 and
// the IPv6 gateway, DNS, its first and its second server.
// "_" Off or empty, "M" Manual, "D" DHCP, "A" Auto, "?" any other mode. A gateway that is learnt
// shows the interface that it is learnt on: "0" the first, "1" the second, "!" any other. A server
// of a Manual DNS setting shows its family, "4" or "6".
struct ModeSummary {
    char text[10];
};

// Of `nifs` the first two count; the letters of one that is missing are "_".
ModeSummary summarize_modes(std::span<const vlsys_ifconf> nifs, const vlsys_gw4 &gw4,
                            const vlsys_gw6 &gw6, const vlsys_dns &dns);

} // namespace vlsys
