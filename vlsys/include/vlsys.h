/*
 * vlsys: the appliance's system settings.
 *
 * A program calls vlsys_init first and vlsys_exit last. Every other operation is a plain
 * synchronous call on the caller's thread.
 *
 * Threads: the library has no threads and no locks. Its process-wide state (paths, log, driver
 * status table) belongs to one thread, and so does every operation that is not said to run on any
 * thread. Do not cancel a thread (pthread_cancel) in an operation: its locks and temporary files
 * would stay. An operation needs up to 32 KiB of stack.
 *
 * Setters change configuration files only, unless they say otherwise. What they write takes effect
 * at the next network restart or boot. A setter waits until each file that it rewrites has reached
 * the disk. A reader of a file sees the old file or the new one, whole, mode 0644. A symbolic link
 * in a file's place is replaced by a file; the file that it points to is read and stays as it is.
 * Links among the directories above are followed.
 *
 * A setter that rewrites a sysconfig file (but for the clock file) or the sysctl drop-in,
 * /etc/sysctl.d/velmora, drops comments and empty lines, changes only the first line of a key, and
 * makes a missing file and its directories (mode 0755, less the umask). When two setters rewrite
 * one file at once, the later rename wins, and what the other one wrote is lost.
 *
 * Files named "<root>/..." are found under the root path (VL_ROOT, see vlsys_init), all others at
 * the path given.
 *
 * Results: a file that opens and cannot be read is a failure, a directory in its place is an empty
 * file. EFAULT means a null argument; nothing was done, and nothing is logged.
 *
 * Logging: every failed call is logged at LOG_ERR with a message that names the call, warnings at
 * LOG_WARNING, settings written and values read at LOG_INFO, traces at LOG_DEBUG. Each operation
 * says what else it logs, and which failures it does not log ("silent").
 *
 * Blocking: each operation says what it waits for, and how long at most. Accesses to files take
 * their time too, and each message can wait for the log (see vlsys_log).
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

/* ---- Version --------------------------------------------------------------------------------- */

/* The version of this header. A program built with it runs with every later library of the same
 * major version. */
#define VLSYS_VERSION_MAJOR 1
#define VLSYS_VERSION_MINOR 1
#define VLSYS_VERSION "1.1.0"

/* ---- Start-up and paths ---------------------------------------------------------------------- */

/*
 * Starts the library. It takes the paths from the environment variables VL_ROOT (default ""),
 * VL_PREFIX ("/usr") and VL_DATA ("/velmora"); a variable that is set but empty counts as set. When
 * the library is already started, nothing changes. A standard descriptor (0 to 2) that is closed is
 * opened on /dev/null, so that no file or socket of the library gets its number; vlsys_exit leaves
 * it open.
 *
 * A relative root is looked up from the working directory at each call. A system path over 4095
 * bytes is cut; the setters then fail with ENAMETOOLONG. Before vlsys_init, and after vlsys_exit,
 * the root path is empty: a setter then changes the running system's own files. While vlsys_init or
 * vlsys_exit runs, no other operation may run.
 * Returns 0, or the negated errno when there is no memory for a path; the library is then not
 * started.
 * Logs the version and the build date at LOG_INFO; on a started library "initialized 1 times" at
 * LOG_DEBUG.
 */
VLSYS_API int vlsys_init(void);

/* Stops the library. The next vlsys_init reads the environment again. Logs nothing. */
VLSYS_API void vlsys_exit(void);

/*
 * Copies a path into the buffer of `size` bytes, cut to size - 1 bytes and NUL-terminated: the root
 * of the system tree; the root followed by the prefix; the root followed by the data path. No
 * separator is added. May run on any thread.
 * Returns
 *   the length of the whole path, also when it was cut, or the buffer is null (nothing is written);
 *   0 when the size is 0 (nothing is written);
 *   VLSYS_NOT_STARTED when the library is not started.
 * Logs nothing.
 */
#define VLSYS_NOT_STARTED (-200)
VLSYS_API int64_t vlsys_get_path_root(char *buffer, size_t size);
VLSYS_API int64_t vlsys_get_path_prefix(char *buffer, size_t size);
VLSYS_API int64_t vlsys_get_path_data(char *buffer, size_t size);

/* ---- Bounded text ---------------------------------------------------------------------------- */

/*
 * Copies the source into a destination of `size` bytes, cut to size - 1 bytes and NUL-terminated.
 * Writes nothing when the size is 0. May run on any thread.
 * Returns the length of the source. The copy was cut when that is `size` or more.
 */
VLSYS_API size_t vlsys_strlcpy(char *destination, const char *source, size_t size);

/*
 * Appends the source to the text in a destination of `size` bytes, cut to the room left and
 * NUL-terminated. Writes nothing when the destination has no NUL within `size` bytes. May run on
 * any thread.
 * Returns the length of the whole text; a destination without a NUL counts as `size` bytes long.
 * The text was cut when that is `size` or more.
 */
VLSYS_API size_t vlsys_strlcat(char *destination, const char *source, size_t size);

/* ---- Log ------------------------------------------------------------------------------------- */

/*
 * Logs a message at a priority of <syslog.h> (LOG_EMERG to LOG_DEBUG). "%m" in the format is the
 * text of errno. errno stays as it was. A null format is ignored. May run on any thread once the
 * log is open.
 *
 * The message goes to the system log as "[<thread id>]: <message>". Without vlsys_openlog, the
 * first message opens it with the program's short name, LOG_PID and LOG_LOCAL0. In standard-output
 * mode the message goes to standard output, after the prefix "<ident>[<process id>]: <<level>>:
 * [<thread id>]: " (no prefix at LOG_DEBUG). A line feed follows unless the format ends in one. The
 * line is whole, whatever other threads print.
 * Blocks, without a limit, while the log daemon or the reader of standard output takes nothing.
 */
VLSYS_API void vlsys_log(int priority, const char *format, ...) VLSYS_PRINTF(2, 3);
VLSYS_API void vlsys_vlog(int priority, const char *format, va_list arguments) VLSYS_PRINTF(2, 0);

/*
 * Opens the log under an identity text, which must not be null. The text is not copied and must
 * outlive the log. Option and facility are those of openlog. A negative facility selects
 * standard-output mode, for the rest of the process's life.
 */
VLSYS_API void vlsys_openlog(const char *ident, int option, int facility);

/*
 * Closes the system log. The next message opens it again, under the program's short name. In
 * standard-output mode it does nothing. A program that closes descriptors which it did not open
 * calls this first: else the next file or connection gets the log's number, and the messages.
 */
VLSYS_API void vlsys_closelog(void);

/*
 * Sets which priorities are logged: bit p (LOG_MASK(p)) lets priority p through. A mask of 0 leaves
 * the system log's mask as it is, and silences standard-output mode.
 * Returns the mask that was in force in the present mode (0xFF at first).
 */
VLSYS_API int vlsys_setlogmask(int mask);

/* ---- Time zone ------------------------------------------------------------------------------- */

