// Address texts to socket addresses and back, numeric only: no name is ever looked up.
//
// The checks return 0, an errno value (EFAULT for a null argument, EINVAL for a field code outside
// fields 1 to 10), a negative resolver code, or the field code with
// VLSYS_CHECK_KIND_INVALID or VLSYS_CHECK_KIND_RANGE in it. The latter is silent, and so is a
// link-local IPv6 address without its "%interface"; everything else is logged under the field's
// label. On success the text is rewritten in canonical form; on failure it is left as it was, but
// `out` holds the address as soon as the text was one.
#pragma once

#include "vlsys.h"

#include <cstring>
#include <netinet/in.h>
#include <sys/socket.h>

namespace vlsys {

// The address as text; `label` names it in the two log lines. Returns 0, an errno value or a
// negative resolver code; `text` is written on success only.
int addr_to_text(const struct sockaddr *addr, socklen_t addrlen, char *text, size_t textcap,
                 const char *label);

// `text` is a buffer of VLSYS_ADDR6_SIZE bytes. Allowed: global unicast, unique local, and
// link-local with a scope whose name is letters, digits and "._-@+".
int check_ipv6_text(struct sockaddr_in6 *out, char *text, int fieldcode);

// `text` is a buffer of at most VLSYS_ADDR6_SIZE bytes. Refused: 0.0.0.0, 127.0.0.0/8 and all from
// 224.0.0.0 on, unless the field is the first interface's netmask.
int check_ipv4_text(struct sockaddr_in *out, char *text, size_t textcap, int fieldcode);

// The netmask of any interface: the same without a refused range.
int check_netmask_text(struct sockaddr_in *out, char *text, size_t textcap, int fieldcode);

// Whether a text field is to be taken for an IPv6 address.
inline bool is_ipv6_text(const char (&text)[VLSYS_ADDR6_SIZE]) {
    return memchr(text, ':', strnlen(text, sizeof text));
}

// The number at the start of the text (0 without digits), or -1 when it is negative or has more
// than 32 bits. A value of 32 bits comes back as the int of the same bits.
int parse_uint(const char *text, int base);

} // namespace vlsys
