// fault-operation NAME N: runs one operation of the library, or the tool; the N-th allocation or
// address conversion that it asks for fails. It logs "begin" and "end" around it, prints the result
// and the number of requests, and ends with 1, 2, 4 and 8 for each of descriptors, memory, umask
// and signal mask that are not as before.
#include "device/avio.h"
#include "vlsys.h"

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <dlfcn.h>
#include <fcntl.h>
#include <netdb.h>
#include <stdio_ext.h>
#include <sys/stat.h>

#ifdef __SANITIZE_ADDRESS__ // strdup's blocks are the sanitizer's, which finds leaks itself
#define REAL(name) __interceptor_##name
#else
#define REAL(name) __libc_##name
#endif
#define NEXT(name) reinterpret_cast<decltype(&(name))>(dlsym(RTLD_NEXT, #name))
static long requests, failing, blocks, started;

static bool refuse() {
    if (++requests != failing) // errno is not there yet at the very start
        return false;
    errno = ENOMEM;
    return true;
}

static void *count(void *memory) {
    blocks += memory != nullptr;
    return memory;
}

// clang-format off
// libc's own parameter names are reserved.
// NOLINTBEGIN(readability-inconsistent-declaration-parameter-name)
extern "C" { // what libc calls, too
void *REAL(malloc)(size_t), *REAL(calloc)(size_t, size_t), *REAL(realloc)(void *, size_t);
void REAL(free)(void *);
int __real_main(); // the tool's

void *malloc(size_t size) { return refuse() ? nullptr : count(REAL(malloc)(size)); }
void *calloc(size_t n, size_t size) { return refuse() ? nullptr : count(REAL(calloc)(n, size)); }
void free(void *memory) { blocks -= memory != nullptr; REAL(free)(memory); }
void *realloc(void *old, size_t size) {
    if (refuse())
        return nullptr;
    blocks -= old != nullptr;
    return count(REAL(realloc)(old, size));
}
int getaddrinfo(const char *node, const char *service, const addrinfo *hints, addrinfo **list) {
    return refuse() ? EAI_SYSTEM : NEXT(getaddrinfo)(node, service, hints, list);
}
int getnameinfo(const sockaddr *a, socklen_t b, char *c, socklen_t d, char *e, socklen_t f, int g) {
    return refuse() ? EAI_SYSTEM : NEXT(getnameinfo)(a, b, c, d, e, f, g);
}
unsigned int sleep(unsigned int /*seconds*/) { return 0; }
int nanosleep(const timespec * /*request*/, timespec * /*remaining*/) { return 0; }
}
// NOLINTEND(readability-inconsistent-declaration-parameter-name)

static vlsys_ifconf off, nif, nifs[2] = {
    {0, "eth0", 0, "", 0, "192.168.0.10", "", "24", 0, 1, 0, {{"2001:db8::5", 64, ""}}, 1},
    {0, "eth1", 0, "", 0, "", "", "", 0, 0, 0, {}, 0}};
static vlsys_dns dns_off, dns = {"example.com", {"192.168.0.1", "2001:db8::1"}, "", 1};
static vlsys_gw4 gw4 = {"eth0", "192.168.0.1", 1};
static vlsys_gw6 gw6 = {"eth0", "2001:db8::1", 1};
static char text[VLSYS_HOSTNAME_SIZE];
static time_t when;

#define OPERATION(name, call) {#name, [] { return static_cast<long>(call); }}
static const struct Operation { const char *name; long (*run)(); } operations[] = {
    OPERATION(init, (started = vlsys_init()) != 0 ? started : vlsys_get_path_data(nullptr, 0)),
    OPERATION(set_netif, vlsys_set_netif("eth0", &off)),
    OPERATION(tool, __real_main()), OPERATION(tool_alone, __real_main()), // no surrogate parent
    OPERATION(set_timezone, vlsys_set_timezone("Etc/GMT")),
    OPERATION(set_ipv4_gateway, vlsys_set_ipv4_default_gateway(nullptr)),
    OPERATION(set_ipv6_gateway, vlsys_set_ipv6_default_gateway(nullptr)),
    OPERATION(set_dns, vlsys_set_dns_settings(&dns_off)),
    OPERATION(set_hostname, vlsys_set_hostname("rhx416-41600123")),
    OPERATION(get_timezone, vlsys_get_timezone(text, 20)),
    OPERATION(get_utc_offset, vlsys_get_utc_offset(text, 20)),
    OPERATION(get_netif, vlsys_get_netif("eth0", &nif)),
    OPERATION(get_ipv4_gateway, vlsys_get_ipv4_default_gateway2(&gw4)),
    OPERATION(get_ipv6_gateway, vlsys_get_ipv6_default_gateway2(&gw6)),
    OPERATION(get_dns, vlsys_get_dns_settings(&dns)),
    OPERATION(get_destination, vlsys_get_destination(text, 20)),
    OPERATION(serial_number, vlsys_get_serial_number(text, 20)),
    OPERATION(get_version, (vlsys_get_version(text, 20, &when), 0)),
    OPERATION(get_realpath, vlsys_realpath(text, "/etc/localtime", 99)),
    OPERATION(address_check, vlsys_address_check(nifs, gw4.addr, gw6.addr, &dns, text)),
    OPERATION(address_check2, vlsys_address_check2(nifs, 2, &gw4, &gw6, &dns, text)),
};
// clang-format on

// What an operation gives back.
struct Taken {
    long descriptors = 0, memory = blocks;
    mode_t mask = umask(0);
    sigset_t signals;
    Taken() {
        umask(mask);
        sigprocmask(SIG_BLOCK, nullptr, &signals);
        for (int fd = 0; fd < 32; fd++)
            descriptors += fcntl(fd, F_GETFD) != -1;
    }
};

extern "C" int __wrap_main(int /*argc*/, char **argv) {
    const Operation *operation = operations;
    while (strcmp(operation->name, argv[1]) != 0)
        operation++;
    // A forerunner, after which all is there that is made once and kept, by libc, too.
    setenv("VL_ROOT", "/run/other-root", 1);
    vlsys_init();
    operation->run();
    vlsys_exit();
    unsetenv("VL_ROOT");
    unsetenv("TZ");
    tzset();
    vlsys::avio_status = {};
    __fpurge(stdout);
    const Taken before;
    if (operation > &operations[0] && strncmp(operation->name, "tool", 4) != 0)
        vlsys_init();
    vlsys_log(LOG_INFO, "begin");
    requests = 0;
    failing = strtol(argv[2], nullptr, 10);
    const long result = operation->run();
    const long number = requests;
    failing = 0;
    vlsys_log(LOG_INFO, "end");
    vlsys_exit();
    const Taken after;
    printf("%ld %ld", result, number);
    return (after.descriptors > before.descriptors) + 2 * (after.memory > before.memory) +
           4 * (after.mask != before.mask) + 8 * (memcmp(&after.signals, &before.signals, 8) != 0);
}