/*
 * Sets the time zone of the system, then of the calling process. The zone is a path below
 * /usr/share/zoneinfo/, such as "Asia/Shanghai". It must not begin with a slash (TZ would then name
 * another file). The steps:
 * - Check that the zone file is a compiled one.
 * - Make /etc/localtime a symbolic link to it, by way of "localtime.new" beside it.
 * - Rewrite the clock file, which must exist, by way of a temporary beside it. Every line that has
 *   "ZONE=" anywhere becomes ZONE="<zone>"; when there is none, the line is appended. Other lines
 *   and comments stay.
 * - Set TZ, overwriting it, and call tzset.
 *
 * The clock file is read in pieces of at most 79 bytes: a longer line counts as several, and a line
 * put in the place of one is cut to 79 bytes. A zone that begins with a double quote is written
 * without further quotes. Two calls at once on one system tree disturb each other. No other thread
 * may use the environment during the call.
 *
 * The first failure ends the call; what was done before stays done.
 * Returns
 *   0  set, also when the clock file's mode could not be set to 0644 (logged) or TZ not (silent);
 *   -EFAULT  null zone;
 *   -ENOENT  empty zone (silent), no clock file, no zone file, or one without "TZif" at its start;
 *   -ENAMETOOLONG  the zone file's path is over 4095 bytes;
 *   -ELOOP  the zone is a link to /etc/localtime, or is that file;
 *   -EINVAL  a shell that reads the clock file could run the zone: it has a "$", a backquote, a
 *   backslash, a line feed, or a double quote other than its first and last character;
 *   -EIO  zone file of fewer than 4 bytes;
 *   other negated errno  of the step that failed.
 * After a failure in the zone file or the link, /etc/localtime is what it was. After a failure in
 * the clock file (opened, read, written, flushed or closed) the link is the new one, the clock file
 * is what it was, and TZ is not set.
 * Writes <root>/etc/localtime and <root>/etc/sysconfig/clock.
 */
VLSYS_API int vlsys_set_timezone(const char *zone);

/*
 * Copies the zone of the clock file into the buffer of `size` bytes, as vlsys_strlcpy does. The
 * zone is what stands between ZONE=" and the last double quote, in the first line that has a
 * ZONE=". Without another quote it goes to the end of the line, line feed included. A zone without
 * quotes is not found. A line over 79 bytes counts as several. May run on any thread.
 * Returns the length of the whole zone; 0, with the buffer unchanged, when the buffer is null, the
 * file has no zone, or it cannot be opened or read (logged).
 * Reads <root>/etc/sysconfig/clock.
 */
VLSYS_API size_t vlsys_get_timezone(char *buffer, size_t size);

/*
 * Writes the present offset of local time from UTC, such as "+0800", into a buffer of 6 bytes or
 * more. The zone is the one that the process knows: one that another process has set since counts
 * after tzset alone. May run on any thread.
 * Returns its length, 5; 0 when the buffer is null or too small (its content is then unspecified),
 * or when the local time is not known (logged).
 */
VLSYS_API size_t vlsys_get_utc_offset(char *buffer, size_t size);

/* ---- Network records ------------------------------------------------------------------------- */

/*
 * The setters of the next sections write the texts of these records as they are, without quotes,
 * into files that scripts run as root. They check nothing: "$(reboot)" in a field that is written
 * will be run. Let a validator check a setting first, and leave empty the fields that it does not
 * read (see "Validation of a network setting"), or use vlsys_set_network.
 *
 * Where a file has a key more than once, a setter changes the first line and the others stay; in a
 * shell the last one wins. A reader stops at a line without a key, such as "=" or one that begins
 * with a NUL; a setter keeps that line and may write behind it, where no reader looks. The name of
 * /etc/sysctl.d/velmora does not end in ".conf": scripts that take every file of the directory read
 * it, others do not.
 *
 * An interface exists when the kernel has one of that very name; an alternative name does not
 * count. In a sysctl key, a dot in the interface's name is written "/".
 */

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

/*
 * Lists the names of the unit's interfaces, all but "lo" and "virbr*", in natural order (eth2
 * before eth10). When there are any and `pifn` is not null, *pifn receives an array of them, which
 * the caller frees with free. Otherwise *pifn is not written.
 * Returns their number; 0 also when the kernel gives no list, or when there is no memory for the
 * array (*pifn is then null).
 */
VLSYS_API int vlsys_get_ifname_list(char (**pifn)[VLSYS_IFNAME_SIZE]);

/*
 * Sets how the interface gets its addresses: first the keys of the interface's file, then its IPv6
 * switches, lines "net.ipv6.conf.<name>.<switch> = <0 or 1>" of the sysctl drop-in. Of the record
 * it takes ipv4_mode, in Manual mode with addr and netmask (prefix is only logged), and ipv6_mode,
 * in Manual mode with addr and prefix of addr6[0].
 *
 * An interface's file that this or another setter makes has no DEVICE: the network scripts do not
 * bring the interface up by it.
 *
 * Keys and switches ("-": removed; "kept": as it was). GATEWAY, PREFIX, UUID, HWADDR,
 * IPV6FORWARDING and IPV6_ROUTER are always removed, NM_CONTROLLED is always "no".
 *
 *   IPv4             Off        Manual       DHCP
 *   ONBOOT           yes        yes          yes
 *   BOOTPROTO        none       none         dhcp
 *   IPADDR           -          addr         -
 *   NETMASK          -          netmask      -
 *
 *   IPv6             Off        Manual       DHCP       Auto
 *   IPV6INIT         no         yes          yes        yes
 *   IPV6_AUTOCONF    no         no           yes        yes
 *   IPV6ADDR         -          addr/prefix  -          -
 *   DHCPV6C          -          -            yes        -
 *
 *   Switches         Off        Manual       DHCP       Auto
 *   disable_ipv6     1          0            0          0
 *   autoconf         kept       0            1          1
 *   accept_ra_pinfo  kept       0            1          1
 *
 * When both are Off, ONBOOT is "no", and BOOTPROTO, IPADDR and NETMASK are kept.
 * Returns 0, or
 *   EFAULT  null name or record;
 *   ENXIO  no such interface (silent; no file is touched);
 *   other positive errno  of the kernel when it could not be asked for the interface, such as
 *      EMFILE (no file is touched), or of the rewrite that failed. When the first file's rewrite
 *      fails, the second file is not touched.
 * Logs at LOG_INFO "IPv4 (<name>): " and "IPv6 (<name>): ", each with "OFF", the address and prefix
 * length, "DHCP" or "AUTO".
 * Writes <root>/etc/sysconfig/network-scripts/ifcfg-<name> and <root>/etc/sysctl.d/velmora.
 */
VLSYS_API int vlsys_set_netif(const char *name, const vlsys_ifconf *conf);

/* ---- DNS ------------------------------------------------------------------------------------- */

/*
 * Sets the unit's name resolution: four keys in the file of every interface, in natural order ("-":
 * removed). "Manual" and "DHCP" are the columns of the interface named in `iface`; every other
 * interface has that of "Off". An `iface` that names no interface of the unit is no failure.
 *
 *   Key      Off  Manual                          DHCP
 *   PEERDNS  no   yes                             yes
 *   DOMAIN   -    domain, even when empty         -
 *   DNS1     -    server[0]                       -
 *   DNS2     -    server[1], removed when empty   -
 *
 * In Manual mode, on an interface with DHCP, the servers of the lease stay in force, behind these.
 * Returns 0, or
 *   EFAULT  null record;
 *   EINVAL  the mode is not Off and `iface` is empty (no file is touched), or the mode is Manual
 *      for one of the unit's interfaces and server[0] is empty (silent);
 *   ENXIO  the unit has no interface (silent), or the kernel gives no list (logged);
 *   other positive errno  of the rewrite that failed ("param: failed" is logged too).
 * After a failure the files of earlier interfaces are rewritten.
 * Logs the setting of the DNS interface at LOG_INFO, each path and every other interface at
 * LOG_DEBUG.
 * Writes <root>/etc/sysconfig/network-scripts/ifcfg-<name>.
 */
