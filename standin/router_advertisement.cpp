// router-advertisement INTERFACE PREFIX: what a router outside at fe80::1 says on the interface,
// once: it is a default router for half an hour, and addresses are made of the prefix (64 bits).
#include <arpa/inet.h>
#include <cstdio>
#include <fcntl.h>
#include <net/if.h>
#include <netinet/icmp6.h>
#include <netinet/in.h>
#include <sched.h>
#include <sys/socket.h>

static sockaddr_in6 address_of(const char *text, const char *interface) {
    sockaddr_in6 address = {};
    address.sin6_family = AF_INET6;
    address.sin6_scope_id = if_nametoindex(interface);
    inet_pton(AF_INET6, text, &address.sin6_addr);
    return address;
}

static bool send_from(const sockaddr_in6 &router, const sockaddr_in6 &everyone,
                      const char *prefix) {
    struct {
        nd_router_advert header;
        nd_opt_prefix_info prefix;
    } message = {};
    message.header.nd_ra_type = ND_ROUTER_ADVERT;
    message.header.nd_ra_router_lifetime = htons(1800);
    message.prefix.nd_opt_pi_type = ND_OPT_PREFIX_INFORMATION;
    message.prefix.nd_opt_pi_len = sizeof message.prefix / 8;
    message.prefix.nd_opt_pi_prefix_len = 64;
    message.prefix.nd_opt_pi_flags_reserved = ND_OPT_PI_FLAG_ONLINK | ND_OPT_PI_FLAG_AUTO;
    message.prefix.nd_opt_pi_valid_time = htonl(1800);
    message.prefix.nd_opt_pi_preferred_time = htonl(1800);
    inet_pton(AF_INET6, prefix, &message.prefix.nd_opt_pi_prefix);

    const int hops = 255; // from a neighbour, or it is ignored
    const int socket_fd = socket(AF_INET6, SOCK_RAW | SOCK_CLOEXEC, IPPROTO_ICMPV6);
    return setsockopt(socket_fd, IPPROTO_IPV6, IPV6_MULTICAST_HOPS, &hops, sizeof hops) == 0 &&
           bind(socket_fd, reinterpret_cast<const sockaddr *>(&router), sizeof router) == 0 &&
           sendto(socket_fd, &message, sizeof message, 0,
                  reinterpret_cast<const sockaddr *>(&everyone), sizeof everyone) > 0;
}

int main(int argc, char **argv) {
    if (argc != 3) {
        fputs("usage: router-advertisement INTERFACE PREFIX\n", stderr);
        return 2;
    }
    if (setns(open("/run/netns/outside", O_RDONLY | O_CLOEXEC), CLONE_NEWNET) == 0 &&
        send_from(address_of("fe80::1", argv[1]), address_of("ff02::1", argv[1]), argv[2]))
        return 0;
    perror("router-advertisement");
    return 1;
}
