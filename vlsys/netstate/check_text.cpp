// A check code in words.
#include "core/text.h"
#include "vlsys.h"

#include <cstdio>
#include <cstring>
#include <iterator>
#include <netdb.h>
#include <span>

namespace vlsys {

// By field number.
static constexpr const char *field_names[] = {
    nullptr,
    "IPv4 address",
    "IPv4 netmask",
    "IPv4 gateway",
    "DNS domain",
    "first DNS server",
    "second DNS server",
    "IPv6 address",
    "IPv6 prefix length",
    "IPv6 gateway",
    "host name",
    "interface name",
};

// By kind number.
static constexpr const char *kind_texts[] = {
    nullptr,
    "is missing or not valid",
    "has a gap",
    "cannot be reached",
    "is not well-formed",
    "is the address of the network",
    "is the broadcast address of the network",
    "is out of range",
    "is not allowed here",
    "names no interface",
    "is in the subnet of another interface",
    "does not go with the modes of the interfaces",
};

// The third DNS server has the field number of the IPv6 address. An interface without a fixed IPv6
// address has none that could be at fault, and these kinds of fault are a server's alone.
static bool is_third_server(int code, const vlsys_ifconf *nif) {
    if (VLSYS_CHECK_FIELD(code) != VLSYS_CHECK_FIELD_IPV6_ADDR)
        return false;
    switch (VLSYS_CHECK_KIND(code)) {
    case VLSYS_CHECK_KIND_UNREACHABLE:
    case VLSYS_CHECK_KIND_BROADCAST:
        return true;
    case VLSYS_CHECK_KIND_OVERLAP:
        return false;
    default:
        return nif && nif->ipv6_mode != VLSYS_MODE_MANUAL;
    }
}

// Other codes are of the setting as a whole, and their position says nothing.
static bool is_of_one_interface(int code, bool third_server) {
    switch (VLSYS_CHECK_KIND(code)) {
    case VLSYS_CHECK_KIND_NETWORK:
    case VLSYS_CHECK_KIND_BROADCAST:
        return true;
    case VLSYS_CHECK_KIND_OVERLAP:
        return VLSYS_CHECK_POSITION(code) > 0;
    default:
        break;
    }
    switch (VLSYS_CHECK_FIELD(code)) {
    case VLSYS_CHECK_FIELD_IPV4_ADDR:
    case VLSYS_CHECK_FIELD_IPV4_NETMASK:
    case VLSYS_CHECK_FIELD_IPV6_PREFIX:
    case VLSYS_CHECK_FIELD_IFNAME:
        return true;
    case VLSYS_CHECK_FIELD_IPV6_ADDR:
        return !third_server;
    default:
        return false;
    }
}

static const char *name_field(int code, bool third_server) {
    if (third_server)
        return "third DNS server";
    // The mode of DNS has no field number of its own.
    if (VLSYS_CHECK_FIELD(code) == VLSYS_CHECK_FIELD_DNS_DOMAIN &&
        VLSYS_CHECK_KIND(code) == VLSYS_CHECK_KIND_MODE)
        return "DNS mode";
    return field_names[VLSYS_CHECK_FIELD(code)];
}

namespace {

// Long enough for every text: the longest names of field and kind, and an interface's.
struct CheckText {
    char text[160];
};

} // namespace

static CheckText describe_error(int error) {
    CheckText result = {};
    if (error == 0) {
        vlsys_strlcpy(result.text, "no fault", sizeof result.text);
    } else if (error > 0) {
        char reason[128];
        snprintf(result.text, sizeof result.text, "error %d: %s", error,
                 strerror_r(error, reason, sizeof reason));
    } else {
        snprintf(result.text, sizeof result.text, "error %d: %s", error, gai_strerror(error));
    }
    return result;
}

static CheckText describe_code(int code, std::span<const vlsys_ifconf> nifs) {
    CheckText result = {};
    const auto field = static_cast<size_t>(VLSYS_CHECK_FIELD(code));
    const auto kind = static_cast<size_t>(VLSYS_CHECK_KIND(code));
    if (field == 0 || field >= std::size(field_names) || kind == 0 ||
        kind >= std::size(kind_texts)) {
        snprintf(result.text, sizeof result.text, "unknown fault %#x",
                 static_cast<unsigned int>(code));
        return result;
    }
    const auto position = static_cast<size_t>(VLSYS_CHECK_POSITION(code));
    const vlsys_ifconf *const nif = position < nifs.size() ? &nifs[position] : nullptr;
    const bool third_server = is_third_server(code, nif);
    char interface[32] = "";
    if (is_of_one_interface(code, third_server) && nif)
        snprintf(interface, sizeof interface, "%s: ", FieldText(nif->name).text);
    else if (is_of_one_interface(code, third_server))
        snprintf(interface, sizeof interface, "interface %zu: ", position + 1);
    snprintf(result.text, sizeof result.text, "%sthe %s %s", interface,
             name_field(code, third_server), kind_texts[kind]);
    return result;
}

} // namespace vlsys

using namespace vlsys;

size_t vlsys_check_text(int code, const vlsys_ifconf *nifs, int count, char *buffer, size_t size) {
    const std::span<const vlsys_ifconf> list(nifs,
                                             nifs && count > 0 ? static_cast<size_t>(count) : 0);
    const CheckText result =
        VLSYS_CHECK_IS_CODE(code) ? describe_code(code, list) : describe_error(code);
    return vlsys_strlcpy(buffer, result.text, buffer ? size : 0);
}