VLSYS_API int vlsys_set_dns_settings(const vlsys_dns *dns);

/*
 * Reads the name resolution into the record, which must not be null.
 * - `domain` and up to three servers are those of /etc/resolv.conf. Of several "domain" and
 *   "search" lines the last counts, of several domains in it the first. A server that does not fit
 *   its field is passed over: cut, it would be another. A line of blanks alone ends the reading.
 * - The mode is that of the interfaces' files: Manual when one has DOMAIN, else Off when all have
 *   PEERDNS=no, else DHCP. Without an interface it is Off.
 * - `iface` is left empty. Without /etc/resolv.conf the whole record is zero (Off).
 * Returns 0, or the positive errno of a file that cannot be opened or read. When that is
 * /etc/resolv.conf the record is zero, else it has what was read before.
 * Reads /etc/resolv.conf and /etc/sysconfig/network-scripts/ifcfg-<name>.
 */
VLSYS_API int vlsys_get_dns_settings(vlsys_dns *dns);

/* ---- Default gateways ------------------------------------------------------------------------ */

/*
 * Sets the IPv4 default gateway. GATEWAY of the network file becomes `addr`, whatever the mode; it
 * is removed when `addr` is empty. Then, in the file of every interface, in natural order, METRIC,
 * GATEWAY and GATEWAYDEV are removed, and DEFROUTE is removed when the interface may have a default
 * route of its own, else "no". When `addr` is not empty or the mode is Manual, every interface may;
 * otherwise only the one named in `iface`.
 *
 * A fixed gateway comes into force when an interface's subnet holds it; outside the subnet of a
 * lease there is none.
 * Returns 0; EFAULT for a null record; else the positive errno of the rewrite that failed, with
 * earlier files rewritten. When the kernel gives no list of interfaces (logged), only the network
 * file is rewritten, and the result is 0.
 * Logs "IPv4 GW " and the address, "none" (Off, Manual) or "dhcp" at LOG_INFO, each interface's
 * DEFROUTE at LOG_DEBUG.
 * Writes <root>/etc/sysconfig/network and <root>/etc/sysconfig/network-scripts/ifcfg-<name>.
 */
VLSYS_API int vlsys_set_ipv4_default_gateway2(const vlsys_gw4 *gw);

/*
 * Does the same for a gateway address alone: Manual with that address, cut to 15 characters. When
 * the text is null or empty: DHCP on no interface.
 */
VLSYS_API int vlsys_set_ipv4_default_gateway(const char *text);

/*
 * Sets the IPv6 default gateway. IPV6_DEFAULTGW of the network file becomes `addr`, whatever the
 * mode; it is removed when `addr` is empty. Then one rewrite of the sysctl drop-in sets the line
 * "net.ipv6.conf.<name>.accept_ra_defrtr = <0 or 1>" of every interface: 1 when the interface may
 * take a default route from router advertisements, by the rule of vlsys_set_ipv4_default_gateway2.
 *
 * On an interface that learns its prefix, prefer a fixed gateway of the form "fe80::1%eth0": the
 * scripts set the gateway before the prefix is there, and no other can be reached then.
 * Returns 0; EFAULT for a null record; else the positive errno of the step that failed: the network
 * file (the drop-in is then not touched), memory, or the drop-in. When the kernel gives no list of
 * interfaces (logged), only the network file is rewritten, and the result is 0.
 * Logs at LOG_INFO "IPv6 GW " and the address, "none" (Off, Manual), "dhcp" or "auto", and
 * "IPv6 GW auto (<name>)" for each interface set to 1; at LOG_DEBUG the number of interfaces and
 * the lines.
 * Writes <root>/etc/sysconfig/network and <root>/etc/sysctl.d/velmora.
 */
VLSYS_API int vlsys_set_ipv6_default_gateway2(const vlsys_gw6 *gw);

/*
 * Does the same for a gateway address alone: Manual with that address, cut to 45 characters. When
 * the text is null or empty: Auto on no interface.
 */
VLSYS_API int vlsys_set_ipv6_default_gateway(const char *text);

/* ---- Host name ------------------------------------------------------------------------------- */

/*
 * Sets HOSTNAME of the network file: the name, cut to 1025 characters, or "localhost" when it is
 * null or empty. The running host name stays as it is. When the name is "localhost", a DHCP lease
 * can set another host name.
 * Returns 0, or the positive errno of the rewrite that failed.
 * Logs "hostname: <name>" at LOG_INFO.
 * Writes <root>/etc/sysconfig/network.
 */
VLSYS_API int vlsys_set_hostname(const char *name);

/*
 * Reads the running host name into a buffer of VLSYS_HOSTNAME_SIZE bytes.
 * Returns 0; EFAULT for a null buffer; else the positive errno (silent).
 */
VLSYS_API int vlsys_get_hostname(char *name);

/*
 * Sets the host name in the network file, as vlsys_set_hostname does, and then the running one. The
 * name must not be null. It has at most 64 characters: labels joined by dots, of up to 63 letters,
 * digits and hyphens each. A hyphen stands between two letters or digits; one dot may end the name.
 * The empty name is not refused: the file then has "localhost".
 * Returns
 *   0  set, or it is the running host name already. Then nothing is written: a name that
 *      vlsys_set_hostname wrote before stays in the file (logged at LOG_INFO);
 *   VLSYS_HOSTNAME_REFUSED  the name breaks these rules;
 *   positive errno  of the step that failed. When the kernel refuses the name, the file has it.
 * Writes <root>/etc/sysconfig/network.
 */
#define VLSYS_HOSTNAME_REFUSED 420
VLSYS_API int vlsys_set_hostname_immediately(const char *name);

/* ---- Network state --------------------------------------------------------------------------- */

/*
 * Besides 0 and the results named at each, these readers return EFAULT for a null argument, or the
 * positive errno or negative resolver code (EAI_*, see gai_strerror) of an address that could not
 * be converted to text.
 */

