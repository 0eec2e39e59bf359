#include "netstate/address.h"

#include "core/log.h"
#include "core/owners.h"
#include "netconf/interfaces.h"

#include <algorithm>
#include <cerrno>
#include <memory>
#include <net/if.h>
#include <netdb.h>

namespace vlsys {

// By field number. The texts are those of the appliance's log, as they always were.
static constexpr const char *field_labels[] = {
    "",
    "IPv4 address",
    "IPv4 netmask",
    "IPv4 defautl gateway ",
    "DNS domain",
    "DNS primary server",
    "DNS secondary server",
    "IPv6 address",
    "IPv6 prefixlen",
    "IPv6 default gateway",
    "hostname",
};

static constexpr int first_netmask = VLSYS_CHECK_CODE(0, VLSYS_CHECK_FIELD_IPV4_NETMASK, 0);

namespace {

// The text of an address, and the field of a setting that it stands in.
struct AddressField {
    char *text;
    size_t capacity;
    int code;
    const char *label; // null when the code is not that of a field with a label
};

} // namespace

static AddressField make_field(char *text, size_t capacity, int fieldcode) {
    const int number = VLSYS_CHECK_FIELD(fieldcode);
    const bool has_label =
        number >= VLSYS_CHECK_FIELD_IPV4_ADDR && number <= VLSYS_CHECK_FIELD_HOSTNAME;
    return {
        .text = text,
        .capacity = capacity,
        .code = fieldcode,
        .label = has_label ? field_labels[number] : nullptr,
    };
}

int addr_to_text(const struct sockaddr *addr, socklen_t addrlen, char *text, size_t textcap,
                 const char *label) {
    // The resolver may write a part of what turns out too long for the caller's buffer.
    char written[NI_MAXHOST];
    const auto capacity = static_cast<socklen_t>(std::min(textcap, sizeof written));
    const int error = getnameinfo(addr, addrlen, written, capacity, nullptr, 0, NI_NUMERICHOST);
    if (error == EAI_SYSTEM)
        return -log_errno("%s: getnameinfo", label);
    if (error != 0) {
        vlsys_log(LOG_ERR, "%s: getnameinfo: %s", label, gai_strerror(error));
        return error;
    }
    vlsys_strlcpy(text, written, textcap);
    return 0;
}

// The resolver takes a scope that it cannot look up for an unknown one. Returns the positive errno
// of the look-up, logged, or 0 when the scope is unknown indeed or there is none.
static int find_scope_error(const char *text) {
    const char *const scope = strchr(text, '%');
    const int missing = scope ? find_interface(scope + 1) : 0;
    return missing == -ENXIO ? 0 : -missing;
}

static int text_to_addr(const AddressField &field, int family, void *out, size_t size) {
    if (!field.label)
        return EINVAL;
    if (!field.text) {
        log_errno("%s: str", field.label);
        return EFAULT;
    }
    if (!out) {
        log_errno("%s: sa", field.label);
        return EFAULT;
    }

    // A field that is full has no NUL.
    char text[VLSYS_ADDR6_SIZE + 1];
    snprintf(text, sizeof text, "%.*s", static_cast<int>(field.capacity), field.text);
    addrinfo hints = {};
    hints.ai_flags = AI_NUMERICHOST;
    hints.ai_family = family;
    addrinfo *result = nullptr;
    const int error = getaddrinfo(text, nullptr, &hints, &result);
    if (error == EAI_SYSTEM)
        return -log_errno("%s: %s", field.label, text);
    if (error != 0) {
        if (const int unknown = find_scope_error(text))
            return unknown;
        vlsys_log(LOG_ERR, "%s: %s: %s", field.label, text, gai_strerror(error));
        return field.code | VLSYS_CHECK_KIND_INVALID;
    }
    const AddressList list(result);
    memcpy(out, list->ai_addr, size);
    return 0;
}

// Rewrites the text in canonical form.
template <class Address>
static int rewrite(const AddressField &field, const Address *address) {
    return addr_to_text(reinterpret_cast<const sockaddr *>(address), sizeof *address, field.text,
                        field.capacity, field.label);
}

static bool is_global_unicast(const in6_addr &address) {
    return address.s6_addr[0] >> 5 == 1;
}

static bool is_unique_local(const in6_addr &address) {
    return address.s6_addr[0] >> 1 == 0x7E;
}

// The kernel lets an interface be named "$(x)". Such a name must not get into a file that scripts
// run as shell text, and with the scope of an address it would.
static bool has_plain_scope(const sockaddr_in6 &address) {
    char name[IF_NAMESIZE];
    if (!if_indextoname(address.sin6_scope_id, name))
        return errno != ENXIO; // the number of no interface
    static constexpr char plain[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789"
                                    "._-@+";
    return name[strspn(name, plain)] == '\0';
}

int check_ipv6_text(struct sockaddr_in6 *out, char *text, int fieldcode) {
    const AddressField field = make_field(text, VLSYS_ADDR6_SIZE, fieldcode);
    if (const int error = text_to_addr(field, AF_INET6, out, sizeof *out))
        return error;

    const in6_addr &address = out->sin6_addr;
    if (IN6_IS_ADDR_LINKLOCAL(&address)) {
        if (out->sin6_scope_id == 0 || !has_plain_scope(*out))
            return fieldcode | VLSYS_CHECK_KIND_INVALID;
    } else if (!is_global_unicast(address) && !is_unique_local(address)) {
        return fieldcode | VLSYS_CHECK_KIND_RANGE;
    } else if (out->sin6_scope_id != 0) {
        return fieldcode | VLSYS_CHECK_KIND_INVALID; // no script takes a scope there
    }
    return rewrite(field, out);
}

int check_netmask_text(struct sockaddr_in *out, char *text, size_t textcap, int fieldcode) {
    const AddressField field = make_field(text, textcap, fieldcode);
    const int error = text_to_addr(field, AF_INET, out, sizeof *out);
    return error != 0 ? error : rewrite(field, out);
}

int check_ipv4_text(struct sockaddr_in *out, char *text, size_t textcap, int fieldcode) {
    if (fieldcode == first_netmask)
        return check_netmask_text(out, text, textcap, fieldcode);
    const AddressField field = make_field(text, textcap, fieldcode);
    if (const int error = text_to_addr(field, AF_INET, out, sizeof *out))
        return error;

    const uint32_t address = ntohl(out->sin_addr.s_addr);
    if (address == 0 || address >> 24 == 127 || address >> 24 >= 224)
        return fieldcode | VLSYS_CHECK_KIND_RANGE;
    return rewrite(field, out);
}

int parse_uint(const char *text, int base) {
    const long long value = strtoll(text, nullptr, base);
    return value < 0 || value > UINT32_MAX ? -1 : static_cast<int>(value);
}

} // namespace vlsys
