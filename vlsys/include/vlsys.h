/*
 * vlsys: the appliance's system settings.
 *
 * A program calls vlsys_init first and vlsys_exit last; every other operation is a plain
 * synchronous call on the caller's thread. The library has no threads and no locks: its few
 * process-wide states (paths, log, driver status table, primary interface) belong to one thread.
 *
 * Setters change configuration files only. What they write takes effect at the next network restart
 * or boot.
 *
 * Logging: every failed call is logged at LOG_ERR with a message that names the call, warnings at
 * LOG_WARNING, settings written and values read at LOG_INFO, traces at LOG_DEBUG. Each operation
 * says below what else it logs, and where it fails silently.
 *
 * System files are replaced whole: a reader sees the old file or the new one, mode 0644. Files
 * named below as "<root>/..." are found under the root path (VL_ROOT), all others at the path
 * given.
 */
#ifndef VLSYS_H
#define VLSYS_H

#include <stdarg.h>
#include <stddef.h>
#include <stdint.h>
#include <stdio.h>
#include <sys/types.h>
#include <syslog.h>
#include <time.h>

#ifdef __cplusplus
extern "C" {
#endif

#if defined(__GNUC__)
#define VLSYS_PRINTF(format_at, arguments_at)                                                      \
    __attribute__((__format__(__printf__, format_at, arguments_at)))
#define VLSYS_API __attribute__((visibility("default")))
#else
#define VLSYS_PRINTF(format_at, arguments_at)
#define VLSYS_API
#endif

/* ---- Capacities, in bytes, the terminating NUL included ------------------------------------- */

#define VLSYS_IFNAME_SIZE 16     /* interface name */
#define VLSYS_MAC_SIZE 18        /* "AA-BB-CC-DD-EE-FF" */
#define VLSYS_ADDR4_SIZE 16      /* IPv4 address, dotted decimal */
#define VLSYS_ADDR6_SIZE 46      /* IPv6 address, with its "%interface" suffix where it has one */
#define VLSYS_SCOPE_SIZE 8       /* "global", "site" or "link" */
#define VLSYS_HOSTNAME_SIZE 1025 /* host or domain name */
#define VLSYS_PATH_SIZE 4096     /* file path */

#define VLSYS_ADDR6_COUNT 4 /* IPv6 addresses of an interface record */
#define VLSYS_DNS_COUNT 3   /* name servers of a DNS record */

/* ---- Start-up and paths ---------------------------------------------------------------------- */

/*
 * Starts the library: takes the paths from the environment variables VL_ROOT (default ""),
 * VL_PREFIX
 * ("/usr") and VL_DATA ("/velmora"). A variable that is set but empty counts as set; the texts are
 * joined as they are, no separator is added. On a started library it changes nothing.
 *
 * Returns 0, or the negated errno when a path could not be allocated; the library is then not
 * started.
 * Logs version and build date at LOG_INFO; on a started library "initialized 1 times" at LOG_DEBUG.
 */
VLSYS_API int vlsys_init(void);

/* Stops the library: the next vlsys_init reads the environment again. Logs nothing. */
VLSYS_API void vlsys_exit(void);

/*
 * The root of the system tree; the root followed by the prefix; the root followed by the data path.
 * Copies the path into the buffer of `size` bytes, cut to size - 1 bytes and NUL-terminated.
 *
 * Returns the length of the whole path, also when it was cut or the buffer is null (nothing is
 * written); 0 when the size is 0 (nothing is written); -200 when the library is not started. Logs
 * nothing.
 */
VLSYS_API int64_t vlsys_get_path_root(char *buffer, size_t size);
VLSYS_API int64_t vlsys_get_path_prefix(char *buffer, size_t size);
VLSYS_API int64_t vlsys_get_path_data(char *buffer, size_t size);

/* ---- Bounded text ---------------------------------------------------------------------------- */

/*
 * Copies the source, cut to size - 1 bytes, and terminates it; writes nothing when the size is 0.
 * Returns the length of the source: the copy was cut when that is `size` or more.
 */
VLSYS_API size_t vlsys_strlcpy(char *destination, const char *source, size_t size);

/*
 * Appends the source to the text in a destination of `size` bytes, cut to the room left, and
 * terminates it. Writes nothing when the destination has no NUL within `size` bytes.
 * Returns the length of the text it tried to make, where an unterminated destination counts as
 * `size` bytes long: the text was cut when that is `size` or more.
 */
VLSYS_API size_t vlsys_strlcat(char *destination, const char *source, size_t size);

/* ---- Log ------------------------------------------------------------------------------------- */

/*
 * Logs a message at a priority of <syslog.h> (LOG_EMERG to LOG_DEBUG); "%m" in the format is the
 * text of errno. errno is left as it was; a null format is ignored.
 *
 * The message goes to the system log as "[<thread id>]: <message>"; the first one opens it with the
 * program's short name, LOG_PID and LOG_LOCAL0 unless vlsys_openlog came before. In
 * standard-output mode it goes there, after the prefix "<ident>[<process id>]: <<level>>: [<thread
 * id>]: " (none at LOG_DEBUG), and a line feed follows unless the format itself ends in one.
 */
VLSYS_API void vlsys_log(int priority, const char *format, ...) VLSYS_PRINTF(2, 3);
VLSYS_API void vlsys_vlog(int priority, const char *format, va_list arguments) VLSYS_PRINTF(2, 0);

/*
 * Opens the log under an identity text, which is not copied and must outlive it. The option and
 * facility are those of openlog; a negative facility selects standard-output mode instead, for the
 * rest of the process's life.
 */
VLSYS_API void vlsys_openlog(const char *ident, int option, int facility);

/* Closes the system log; in standard-output mode does nothing. Logging again opens it again. */
VLSYS_API void vlsys_closelog(void);

/*
 * Sets which priorities are logged: bit p (LOG_MASK(p)) lets priority p through. A mask of 0 leaves
 * the system log's mask as it is, and silences standard-output mode.
 * Returns the mask that was in force in the present mode (0xFF at first).
 */
VLSYS_API int vlsys_setlogmask(int mask);

/* ---- Time zone ------------------------------------------------------------------------------- */

VLSYS_API int vlsys_set_timezone(const char *zone);
VLSYS_API size_t vlsys_get_timezone(char *buffer, size_t size);
VLSYS_API size_t vlsys_get_utc_offset(char *buffer, size_t size);

/* ---- Network records ------------------------------------------------------------------------- */

/* How an interface, a default gateway or DNS is set. */
#define VLSYS_MODE_OFF 0
#define VLSYS_MODE_MANUAL 1 /* fixed values of the record */
#define VLSYS_MODE_DHCP 2
#define VLSYS_MODE_AUTO 3 /* IPv6 and the IPv6 gateway only: router advertisements */

/* One IPv6 address of an interface. */
typedef struct vlsys_addr6 {
    char addr[VLSYS_ADDR6_SIZE];  /* numeric text; a link-local address ends in "%interface" */
    uint32_t prefix;              /* prefix length, 0 to 128 */
    char scope[VLSYS_SCOPE_SIZE]; /* "global", "site" or "link" */
} vlsys_addr6;

/* One interface: a requested setting, or its present state. All zero is IPv4 Off and IPv6 Off. */
typedef struct vlsys_ifconf {
    uint8_t index;                        /* interface index, low 8 bits */
    char name[VLSYS_IFNAME_SIZE];         /* interface name */
    uint8_t lower_up;                     /* 1 when the link has carrier */
    char mac[VLSYS_MAC_SIZE];             /* upper-case hexadecimal pairs joined by hyphens */
    uint8_t up;                           /* 1 when the interface has an IPv4 address and is up */
    char addr[VLSYS_ADDR4_SIZE];          /* IPv4 address */
    char broadaddr[VLSYS_ADDR4_SIZE];     /* IPv4 broadcast address */
    char netmask[VLSYS_ADDR4_SIZE];       /* IPv4 netmask, dotted decimal */
    uint8_t prefix;                       /* IPv4 prefix length, 0 to 32 */
    uint32_t ipv4_mode;                   /* VLSYS_MODE_OFF, _MANUAL, any other value DHCP */
    uint8_t has_ipv6;                     /* 1 when the interface has an IPv6 address */
    vlsys_addr6 addr6[VLSYS_ADDR6_COUNT]; /* 0: first global or site-local address, 1: link-local,
                                             2 and 3: further global addresses */
    uint32_t ipv6_mode;                   /* VLSYS_MODE_OFF, _MANUAL, _DHCP, any other value Auto */
} vlsys_ifconf;

/* The unit's name resolution. All zero is DNS Off. */
typedef struct vlsys_dns {
    char domain[VLSYS_HOSTNAME_SIZE];               /* search domain */
    char server[VLSYS_DNS_COUNT][VLSYS_ADDR6_SIZE]; /* IPv4 or IPv6 text; setters use 0 and 1 */
    char iface[VLSYS_IFNAME_SIZE];                  /* interface that carries the DNS settings */
    uint32_t mode;                                  /* VLSYS_MODE_OFF, _DHCP, any other Manual */
} vlsys_dns;

/* The IPv4 default gateway. */
typedef struct vlsys_gw4 {
    char iface[VLSYS_IFNAME_SIZE]; /* interface through which it is reached, or empty */
    char addr[VLSYS_ADDR4_SIZE];   /* non-empty: a fixed gateway */
    uint32_t mode;                 /* VLSYS_MODE_OFF, _MANUAL, _DHCP */
} vlsys_gw4;

/* The IPv6 default gateway. */
typedef struct vlsys_gw6 {
    char iface[VLSYS_IFNAME_SIZE]; /* interface through which it is reached, or empty */
    char addr[VLSYS_ADDR6_SIZE];   /* non-empty: a fixed gateway */
    uint32_t mode;                 /* VLSYS_MODE_OFF, _MANUAL, _DHCP, _AUTO */
} vlsys_gw6;

/* ---- Interfaces ------------------------------------------------------------------------------ */

VLSYS_API int vlsys_get_ifname_list(char (**pifn)[VLSYS_IFNAME_SIZE]);
VLSYS_API int vlsys_set_netif(const char *name, const vlsys_ifconf *conf);

/* ---- DNS ------------------------------------------------------------------------------------- */

VLSYS_API int vlsys_set_dns_settings(const vlsys_dns *dns);
VLSYS_API int vlsys_get_dns_settings(vlsys_dns *dns);

/* ---- Default gateways ------------------------------------------------------------------------ */

VLSYS_API int vlsys_set_ipv4_default_gateway(const char *text);
VLSYS_API int vlsys_set_ipv4_default_gateway2(const vlsys_gw4 *gw);
VLSYS_API int vlsys_set_ipv6_default_gateway(const char *text);
VLSYS_API int vlsys_set_ipv6_default_gateway2(const vlsys_gw6 *gw);

/* ---- Host name ------------------------------------------------------------------------------- */

VLSYS_API int vlsys_set_hostname(const char *name);
VLSYS_API int vlsys_get_hostname(char *name);
VLSYS_API int vlsys_set_hostname_immediately(const char *name);

/* ---- Processes ------------------------------------------------------------------------------- */

VLSYS_API pid_t vlsys_spawn_direct(const char *command);
VLSYS_API int vlsys_exit_status_text(char *buffer, size_t size, pid_t pid, const char *name,
                                     int status);
VLSYS_API int vlsys_surrogate_connect(int quiet, const char *service);
VLSYS_API int vlsys_system(const char *command);
VLSYS_API int vlsys_spawn(const char *command);
VLSYS_API FILE *vlsys_popen(const char *command);
VLSYS_API int vlsys_pclose(FILE *stream);

/* ---- Video I/O driver ------------------------------------------------------------------------ */

VLSYS_API int vlsys_avio_read_config(void);
VLSYS_API int vlsys_avio_get_config(unsigned int device_id);
VLSYS_API int vlsys_avio_scan_alive(void);
VLSYS_API int vlsys_avio_wait_ready(void);

/* ---- Product information --------------------------------------------------------------------- */

VLSYS_API int vlsys_get_destination(char *buffer, size_t size);
VLSYS_API int vlsys_get_fps(void);
VLSYS_API int vlsys_get_hdcp_capability(void);
VLSYS_API int vlsys_get_serial_number(char *buffer, size_t size);
VLSYS_API void vlsys_get_version(char *buffer, size_t size, time_t *time);

/* ---- Files and directories ------------------------------------------------------------------- */

VLSYS_API int vlsys_fc_cache(void);
VLSYS_API int vlsys_mkdir(const char *path, unsigned int mode);
VLSYS_API int vlsys_remove_tree(const char *path);
VLSYS_API int64_t vlsys_realpath(char *buffer, const char *path, size_t size);
VLSYS_API int64_t vlsys_get_block_device_size(const char *path);

#ifdef __cplusplus
}
#endif

#endif