/*
 * Reads the present state of an interface into the record. Start with a record of zeros: `up`,
 * has_ipv6 and addr6 are cleared first, but any other field that the interface does not fill keeps
 * its value.
 * - Link, addresses and flags are the kernel's, in the kernel's order. Of several IPv4 addresses
 *   (aliases such as eth0:1) the last one stays. broadaddr is filled when the interface can
 *   broadcast; for an address without a broadcast address it is the address itself.
 * - addr6: a link-local address goes to entry 1, a site-local one to entry 0. Any other goes to the
 *   first empty one of the entries 0, 2 and 3; when none is empty it replaces entry 3.
 * - The kernel's entries are found by the beginning of their names: "eth1" shows the addresses of
 *   eth10 too.
 * - ipv4_mode is Off when the interface's file has no ONBOOT=yes. With BOOTPROTO=none (and for
 *   "lo") it is Manual, or Off without IPADDR. Else it is DHCP. The file of "virbr*" is not read:
 *   IPv4 is Off.
 * - ipv6_mode is DHCP when the file has DHCPV6C=yes, else Manual when it has IPV6ADDR, else Auto
 *   when the kernel's switches have IPv6 and autoconf on, else Off.
 * - The file is not read as a shell reads it: single quotes, blanks and comments count as part of a
 *   value, so ONBOOT='yes' is no ONBOOT=yes. Double quotes around a value are removed.
 * Returns 0, or
 *   ENXIO  no such interface (silent; nothing is written);
 *   other positive errno  of the look-up, such as EMFILE without a free descriptor, or of the
 *      kernel's list (nothing is written); of a switch file that can be opened but not read (the
 *      modes are not filled); of an interface's file that cannot be opened or read (ipv4_mode is
 *      not filled, ipv6_mode goes by the switches alone).
 * When an address could not be converted, name, index and the modes are not filled, nor what comes
 * after it. When the interface vanishes during the call, name and index are not filled.
 * Blocks 11 seconds when a switch file is missing; ipv6_mode is then Off unless the file sets it.
 * Reads /etc/sysconfig/network-scripts/ifcfg-<ifname> and /proc/sys/net/ipv6/conf/<ifname>/.
 */
VLSYS_API int vlsys_get_netif(const char *ifname, vlsys_ifconf *nif);

/*
 * Reads the IPv6 default gateway in force: the first route to :: that is up and has a gateway.
 * `addr` is its address, with "%interface" when it is link-local, and `iface` its interface.
 * Without such a route the record is empty (Off). The mode goes by the kernel's count of references
 * to the route: Manual for exactly one, else Auto. (Recent kernels count one for a learnt route
 * too, and one more for a use.) A route stays up when its link loses carrier.
 * Returns 0 also without a route; the positive errno of the table that cannot be opened (the record
 * stays as it was) or read (the record is Off). When an address could not be converted the record
 * is Off.
 * Reads /proc/net/ipv6_route.
 */
VLSYS_API int vlsys_get_ipv6_default_gateway2(vlsys_gw6 *gw);

/*
 * Reads the IPv4 default gateway in force, and how it is configured.
 * - `addr` and `iface` are those of the first route to 0.0.0.0/0, empty when there is none. The
 *   address "0.0.0.0" is a route without a gateway, with the interface "*" one that rejects
 *   ("unreachable").
 * - The mode is Manual when the network file has a line that begins with "GATEWAY="; else DHCP when
 *   the file of an interface has a line that begins with "BOOTPROTO=dhcp" and none that begins with
 *   "DEFROUTE=no"; else Off.
 * Returns
 *   0  also without a route;
 *   positive errno  of the table when it cannot be opened (the record stays as it was) or read
 *      (`addr` and `iface` are empty, the mode is read), or of another file that cannot be opened
 *      or read (the gateway is read, and the mode as far as it was found).
 * When an address could not be converted, `addr` and `iface` are empty and the mode is read.
 * Reads /proc/net/route, <root>/etc/sysconfig/network and
 * <root>/etc/sysconfig/network-scripts/ifcfg-<name>.
 */
VLSYS_API int vlsys_get_ipv4_default_gateway2(vlsys_gw4 *gw);

/*
 * Read the gateway's address alone, into a buffer of VLSYS_ADDR6_SIZE or VLSYS_ADDR4_SIZE bytes. It
 * is empty without a gateway, and on failure. They return what the reader of the record returns.
 */
VLSYS_API int vlsys_get_ipv6_default_gateway(char *text);
VLSYS_API int vlsys_get_ipv4_default_gateway(char *text);

/* ---- Network restart ------------------------------------------------------------------------- */

/*
 * Puts into force what the setters wrote, and logs the resulting state. The steps:
 * - Set the running host name to the HOSTNAME of the network file. It becomes empty when the file
 *   has none or cannot be opened (logged).
 * - Make sure that vlsys_get_dns_settings succeeds.
 * - Remove /etc/resolv.conf, which the network scripts write anew. A failure is logged at
 *   LOG_WARNING and ends nothing.
 * - Run "service network restart" with vlsys_system.
 * - Log the report. Failures in it are logged and do not change the result.
 * Returns
 *   0 to 255  the exit code of the restart command;
 *   256  the restart command did not exit normally;
 *   positive errno  the DNS settings cannot be read. Only the host name is set;
 *   negated errno  the network file can be opened but not read, or the host name cannot be set.
 *      Nothing is done;
 *   negative result of vlsys_system  the restart command could not be run. There is no report.
 * Some numbers have two meanings: -1 is also the negated EPERM, and a positive errno is also an
 * exit code. The log tells which it is.
 *
 * The report, at LOG_INFO, shows the first two interfaces of vlsys_get_ifname_list. A line has at
 * most 159 characters, the rest is cut. The mode line is described at vlsys_address_check2.
 *   vlsys_network_restart: exited (service network restart), status: 0
 *   hostname: rhx416-41600123
 *   mode: MD_AM_M4_
 *   eth0: link up, MAC: 02-00-00-00-00-01
 *   192.168.1.10/24
 *   eth1: no carrier, MAC: 02-00-00-00-00-02
 *   192.168.2.20/24, fd00::20/64, fe80::2%eth1/64
 *   gw4 192.168.1.1 (eth0) [static], gw6 [off]
 *   DNS domain: example.com  server: 192.168.1.1
 * An interface's second line has IPv6 addresses alone when IPv4 is not up; without any address
 * there is no second line. A gateway's mode is "static", "dhcp", "auto" or "off".
 * Blocks until the command has ended. After exit code 0 it waits up to 10 seconds more, whatever
 * signals arrive, for each shown interface whose IPv6 mode is not Off and that has no IPv6 address
 * yet (each second is logged at LOG_DEBUG). Such is also an interface that is off while the kernel
 * has IPv6 and autoconf on for it. Each query of an interface can block like vlsys_get_netif.
 * Reads /etc/sysconfig/network, and what the readers of the state read.
 */
VLSYS_API int vlsys_network_restart(void);

/* ---- Processes ------------------------------------------------------------------------------- */

/*
 * Starts "/bin/sh -c <command>" as a child of the caller and returns at once. The caller reaps the
 * child. A child that could not execute the shell exits with 127. Not for two threads at once.
 *
 * The child has the caller's dispositions of SIGINT and SIGQUIT and its signal mask. While the
 * child is made, the parent ignores the two signals and blocks SIGCHLD; all three are put back
 * before the return. Standard output is flushed first. A process with other threads can call it
 * too: between fork and exec the child neither logs nor takes memory or a lock.
 * Returns the process id; -1 with errno set when a signal could not be set or the child not made
 * (logged), or when the command is null (EFAULT).
 * Logs at LOG_DEBUG the command, before the child is made, and the process id.
 */
VLSYS_API pid_t vlsys_spawn_direct(const char *command);

/*
 * Describes a wait status (that of waitpid, system or vlsys_system) in one line, cut to size - 1
 * bytes and NUL-terminated:
 *   exited (<name>), status: <exit code>
 *   exited (<name>), abnormally, signaled: <signal>
 *   exited (<name>), abnormally                        (stopped, not ended)
 * When the process id is not 0, " pid: <pid>" follows the first word. A null name shows as "?". May
 * run on any thread.
 * Returns the exit code (0 to 255) of a normal exit, 256 for any other status. Logs nothing.
 */
VLSYS_API int vlsys_exit_status_text(char *buffer, size_t size, pid_t pid, const char *name,
                                     int status);

/*
 * The surrogate parent is a local service that runs shell commands for others. It takes the
 * caller's working directory and the command, and answers with a number. vlsys_system, vlsys_spawn
 * and vlsys_popen open one connection each, to TCP port 12865 of 127.0.0.1, and share these rules:
 * - When the connection cannot be made (the reason is logged at LOG_ERR, the fallback at
 *   LOG_WARNING), the command is run directly, as each operation says. Once connected there is no
 *   fallback: the operation fails, and errno says why. When vlsys_system and vlsys_spawn succeed,
 *   errno stays as it was.
 * - A null command fails with EFAULT. A working directory or command with a line feed fails with
 *   EINVAL, since each is one line of the request. In both cases nothing is sent or run. A command
 *   that is run directly may have line feeds.
 * - A request that could only be sent in part is not run.
 * - What ends in " &" or " |" is a request of another kind to the surrogate parent: vlsys_system of
 *   "daemon &" returns a process id in place of a wait status, and of "true |" runs nothing. Use
 *   vlsys_spawn and vlsys_popen.
 * - The answer is what the first receive gives, at most 8191 bytes. It is taken as the truth.
 * - A command that is run directly is a child of the caller. When SIGCHLD is ignored, or a handler
 *   of the caller reaps every child, its end is not known: vlsys_system and vlsys_pclose then
 *   return -1 (ECHILD), and vlsys_get_serial_number VLSYS_SERIAL_PCLOSE_FAILED, although the
 *   command ran.
 * - Logs, when connected: the working directory at LOG_DEBUG and the command at LOG_INFO
 *   (vlsys_popen: the whole request at LOG_DEBUG). An answer that is missing or is no number is
 *   silent. A command that is run directly is logged only by vlsys_spawn_direct.
 * - Blocks until the surrogate parent takes the connection (up to about 2 minutes, by the kernel's
 *   settings; then the command is run directly), and then, without a limit, until it takes the
 *   request and answers. A signal that arrives meanwhile cuts nothing short.
 * - When the surrogate parent goes away, no signal is raised. Programs that the process executes do
 *   not inherit the connection.
 * - They may run on any thread, vlsys_spawn on one at a time. The working directory is that of the
 *   process.
 */
#define VLSYS_SURROGATE_PORT "12865"

/*
 * Connects to a TCP service of 127.0.0.1, given as a decimal port number.
 * Returns the connected socket, close-on-exec, which the caller closes; -1 on failure. When `quiet`
 * is not 0, a refused connection gives 0 and is silent. (Keep descriptor 0 open, or a socket could
 * get that number.)
 * Blocks up to about 2 minutes, by the kernel's settings, while the service takes no connection.
 */
VLSYS_API int vlsys_surrogate_connect(int quiet, const char *service);

/*
 * Runs a shell command and waits for its end, without a limit. Directly: system().
 * Returns the command's wait status (exit code in bits 8 to 15, see vlsys_exit_status_text),
 * clamped to the range of int; -1 with errno set on failure:
 *   ECONNRESET  the surrogate parent closed the connection without an answer;
 *   EPROTO  its answer is not a number followed by a line feed or the end, or is a negative number,
 *      which is then the result, so test for a result below 0;
 *   EFAULT, EINVAL  see the rules above;
 *   other errno  of the call that failed (logged, but for system() itself).
 * Logs the exit code at LOG_DEBUG, when connected.
 */
VLSYS_API int vlsys_system(const char *command);

/*
 * Starts a shell command in the background. Directly: vlsys_spawn_direct. The command is a child of
 * the surrogate parent; when it was started directly, a child of the caller.
 * Returns its process id, or -1 with errno set as for vlsys_system. The surrogate parent's number
 * is not checked: one below 1 is no process to send a signal to.
 * Logs the answer and the process id at LOG_DEBUG.
 */
VLSYS_API int vlsys_spawn(const char *command);

/*
 * Runs a shell command and gives a stream to read its output from. Directly: popen(command, "re").
 * From the surrogate parent, the last line of the stream is the command's wait status in decimal.
 * Close the stream, which is close-on-exec, with vlsys_pclose.
 * Returns null with errno set on failure (that of popen is silent). ECONNRESET: the surrogate
 * parent closed the connection without an answer. E2BIG: working directory and command together
 * have over 1019 bytes. ERANGE: the directory alone has over 1023. Nothing is run then.
 * Logs the command's process id at LOG_INFO, when connected.
 * Reading the stream blocks, without a limit, until the command writes or ends.
 */
VLSYS_API FILE *vlsys_popen(const char *command);

/*
 * Closes a stream of vlsys_popen. A command that the surrogate parent is still running is ended.
 * Returns 0, also when the command could not be told to end (logged); for a command that was run
 * directly, the wait status that pclose gives; -1 for a null stream.
 * Blocks 1 second; for a command that was run directly, until it ends, without a limit.
 */
VLSYS_API int vlsys_pclose(FILE *stream);

/* ---- Video I/O driver ------------------------------------------------------------------------ */

/*
 * The unit has four video I/O boards. Their driver shows the registers in the status file,
 * /proc/driver/VlAvio/status. These operations read it into one table of the library, which belongs
 * to one thread; the product information below is taken from it. In the table a register is 0 until
 * it was read, and keeps its value when the file does not give it. Register lines under the header
 * of an unknown board (another device id) are skipped. When a status file cannot be read to its end
 * (logged at LOG_ERR), the registers before that point are in the table.
 */

/* Device ids of the boards. */
#define VLSYS_AVIO_KRD31 0x4160
#define VLSYS_AVIO_TBX204 0x4161
#define VLSYS_AVIO_TBX205 0x4162
#define VLSYS_AVIO_TBX206 0x4163

/*
 * Result of vlsys_avio_scan_alive: bits 0 to 3 are set for each board found in the file, bits 4 to
 * 7 for each board found alive, both in the order of the device ids; further bits are below. The
 * result is exactly VLSYS_AVIO_READY when all boards are alive and nothing is amiss.
 */
#define VLSYS_AVIO_READY 0xff
#define VLSYS_AVIO_UNKNOWN_DEVICE 0x100 /* an unknown board was seen */
#define VLSYS_AVIO_STRAY_ALIVE 0x200    /* an Alive register stands before any board */
#define VLSYS_AVIO_NO_DRIVER 0x400      /* alone: the status file could not be opened */

/*
 * Reads the Config register of every board. A value of more than 32 bits, or below 0, is taken as
 * 0xffffffff.
 * Returns 0; -1 when the status file could not be opened or read, an unknown board was seen (logged
 * at LOG_ERR as "unknown device id: ..."), or a register stands before any board. What could be
 * assigned is in the table even then.
 */
VLSYS_API int vlsys_avio_read_config(void);

/*
 * Gives the Config register of the board with the device id: 0 after a normal boot, 1 after a boot
 * from the backup image; other values are illegal. Reads the registers first, unless the last read
 * of a status file that could be opened succeeded.
 * Returns the register's 32 bits; -1 for another device id, when the registers cannot be read, and
 * for an illegal register of 0xffffffff. Logs only what vlsys_avio_read_config logs.
 */
VLSYS_API int vlsys_avio_get_config(unsigned int device_id);

/*
 * Reads the Alive register of every board. A value is taken only when it is odd (the board is
 * alive) and below 0x100; others are ignored.
 * Returns the bits described above; no board counts as found when the file cannot be read to its
 * end.
 * Logs the values of KRD-31 and TBX-204 at LOG_DEBUG, an unknown board at LOG_ERR.
 */
VLSYS_API int vlsys_avio_scan_alive(void);

/*
 * Waits until all boards are alive, then reads the Config registers and reports.
 * Returns 1 when the boards came up, or no status file can be opened, and none booted from its
 * backup image; else 0. Logs the beginning and the end of the wait at LOG_INFO ("can't get VlAvio
 * status. Emulator ?" at LOG_WARNING without a status file), and each Config register at LOG_INFO,
 * with a LOG_WARNING for a boot from backup or an illegal value. With the boards up, or without a
 * status file, frame frequency, destination and HDCP capability follow at LOG_INFO; else "timeout
 * (<seconds>). " at LOG_ERR, and the boards not found and those not alive at LOG_INFO. Blocks a
 * little under 29 seconds at most: 960 scans, about 30 ms apart. The wait ends at once when the
 * status file cannot be opened, and when a signal interrupts a sleep.
 */
VLSYS_API int vlsys_avio_wait_ready(void);

/* ---- Product information --------------------------------------------------------------------- */

/*
 * The serial number and the version may be read on any thread. The others take their answer from
 * the table of the video I/O driver, and run on the thread that it belongs to.
 */

/*
 * Writes the unit's destination code, "SY" or "CN", into a buffer of `size` bytes (3 hold it
 * whole). When the status of the KRD-31 board has not been read yet, it calls vlsys_avio_wait_ready
 * first, with its time and messages; without the driver that is so at every call.
 * Returns the length of the whole code, 2.
 * Logs the code at LOG_INFO; at LOG_WARNING that the status is read first, and that an unknown
 * destination is taken as "SY".
 */
VLSYS_API int vlsys_get_destination(char *buffer, size_t size);

/*
 * Gives the unit's frame rate. Calls vlsys_get_destination first, with its time and messages.
 * Returns 50 or 59 (for 59.94). An unknown rate is taken from the destination, 50 for "CN" and 59
 * for "SY", with a LOG_WARNING.
 * Logs the rate at LOG_INFO.
 */
VLSYS_API int vlsys_get_fps(void);

/*
 * Tells whether the unit can handle HDCP. When the status of the TBX-205 board has not been read
 * yet, it waits like vlsys_get_destination, with the same LOG_WARNING. Logs nothing else.
 * Returns 1 or 0.
 */
VLSYS_API int vlsys_get_hdcp_capability(void);

/*
 * Writes the unit's main serial number into a buffer of `size` bytes, "00000" when the listing
 * gives it no value. The listing is the output of "/usr/bin/Tovrin version -d krd", run with
 * vlsys_popen.
 *
 * The last line of the listing is taken as the command's wait status, which the surrogate parent
 * sends; a text that does not begin with a number counts as 0. When the surrogate parent goes away
 * and the listing is cut, the digits that arrived are taken as the serial number.
 * Returns
 *   the length of the whole serial number (the text was cut when that is `size` or more);
 *   0 when the listing has no serial number: the buffer is left as it was;
 *   the negated errno when the command could not be started, or its output not read;
 *   VLSYS_SERIAL_COMMAND_FAILED minus the wait status when a signal ended the command;
 *   VLSYS_SERIAL_COMMAND_FAILED minus the exit code when that is not 0;
 *   VLSYS_SERIAL_COMMAND_FAILED when the last line begins with a negative number;
 *   VLSYS_SERIAL_DIRECT_FAILED minus the wait status that vlsys_pclose gives, when that is not 0
 *   (only when the command ran without the surrogate parent);
 *   VLSYS_SERIAL_PCLOSE_FAILED when it gives none.
 * After a failure the buffer may hold a serial number that was read before it.
 * Logs each line of the listing at LOG_DEBUG.
 * Blocks until the listing ends, without a limit, and 1 second more when the surrogate parent ran
 * the command.
 */
#define VLSYS_SERIAL_COMMAND_FAILED (-200)
#define VLSYS_SERIAL_PCLOSE_FAILED (-300)
#define VLSYS_SERIAL_DIRECT_FAILED (-301)
VLSYS_API int vlsys_get_serial_number(char *buffer, size_t size);

/*
 * Writes the installed software version, the first line of the version file (its first 1023 bytes),
 * into a buffer of `size` bytes, and the file's modification time to `time`, which must not be
 * null. A version that cannot be read is given as "1.00_SQA3", a time that is not known as
 * 2013-02-25 07:54:00 UTC.
 * Reads /etc/velmora-version.
 */
VLSYS_API void vlsys_get_version(char *buffer, size_t size, time_t *time);

/* ---- Validation of a network setting --------------------------------------------------------- */

/*
 * A check code names what is wrong with a setting: the interface by its position in the list (0
 * also for a fault that concerns no single interface), the field and the kind of fault. Every check
 * code is VLSYS_CHECK_CODE(0, 0, 0), that is 0x100, or above.
 */
#define VLSYS_CHECK_CODE(position, field, kind) ((((position) + 1) << 8) | ((field) << 4) | (kind))
#define VLSYS_CHECK_IS_CODE(result) ((result) >= 0x100)
#define VLSYS_CHECK_POSITION(code) (((code) >> 8) - 1)
#define VLSYS_CHECK_FIELD(code) (((code) >> 4) & 0xF)
#define VLSYS_CHECK_KIND(code) (0xF & (code))

/* Fields. A fault of vlsys_dns server[2] carries VLSYS_CHECK_FIELD_IPV6_ADDR. */
#define VLSYS_CHECK_FIELD_IPV4_ADDR 1
#define VLSYS_CHECK_FIELD_IPV4_NETMASK 2
#define VLSYS_CHECK_FIELD_IPV4_GATEWAY 3
#define VLSYS_CHECK_FIELD_DNS_DOMAIN 4
#define VLSYS_CHECK_FIELD_DNS_PRIMARY 5
#define VLSYS_CHECK_FIELD_DNS_SECONDARY 6
#define VLSYS_CHECK_FIELD_IPV6_ADDR 7
#define VLSYS_CHECK_FIELD_IPV6_PREFIX 8
#define VLSYS_CHECK_FIELD_IPV6_GATEWAY 9
#define VLSYS_CHECK_FIELD_HOSTNAME 10
#define VLSYS_CHECK_FIELD_IFNAME 11

/* Kinds of fault. */
#define VLSYS_CHECK_KIND_INVALID 1     /* missing, no valid address or netmask length, no scope */
#define VLSYS_CHECK_KIND_NETMASK 2     /* netmask bits not contiguous */
#define VLSYS_CHECK_KIND_UNREACHABLE 3 /* outside every subnet, or of a family that is Off */
#define VLSYS_CHECK_KIND_SYNTAX 4      /* host or domain name not well-formed */
#define VLSYS_CHECK_KIND_NETWORK 5     /* the network address of the interface's subnet */
#define VLSYS_CHECK_KIND_BROADCAST 6   /* the broadcast address of the interface's subnet */
#define VLSYS_CHECK_KIND_PREFIX 7      /* IPv6 prefix length above 128 */
#define VLSYS_CHECK_KIND_RANGE 8       /* address of a range that the field does not allow */
#define VLSYS_CHECK_KIND_NO_IFACE 9    /* no such interface */
#define VLSYS_CHECK_KIND_OVERLAP 10    /* two interfaces in one subnet */
#define VLSYS_CHECK_KIND_MODE 11       /* a mode that another setting does not support */

/*
 * Which fields the validators read, and in which modes. In any other mode a field may hold any
 * text, and a result of 0 says nothing about it.
 *
 *   field                   vlsys_address_check  vlsys_address_check2
 *   interface: name         always               always
 *     addr, netmask         IPv4 Manual          IPv4 Manual
 *     prefix                never                IPv4 Manual
 *     addr6[0]              IPv6 Manual          IPv6 Manual
 *   IPv4 gateway: addr      IPv4 not Off         gateway Manual
 *   IPv6 gateway: addr      IPv6 not Off         gateway Manual
 *     iface                 (has none)           gateway DHCP, IPv6 also Auto
 *   DNS: domain, server[0]  DNS Manual           DNS Manual
 *     server[1]             DNS Manual           DNS Manual
 *     server[2]             never                DNS Manual
 *     iface                 never                never
 *   host name               always               always
 *
 * Some of these texts reach the network scripts unread when the setters are called one by one. So
 * give a setting that comes from outside to vlsys_set_network, which clears them:
 * - the gateway's addr (GATEWAY, IPV6_DEFAULTGW): after vlsys_address_check, with its family Off;
 *   after vlsys_address_check2, with the gateway's mode DHCP, IPv6 also Auto;
 * - domain, server[0] and server[1] (DOMAIN, DNS1, DNS2): with a DNS mode above VLSYS_MODE_DHCP.
 *   Such a mode passes both validators and is Manual to the setter, but vlsys_address_check turns
 *   it Off when both families are Off, and vlsys_address_check2 refuses it when no interface is on.
 *
 * IPv4 modes above VLSYS_MODE_DHCP and IPv6 modes above VLSYS_MODE_AUTO pass as well. The setter
 * takes them for DHCP and Auto, and writes no field that was not read.
 */

/*
 * Checks whether the network setting of one interface can be applied, and changes it to the form
 * that the setters write. The first fault ends the checks; what was changed before it stays so.
 *
 * A text of a record that fills its field may lack the NUL. gw4 is a buffer of VLSYS_ADDR4_SIZE,
 * gw6 one of VLSYS_ADDR6_SIZE bytes, empty for no gateway; hostname is one of at least 64 bytes.
 * "Canonical" is the text that getnameinfo gives for an address: "10.53" becomes 10.0.0.53, and
 * "10.0.0.010", with a number in octal, 10.0.0.8. The checks, in this order:
 * - The interface exists.
 * - Every IPv4 address: not 0.0.0.0, not in 127.0.0.0/8, and below 224.0.0.0. Every IPv6 address:
 *   in 2000::/3 or fc00::/7 without a "%", or link-local with its "%interface", whose name has
 *   letters, digits and "._-@+" alone.
 * - IPv4 Manual: addr, netmask and the gateway become canonical, broadaddr is filled. A netmask
 *   that begins with a number from 8 to 30 is a prefix length and becomes a mask: "24", "24abc" and
 *   "24.0.0.0" are all 255.255.255.0. ("31" is the mask 0.0.0.31, which has a gap.) The gateway
 *   lies in the subnet. Neither addr nor the gateway is the network or broadcast address; a netmask
 *   of 255.255.255.255 has neither. IPv4 DHCP: the gateway becomes canonical.
 * - IPv6: the same with addr6[0]. There is no broadcast address, and a link-local gateway needs no
 *   subnet.
 * - DNS is turned Off, with a warning, when both families are Off, or when it is DHCP and no family
 *   is.
 * - DNS Manual: the domain is empty or well-formed. server[0] is given; it and server[1] become
 *   canonical; a server[1] equal to server[0] is emptied. A server's family is not Off. When its
 *   family is Manual, it lies in the subnet or there is a gateway. In IPv4 its host bits are not
 *   all zero and it is not the broadcast address (a netmask of 255.255.255.255 has neither rule);
 *   in IPv6 it is not the network address.
 * - dns->iface becomes the interface, whatever the DNS mode.
 * - The host name is well-formed, as for vlsys_set_hostname_immediately. An empty one becomes
 *   "localhost", with a warning.
 *
 * In the rules for DNS, and throughout vlsys_address_check2, only VLSYS_MODE_MANUAL is Manual and
 * only VLSYS_MODE_DHCP is DHCP.
 * Returns 0; a check code at position 0; EFAULT for a null argument; the positive errno of an
 * interface look-up that failed, such as EMFILE; the positive errno or negative resolver code of an
 * address that could not be converted (that of broadaddr does not end the checks).
 * Logs the modes at LOG_INFO at the start and when all is well, each fault at LOG_ERR, and a
 * netmask made of a prefix length at LOG_DEBUG. Silent: an interface that does not exist, an IPv6
 * prefix length above 128, an address of a range that its field does not allow, a link-local
 * address without scope, a missing server[0], a name with a misplaced character, and a host name of
 * 65 to 254 characters (a longer one, and a label over 63, are logged).
 * Asks the kernel for interface names only. No host name is looked up, nothing is waited for.
 */
VLSYS_API int vlsys_address_check(vlsys_ifconf *nif, char *gw4, char *gw6, vlsys_dns *dns,
                                  char *hostname);

/*
 * Checks the network setting of `count` interfaces at once. The rules are those of
 * vlsys_address_check, with these differences:
 * - Interfaces: "eth1" need not exist and is not looked up; "lo" is refused. A prefix of 8 to 30
 *   replaces the netmask. Otherwise prefix becomes the length of the netmask, which must be 8 to
 *   30.
 * - No two interfaces have the same IPv4 address, and none has a Manual address in the subnet of
 *   another one, in either family.
 * - A Manual gateway needs an interface of its family that is on. It lies in the subnet of any
 *   Manual interface, or an interface learns its routes (DHCP, IPv6 also Auto), or it is
 *   link-local. It is no subnet's network or broadcast address. gw4->iface becomes the last
 *   interface whose subnet holds it.
 * - A learnt gateway (DHCP, IPv6 also Auto) names an interface. When that is one of the list, its
 *   mode is neither Off nor Manual.
 * - A gateway record that is Off, Manual without address or of an unknown mode is cleared.
 * - DNS is not turned Off: a mode other than Off without an interface that is on is a fault, and so
 *   is DHCP without an interface on DHCP.
 * - DNS Manual: at least one of the three servers is given; of equal ones the last stays and the
 *   others are emptied. (vlsys_set_dns_settings writes the first two and refuses an empty
 *   server[0].) A server needs an interface of its family that is on. It lies in the subnet of any
 *   Manual interface, or an interface learns its routes, or the Manual gateway of its family was
 *   accepted. It is no subnet's network or broadcast address.
 * - dns->iface becomes the first interface that is on (DNS Manual) or on DHCP (DNS DHCP). Otherwise
 *   it stays as it is.
 *
 * The order: each interface's name and IPv4 addressing, IPv4 subnets against each other, IPv4
 * gateway; each interface's IPv6 addressing, IPv6 subnets against each other, IPv6 gateway; DNS;
 * host name.
 * Returns as vlsys_address_check; EFAULT also for a count below 1; the positive errno of a failed
 * allocation. A check code has the position of the interface whose addressing is at fault, or whose
 * network or broadcast address a gateway or server is; else position 0.
 * Logs at LOG_INFO the modes in one word and the result, "NG (<code>)" or "OK"; at LOG_DEBUG values
 * on the way, and an interface that does not exist. The word is "MD__M_M4_": the IPv4 modes of the
 * first two interfaces, their IPv6 modes, IPv4 and IPv6 gateway, DNS, and the families of its first
 * two servers. A learnt gateway is "0" or "1" for the interface it names, else "!". Also silent: an
 * IPv6 overlap, a netmask length outside 8 to 30, a learnt gateway without an interface, and a
 * gateway that the interfaces' modes do not support.
 */
VLSYS_API int vlsys_address_check2(vlsys_ifconf *nifs, int count, vlsys_gw4 *gw4, vlsys_gw6 *gw6,
                                   vlsys_dns *dns, char *hostname);

/*
 * Puts a result of the validators or of vlsys_set_network into words, cut to a buffer of `size`
 * bytes, which may be null. The `count` interfaces are those that were checked, or null:
 *   "eth1: the IPv4 netmask has a gap"         a fault of one interface
 *   "interface 2: the IPv4 netmask has a gap"  the same without the interfaces
 *   "the DNS domain is not well-formed"        a fault that concerns no single interface
 *   "no fault"                                 0
 *   "error <number>: <the system's text>"      an errno or a negative resolver code
 * VLSYS_CHECK_FIELD_IPV6_ADDR is also the field of the third DNS server. The text says "third DNS
 * server" when the kind of fault shows that, or when the interface has no fixed IPv6 address.
 * Returns the length of the whole text. It was cut when that is `size` or more. Logs nothing.
 */
VLSYS_API size_t vlsys_check_text(int code, const vlsys_ifconf *nifs, int count, char *buffer,
                                  size_t size);

/* ---- Applying a whole network setting -------------------------------------------------------- */

/* Steps of vlsys_set_network. */
#define VLSYS_STEP_NONE 0         /* all went well */
#define VLSYS_STEP_CHECK 1        /* the setting is refused, nothing was written */
#define VLSYS_STEP_NETIF 2        /* vlsys_set_netif, of each interface in turn */
#define VLSYS_STEP_IPV4_GATEWAY 3 /* vlsys_set_ipv4_default_gateway2 */
#define VLSYS_STEP_IPV6_GATEWAY 4 /* vlsys_set_ipv6_default_gateway2 */
#define VLSYS_STEP_DNS 5          /* vlsys_set_dns_settings */
#define VLSYS_STEP_HOSTNAME 6     /* vlsys_set_hostname */

/*
 * Checks the network setting of `count` interfaces with vlsys_address_check2 and writes it with the
 * setters, in the order of the steps above. Use it to set what a person or another program asked
 * for: no text that the check did not read reaches the files.
 * - A list with a virtual bridge (virbr*), or with one interface twice, is refused.
 * - A mode that its field does not have is refused: above VLSYS_MODE_AUTO for IPv6 and the IPv6
 *   gateway, above VLSYS_MODE_DHCP for IPv4, the IPv4 gateway and DNS.
 * - After the check, every field that the modes leave unread is cleared in the caller's records:
 *   addr, netmask, broadaddr and prefix of an interface whose IPv4 is not Manual; addr6[0] when its
 *   IPv6 is not; a gateway's addr when it is not Manual; domain and servers when DNS is not, and
 *   its iface when it is Off.
 * - DNS servers move up where the check has emptied one. The first two are written.
 * - The first failure ends it; what was written before it stays.
 *
 * `step` may be null. It receives VLSYS_STEP_NONE, or the step that failed.
 * Returns 0; a check code; EINVAL for a list or mode that is refused (logged); EFAULT for a null
 * argument or a count below 1; else the positive errno of the check or of the setter that failed.
 * Logs what the check and the setters log. At LOG_WARNING it logs what the check lets pass and the
 * network scripts may not serve (the result is 0 all the same): a link-local address as the fixed
 * IPv6 address; an IPv4 gateway outside every fixed subnet, which must then lie in a lease's; and a
 * global IPv6 gateway outside every fixed subnet, whose prefix must be learnt before the scripts
 * set it.
 */
VLSYS_API int vlsys_set_network(vlsys_ifconf *nifs, int count, vlsys_gw4 *gw4, vlsys_gw6 *gw6,
                                vlsys_dns *dns, char *hostname, int *step);

/* ---- Files and directories ------------------------------------------------------------------- */

/*
 * These may run on any thread, but vlsys_remove_tree changes the working directory of the whole
 * process while it works.
 */

/*
 * Rebuilds the font cache: runs "fc-cache" with vlsys_system and waits for it without a limit.
 * Returns the command's exit code (0 is success), its whole wait status when a signal ended it, or
 * the negated errno when it could not be run. Logs only what vlsys_system logs.
 */
VLSYS_API int vlsys_fc_cache(void);

/*
 * Makes a directory and every missing directory above it, each with the mode given (permission
 * bits, less the umask). The path must not be null; only its first 4096 bytes are used.
 * Returns 0 when every level was made or was there already; an entry of another kind counts as
 * being there. -1 on failure, with errno set; levels made before it stay.
 */
VLSYS_API int vlsys_mkdir(const char *path, unsigned int mode);

/*
 * Removes a file, or a directory with all that is in it. Symbolic links are removed, not followed.
 * Other file systems mounted below are not entered, but a part of the same one is (bind mount).
 * Slashes at the path's end are ignored. The names of a directory are held in memory.
 * - A directory that cannot be read is passed over silently. Removing its parent then fails; when
 *   it is the path itself, it stays and the result is 0.
 * - Any other entry that cannot be walked is passed over and logged at LOG_ERR (a directory cycle
 *   at LOG_WARNING).
 * Returns 0; EFAULT for a null path; ENOENT for an empty one (silent); else the positive errno of
 * the first removal that failed, or of the walk. That ends the work; what was not yet removed
 * stays. Paths of over 32,000 bytes below it can end the walk with ENAMETOOLONG.
 */
VLSYS_API int vlsys_remove_tree(const char *path);

/*
 * Writes the absolute path of an existing file, without symbolic links, "." and "..", into a buffer
 * of `size` bytes, cut to fit. The buffer may be null.
 * Returns the length of the whole path; -EFAULT for a null path; else the negated errno.
 */
VLSYS_API int64_t vlsys_realpath(char *buffer, const char *path, size_t size);

/*
 * Gives the size in bytes of the disk or partition that a device path names, after its symbolic
 * links are resolved; INT64_MAX when it is larger.
 * Returns the size (0 when the size file is empty or holds no number); -EFAULT for a null path;
 * else the negated errno, also that of a size file that can be opened but not read.
 * Logs the device's name at LOG_DEBUG and the size at LOG_INFO.
 * Reads /sys/block/sda/sda1/size for a partition of a disk with a one-letter name ("sda1", "hdb2"),
 * /sys/block/<name>/size for every other name.
 */
VLSYS_API int64_t vlsys_get_block_device_size(const char *path);

#ifdef __cplusplus
}
#endif

#endif
