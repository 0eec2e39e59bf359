/*
 * vlsys: the appliance's system settings.
 *
 * A program calls vlsys_init first and vlsys_exit last; every other operation is a plain
 * synchronous call on the caller's thread. The library has no threads and no locks: its few
 * process-wide states (paths, log, driver status table, primary interface) belong to one thread,
 * and so does every operation that is not said to run on any thread. Setters change the umask of
 * the whole process for a moment.
 *
 * Setters change configuration files only, unless said otherwise. What they write takes effect at
 * the next network restart or boot. Rewriting a sysconfig file or the sysctl drop-in drops its
 * comments and empty lines, changes the first line of a key only, and makes a missing file and its
 * directories (mode 0755). The clock file keeps its comments, has each of its zone lines changed,
 * and must exist.
 *
 * Logging: every failed call is logged at LOG_ERR with a message that names the call, warnings at
 * LOG_WARNING, settings written and values read at LOG_INFO, traces at LOG_DEBUG. Each operation
 * says below what else it logs, and where it fails silently.
 *
 * Blocking: what an operation waits for, and how long at most, is said with it. Beside that each
 * takes the time of its file accesses, and each message can wait for the log (see vlsys_log).
 *
 * System files are replaced whole: a reader sees the old file or the new one, mode 0644. A symbolic
 * link in a file's place is read through and replaced by a file, what it points to stays as it is;
 * links among the directories above are followed. Files named below as "<root>/..." are found under
 * the root path (VL_ROOT), all others at the path given.
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

/* ---- Version ----------------------------------------------------------------------------------
 */

/* Of this header. A program that was built with it runs with any later library of the same major.
 */
#define VLSYS_VERSION_MAJOR 1
#define VLSYS_VERSION_MINOR 1
#define VLSYS_VERSION "1.1.0"

/* ---- Start-up and paths ---------------------------------------------------------------------- */

/*
 * Starts the library: takes the paths from the environment variables VL_ROOT (default ""),
 * VL_PREFIX ("/usr") and VL_DATA ("/velmora"). A variable that is set but empty counts as set; the
 * texts are joined as they are, no separator is added. On a started library it changes nothing. A
 * relative root is looked up from the working directory at each call. A system path over 4095 bytes
 * is cut; the setters then fail with ENAMETOOLONG. A standard descriptor (0 to 2) that is closed is
 * opened on /dev/null first, so that no file or socket of the library gets its number; vlsys_exit
 * leaves it open.
 *
 * Before it, and after vlsys_exit, VL_ROOT is ignored: the root path counts as empty, and a setter
 * changes the running system's own files. vlsys_init and vlsys_exit run on one thread, while no
 * other operation does.
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
 * written); 0 when the size is 0 (nothing is written); VLSYS_NOT_STARTED (-200) when the library is
 * not started. Logs nothing. They may run on any thread.
 */
#define VLSYS_NOT_STARTED (-200)
VLSYS_API int64_t vlsys_get_path_root(char *buffer, size_t size);
VLSYS_API int64_t vlsys_get_path_prefix(char *buffer, size_t size);
VLSYS_API int64_t vlsys_get_path_data(char *buffer, size_t size);

/* ---- Bounded text ---------------------------------------------------------------------------- */

/*
 * Copies the source, cut to size - 1 bytes, and terminates it; writes nothing when the size is 0.
 * Returns the length of the source: the copy was cut when that is `size` or more. May run on any
 * thread, as the next one may.
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
 * id>]: " (none at LOG_DEBUG), and a line feed follows unless the format itself ends in one. The
 * line is whole, whatever other threads print.
 * Blocks, without a limit, while the log daemon or the reader of standard output takes nothing. May
 * run on any thread once the log is open.
 */
VLSYS_API void vlsys_log(int priority, const char *format, ...) VLSYS_PRINTF(2, 3);
VLSYS_API void vlsys_vlog(int priority, const char *format, va_list arguments) VLSYS_PRINTF(2, 0);

/*
 * Opens the log under an identity text, which is not copied and must outlive it. The option and
 * facility are those of openlog; a negative facility selects standard-output mode instead, for the
 * rest of the process's life.
 */
VLSYS_API void vlsys_openlog(const char *ident, int option, int facility);

/*
 * Closes the system log; in standard-output mode does nothing. Logging again opens it again, under
 * the program's short name.
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
 * /usr/share/zoneinfo/, such as "Asia/Shanghai".
 *
 * In this order: checks that the zone file is a compiled one; makes <root>/etc/localtime a symbolic
 * link to it, by way of "localtime.new" beside it; rewrites <root>/etc/sysconfig/clock, which must
 * exist, by way of a temporary beside it: every line with "ZONE=" anywhere in it becomes
 * ZONE="<zone>", and without one the line is appended; sets TZ, overwriting it, and calls tzset.
 * The clock file is read in pieces of at most 79 bytes: a longer line counts as several, and a line
 * put in the place of one is cut to 79 bytes. A zone that begins with a double quote is written
 * without further quotes.
 *
 * The first failure ends it; what was done before stays done. Returns
 * 0        also when the clock file's mode could not be set to 0644 (logged) or TZ could not be set
 *          (not logged);
 * -EFAULT  null zone (not logged);
 * -ENOENT  empty zone (not logged), no such zone file, zone file that does not begin with "TZif",
 *          no clock file;
 * -ENAMETOOLONG  zone whose file has a path of over 4095 bytes;
 * -EIO     zone file of fewer than 4 bytes;
 * else the negated errno of the step that failed.
 * After a failure in the zone file or the link /etc/localtime is what it was; after one in the
 * clock file (one that cannot be read, written, flushed to disk or closed) the link is the new one,
 * the clock file is what it was, and TZ is not set. Two calls at once on one system tree interfere;
 * no other thread may use the environment meanwhile. Waits for the clock file to reach the disk.
 */
VLSYS_API int vlsys_set_timezone(const char *zone);

/*
 * The zone name of <root>/etc/sysconfig/clock: what stands between the ZONE=" and the last double
 * quote of the first line that has a ZONE=" (to the end of the line, line feed included, when no
 * other quote follows). An unquoted zone is not found. Lines over 79 bytes count as several.
 *
 * Copies it into the buffer of `size` bytes as vlsys_strlcpy does. Returns its whole length; 0, and
 * the buffer unchanged, when the buffer is null, the file has no zone, or cannot be opened or read
 * (logged). May run on any thread.
 */
VLSYS_API size_t vlsys_get_timezone(char *buffer, size_t size);

/*
 * The present offset of local time from UTC, such as "+0800", in a buffer of 6 bytes or more.
 * Returns its length, 5; 0 when the buffer is null or too small (its content is then unspecified),
 * or the local time cannot be told (logged). May run on any thread.
 */
VLSYS_API size_t vlsys_get_utc_offset(char *buffer, size_t size);

/* ---- Network records ------------------------------------------------------------------------- */

/*
 * The setters of the next sections write the texts of these records into files that scripts source
 * as root, unchecked and without quotes: "$(reboot)" in a field that is written will be run. Let a
 * validator check a setting first, and leave empty the fields that it does not look at (see
 * "Validation of a network setting").
 *
 * A setter changes the first line of a key. Where a key stands in a file more than once, the later
 * lines stay, and in a shell the last one wins. Of two setters at once on one file, the later
 * rename wins: what the other one wrote is lost. /etc/sysctl.d/velmora has no ".conf" in its name:
 * scripts that take every file of the directory read it, others do not.
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
    char netmask[VLSYS_ADDR4_SIZE];       /* IPv4 netmask, dotted decimal. The validators take the
                                             number that it begins with for a prefix length, 8 to 30:
                                             "24abc" and "24.0.0.0" are 24. "31" is 0.0.0.31, a mask
                                             with a gap. */
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
 * The names of the unit's interfaces, all but "lo" and "virbr*", in natural order (eth2 before
 * eth10). When there are any and `pifn` is not null, *pifn receives an array of them, which the
 * caller frees with free; otherwise *pifn is not written.
 *
 * Returns their number; 0 also when the kernel's list cannot be had, or there is no memory for the
 * array (*pifn is then null).
 */
VLSYS_API int vlsys_get_ifname_list(char (**pifn)[VLSYS_IFNAME_SIZE]);

/*
 * Sets how the interface gets its addresses: the keys of
 * <root>/etc/sysconfig/network-scripts/ifcfg-<name>, then the interface's IPv6 switches (lines
 * "net.ipv6.conf.<name>.<switch> = <0 or 1>", a dot in the name written "/") in
 * <root>/etc/sysctl.d/velmora. Of the record it takes ipv4_mode, with addr and netmask in Manual
 * mode (prefix is only logged), and ipv6_mode, with addr and prefix of addr6[0] in Manual mode.
 * Nothing is checked: scripts source the file as root, whatever the texts hold.
 *
 * An interface's file that this or another setter makes anew has no DEVICE: the network scripts do
 * not bring the interface up by it.
 *
 * Keys of the interface's file ("-": removed). GATEWAY, PREFIX, UUID, HWADDR, IPV6FORWARDING and
 * IPV6_ROUTER are always removed, NM_CONTROLLED is always "no".
 *
 *   IPv4           Off, IPv6 too  Off   Manual       DHCP
 *   ONBOOT         no             yes   yes          yes
 *   BOOTPROTO      as it was      none  none         dhcp
 *   IPADDR         as it was      -     addr         -
 *   NETMASK        as it was      -     netmask      -
 *
 *   IPv6             Off        Manual       DHCP  Auto
 *   IPV6INIT         no         yes          yes   yes
 *   IPV6_AUTOCONF    no         no           yes   yes
 *   IPV6ADDR         -          addr/prefix  -     -
 *   DHCPV6C          -          -            yes   -
 *
 *   Switches         Off        Manual       DHCP  Auto
 *   disable_ipv6     1          0            0     0
 *   autoconf         as it was  0            1     1
 *   accept_ra_pinfo  as it was  0            1     1
 *
 * Returns 0; 14 (EFAULT) for a null name or record and 6 (ENXIO) for an interface that the kernel
 * does not have under that very name, both silent and with no file touched; the positive errno of
 * the kernel's answer when it cannot be asked, such as EMFILE (no file touched); else that of the
 * failed rewrite, the second file untouched when the first one failed.
 * Logs at LOG_INFO "IPv4 (<name>): " and "IPv6 (<name>): ", each with "OFF", the address and prefix
 * length, "DHCP" or "AUTO". Waits for each file to reach the disk.
 */
VLSYS_API int vlsys_set_netif(const char *name, const vlsys_ifconf *conf);

/* ---- DNS ------------------------------------------------------------------------------------- */

/*
 * Sets the unit's name resolution: the keys PEERDNS, DOMAIN, DNS1 and DNS2 of
 * <root>/etc/sysconfig/network-scripts/ifcfg-<name> of every interface, in natural order. The
 * interface named in `iface` gets PEERDNS=yes in DHCP mode, and in Manual mode also `domain` (even
 * when empty), server[0] and, when not empty, server[1]; in Off mode it gets PEERDNS=no, as every
 * other interface does in any mode. Keys without a value here are removed. An `iface` that names
 * none of the unit's interfaces is no failure; it is only compared. Nothing is checked: scripts
 * source the file as root, whatever the texts hold.
 *
 * In Manual mode on an interface with DHCP the servers of the lease stay in force, behind these.
 *
 * Returns 0; 14 (EFAULT) for a null record; 22 (EINVAL) when the mode is not Off and `iface` is
 * empty (no file touched), or when it is Manual for one of the unit's interfaces and server[0] is
 * empty; 6 (ENXIO) when the unit has no interface; all these are silent, but for a list of
 * interfaces that cannot be had, which counts as none and is logged. Else the positive errno of
 * a failed rewrite, with "param: failed" logged. A failure leaves the files of earlier interfaces
 * rewritten. Logs the setting of the DNS interface at LOG_INFO, each path and every other interface
 * at LOG_DEBUG. Waits for each file to reach the disk.
 */
VLSYS_API int vlsys_set_dns_settings(const vlsys_dns *dns);

/*
 * Reads the name resolution into the record, which must not be null: `domain` (the last "domain" or
 * "search" line, of several domains the first) and up to three servers as /etc/resolv.conf has them
 * now, and the mode as the files /etc/sysconfig/network-scripts/ifcfg-<name> set it: Manual when
 * one has DOMAIN, else Off when all have PEERDNS=no, else DHCP. `iface` is left empty. Without
 * /etc/resolv.conf the whole record is zero (Off), without an interface the mode is Off.
 *
 * Returns 0, or the positive errno of a file that cannot be opened or read: of /etc/resolv.conf
 * with the record zero, of an interface's file with what was read before it.
 */
VLSYS_API int vlsys_get_dns_settings(vlsys_dns *dns);

/* ---- Default gateways ------------------------------------------------------------------------ */

/*
 * Sets the IPv4 default gateway: GATEWAY of <root>/etc/sysconfig/network is `addr`, whatever the
 * mode, or removed when that is empty. Then, in <root>/etc/sysconfig/network-scripts/ifcfg-<name>
 * of every interface, in natural order, METRIC, GATEWAY and GATEWAYDEV are removed, and DEFROUTE is
 * removed when the interface may have a default route of its own, else "no". Every interface may
 * when `addr` is not empty or the mode is Manual; otherwise only the one named in `iface`. Nothing
 * is checked: scripts source the files as root, whatever `addr` holds.
 *
 * A fixed gateway comes into force on an interface whose subnet holds it. Outside the subnet that a
 * lease gives there is none.
 *
 * Returns 0; 14 (EFAULT) for a null record (silent); else the positive errno of the failed rewrite,
 * with earlier files rewritten. When the list of interfaces cannot be had (logged) that counts as
 * none: the result is 0, with only the first file rewritten.
 * Logs "IPv4 GW " and the address, "none" (Off, Manual) or "dhcp" at LOG_INFO, each interface's
 * DEFROUTE at LOG_DEBUG. Waits for each file to reach the disk.
 */
VLSYS_API int vlsys_set_ipv4_default_gateway2(const vlsys_gw4 *gw);

/*
 * The same for a gateway address alone (mode Manual, cut to 15 characters), or for DHCP on no
 * interface when the text is null or empty.
 */
VLSYS_API int vlsys_set_ipv4_default_gateway(const char *text);

/*
 * Sets the IPv6 default gateway: IPV6_DEFAULTGW of <root>/etc/sysconfig/network is `addr`, whatever
 * the mode, or removed when that is empty. Then the lines
 * "net.ipv6.conf.<name>.accept_ra_defrtr = <0 or 1>" of all interfaces are set in
 * <root>/etc/sysctl.d/velmora, in one rewrite: 1 for an interface that may take a default route
 * from router advertisements, by the rule of vlsys_set_ipv4_default_gateway2; a dot in the name is
 * written "/". Nothing is checked: scripts source the first file as root, whatever `addr` holds.
 *
 * On an interface that learns its prefix, prefer a fixed gateway of the form "fe80::1%eth0": the
 * scripts install the gateway before the prefix is there, and then no other can be reached.
 *
 * Returns 0; 14 (EFAULT) for a null record (silent); else the positive errno of the failed step:
 * the first file's rewrite (the second is then untouched), memory, or the second file's rewrite.
 * A list of interfaces that cannot be had counts as none, as above.
 * Logs at LOG_INFO "IPv6 GW " and the address, "none" (Off, Manual), "dhcp" or "auto", and
 * "IPv6 GW auto (<name>)" for each interface set to 1; the number of interfaces and the lines at
 * LOG_DEBUG. Waits for each file to reach the disk.
 */
VLSYS_API int vlsys_set_ipv6_default_gateway2(const vlsys_gw6 *gw);

/*
 * The same for a gateway address alone (mode Manual, cut to 45 characters), or for Auto on no
 * interface when the text is null or empty.
 */
VLSYS_API int vlsys_set_ipv6_default_gateway(const char *text);

/* ---- Host name ------------------------------------------------------------------------------- */

/*
 * Sets HOSTNAME of <root>/etc/sysconfig/network: the name, cut to 1025 characters, or "localhost"
 * when it is null or empty. The running host name stays as it is. Nothing else is checked: scripts
 * source the file as root, whatever the name holds. "localhost" gives way to the host name of a
 * DHCP lease.
 *
 * Returns 0, or the positive errno of the failed rewrite.
 * Logs "hostname: <name>" at LOG_INFO. Waits for the file to reach the disk.
 */
VLSYS_API int vlsys_set_hostname(const char *name);

/*
 * Reads the running host name into a buffer of VLSYS_HOSTNAME_SIZE bytes.
 * Returns 0; 14 (EFAULT) for a null buffer; else the positive errno. Logs nothing.
 */
VLSYS_API int vlsys_get_hostname(char *name);

/*
 * Sets the host name in <root>/etc/sysconfig/network, as vlsys_set_hostname does, and then the
 * running one. The name must not be null. It may have 64 characters: labels of up to 63 letters,
 * digits and single hyphens, which neither begin nor end a label, joined by dots; one dot may end
 * it. The empty name is not refused: the file then has "localhost".
 *
 * Returns 0, also when the name is the running host name already (nothing is written, so a name
 * that vlsys_set_hostname wrote before stays in the file; logged at LOG_INFO);
 * VLSYS_HOSTNAME_REFUSED for a name that breaks these rules; else the positive errno of the failed
 * step: when the kernel refuses the name, the file has it already. Waits for the file to reach the
 * disk.
 */
#define VLSYS_HOSTNAME_REFUSED 420
VLSYS_API int vlsys_set_hostname_immediately(const char *name);

/* ---- Network state --------------------------------------------------------------------------- */

/*
 * Reads the present state of an interface into the record. Link, addresses and flags are the
 * kernel's; ipv4_mode and ipv6_mode are what /etc/sysconfig/network-scripts/ifcfg-<ifname> and the
 * switches disable_ipv6 and autoconf in /proc/sys/net/ipv6/conf/<ifname> set.
 *
 * - Addresses are taken in the kernel's order. Of several IPv4 addresses (aliases such as eth0:1)
 *   the last one stays. broadaddr is the kernel's when the interface can broadcast; of an address
 *   without one it is the address itself.
 * - addr6: a link-local address goes to entry 1, a site-local one to entry 0. Any other goes to
 *   the first of the entries 0, 2 and 3 that is empty, or else replaces entry 3.
 * - An interface is told by the beginning of its addresses' names: "eth1" shows those of eth10 too.
 * - The interface's file is read by its letters, not as a shell reads it: a value in single quotes,
 *   with a blank or with a comment behind it is another value. ONBOOT='yes' thus reads as IPv4 Off,
 *   BOOTPROTO='none' as DHCP. Double quotes around a value are understood.
 * - up, has_ipv6 and addr6 are cleared first; the other fields of what the interface does not have
 *   stay as they are, so give a record of zeros.
 *
 * Returns 0; 14 (EFAULT) for a null argument and 6 (ENXIO) when no interface has that very name (an
 * alternative name is none), both silent and with nothing written; the errno value of a look-up
 * that failed otherwise, such as 24 (EMFILE) without a free descriptor, with nothing written; the
 * errno value of getifaddrs; the errno value or negative resolver code of an address that could not
 * be converted, with the fields up to it filled, but not name, index and the modes; the positive
 * errno of an interface file that cannot be read, with all filled but ipv4_mode. An interface that
 * vanishes meanwhile leaves name and index unwritten.
 * Reads the kernel's list once; waits 11 seconds for a switch file that is missing.
 */
VLSYS_API int vlsys_get_netif(const char *ifname, vlsys_ifconf *nif);

/*
 * Reads the IPv6 default gateway in force: the first route to :: in /proc/net/ipv6_route that is up
 * and has a gateway. `addr` is its address, with "%interface" when it is link-local, and `iface`
 * its interface. Without such a route the record is all empty (Off). Both facts are the kernel's
 * alone: a route stays up when its link loses carrier, and whether it was learnt goes by the count
 * of references to it, Manual for exactly one, else Auto. (Recent kernels count one for a learnt
 * route too, and one more for a use.)
 *
 * Returns 0, also without a route; 14 (EFAULT) for a null record (silent); the errno value of the
 * table when it cannot be opened, with the record as it was, or when it cannot be read, with the
 * record Off; the errno value or negative resolver code of an address that could not be converted,
 * with the record Off.
 */
VLSYS_API int vlsys_get_ipv6_default_gateway2(vlsys_gw6 *gw);

/*
 * Reads the IPv4 default gateway in force, and how it is configured. `addr` and `iface` are those
 * of the first route to 0.0.0.0/0 in /proc/net/route, empty when there is none; "0.0.0.0" is a
 * route without a gateway, on the interface "*" one that rejects ("unreachable"). The mode is
 * Manual when <root>/etc/sysconfig/network has a line that begins with "GATEWAY="; else DHCP when
 * <root>/etc/sysconfig/network-scripts/ifcfg-<name> of some interface has a line that begins with
 * "BOOTPROTO=dhcp" and none with "DEFROUTE=no"; else Off.
 *
 * Returns 0, also without a route; 14 (EFAULT) for a null record (silent); the errno value of the
 * table when it cannot be opened, with the record as it was; the errno value of another file that
 * cannot be opened or read, with the gateway read, and the mode as far as it was found; the errno
 * value of the table when it cannot be read, or the errno value or negative resolver code of an
 * address that could not be converted, with `addr` and `iface` empty and the mode found.
 */
VLSYS_API int vlsys_get_ipv4_default_gateway2(vlsys_gw4 *gw);

/*
 * The address alone, in a buffer of VLSYS_ADDR6_SIZE or VLSYS_ADDR4_SIZE bytes; empty when there is
 * no gateway, and on failure. They return what the reader of the record returns.
 */
VLSYS_API int vlsys_get_ipv6_default_gateway(char *text);
VLSYS_API int vlsys_get_ipv4_default_gateway(char *text);

/* ---- Network restart ------------------------------------------------------------------------- */

/*
 * Puts into force what the setters wrote, and logs the state that comes of it. In this order: sets
 * the running host name to the HOSTNAME of /etc/sysconfig/network (empty when there is none, or
 * when the file cannot be opened, which is logged); makes sure that vlsys_get_dns_settings can
 * read; removes /etc/resolv.conf, which the network scripts write anew; runs "service network
 * restart" with vlsys_system; reports.
 *
 * Returns
 *   the exit code of the restart command, 0 to 255, or 256 when it did not exit normally;
 *   a positive errno when the DNS settings cannot be read, with only the host name set;
 *   the negated errno when /etc/sysconfig/network opens and cannot be read, or the host name cannot
 *   be set, with nothing done;
 *   a negative result of vlsys_system when the restart command could not be run, with no report.
 * A negated errno of 1 (EPERM) is also -1; a positive errno is told from an exit code by the log.
 * Failures in the report are logged and change nothing; nor does /etc/resolv.conf that cannot be
 * removed, logged at LOG_WARNING.
 *
 * The report, at LOG_INFO, shows the first two interfaces of vlsys_get_ifname_list; each line has
 * at most 159 characters, the rest is cut. The modes are those of vlsys_address_check2.
 *   vlsys_network_restart: exited (service network restart), status: 0
 *   hostname: rhx416-41600123
 *   mode: MD_AM_M4_
 *   eth0: link up, MAC: 02-00-00-00-00-01
 *   192.168.1.10/24
 *   eth1: no carrier, MAC: 02-00-00-00-00-02
 *   192.168.2.20/24, fd00::20/64, fe80::2%eth1/64
 *   gw4 192.168.1.1 (eth0) [static], gw6 [off]
 *   DNS domain: example.com  server: 192.168.1.1
 * The second line of an interface has IPv6 addresses alone when IPv4 is not up, and is left out
 * when there are none either. A gateway's mode is "static", "dhcp", "auto" or "off".
 *
 * Blocks until the command has ended, and after exit code 0 up to 10 seconds more for each shown
 * interface that is set to IPv6 and has no IPv6 address yet (each second at LOG_DEBUG), whatever
 * signals arrive; each query of an interface can block as long as vlsys_get_netif. Set to IPv6 is
 * also an interface that is off while the kernel has IPv6 and autoconf on for it: it costs the 10
 * seconds.
 */
VLSYS_API int vlsys_network_restart(void);

/* ---- Processes ------------------------------------------------------------------------------- */

/*
 * Starts "/bin/sh -c <command>" as a child of the caller and returns its process id at once. The
 * caller reaps the child; one that could not execute the shell exits with 127. The child has the
 * caller's dispositions of SIGINT and SIGQUIT and its signal mask. In the parent the two signals
 * are ignored and SIGCHLD is blocked while the child is made, and put back before the return.
 * Standard output is flushed first. A process with other threads can call it too: between fork and
 * exec the child neither logs nor takes memory or a lock.
 *
 * Returns -1 with errno set when a signal could not be set or the child not made (logged), EFAULT
 * for a null command (not logged). Logs the command, before the child is made, and the process id
 * at LOG_DEBUG. Not for two threads at once.
 */
VLSYS_API pid_t vlsys_spawn_direct(const char *command);

/*
 * Describes a wait status (that of waitpid, system, vlsys_system) in one line, cut to size - 1
 * bytes and NUL-terminated:
 *   exited (<name>), status: <exit code>
 *   exited (<name>), abnormally, signaled: <signal>
 *   exited (<name>), abnormally                        (stopped, not ended)
 * with " pid: <pid>" after the first word when the process id is not 0. A null name shows as "?".
 *
 * Returns the exit code (0 to 255) of a normal exit, 256 for any other status. Logs nothing. May
 * run on any thread.
 */
VLSYS_API int vlsys_exit_status_text(char *buffer, size_t size, pid_t pid, const char *name,
                                     int status);

/*
 * The surrogate parent is a local service that runs shell commands for others: it takes the
 * caller's working directory and the command, and answers with a number. The three operations below
 * open one connection each, to TCP port 12865 of 127.0.0.1, and share these rules:
 * - When the connection cannot be made (the reason is logged at LOG_ERR, the fallback at
 *   LOG_WARNING) the command is run directly, as each operation says. After it was made there is no
 *   fallback: the operation fails, and errno says why. errno stays as it was when vlsys_system and
 *   vlsys_spawn succeed.
 * - A null command fails with EFAULT; nothing is run or logged.
 * - To the surrogate parent a working directory and a command are one line each. When one has a
 *   line feed the operation fails with EINVAL, and nothing is sent. A command that is run directly
 *   may have line feeds.
 * - A request that could only be sent in part is not run.
 * - A command that is run directly is a child of the caller. When SIGCHLD is ignored, or a handler
 *   of the caller's reaps every child, its end cannot be told: vlsys_system and vlsys_pclose then
 *   return -1 (ECHILD), and vlsys_get_serial_number -300, although the command ran.
 * - When connected, they log the working directory at LOG_DEBUG and the command at LOG_INFO
 *   (vlsys_popen: the whole request at LOG_DEBUG), and what each says below. A reply that is
 *   missing or is no number is not logged. A command that is run directly is not logged, but for
 *   what vlsys_spawn_direct logs.
 * - They block until the surrogate parent takes the connection (by the kernel's settings about 2
 *   minutes, then the command is run directly), has taken the request, and answers; the rest has no
 *   limit.
 * - The answer is what arrives first, at most 8191 bytes; it is not asked again, and believed.
 * - No signal is raised when the surrogate parent goes away, and the connection is closed in
 *   programs that the process executes. A signal that arrives meanwhile cuts nothing short.
 * - They may run on any thread, but vlsys_spawn on one at a time. The working directory is that of
 *   the process.
 */
#define VLSYS_SURROGATE_PORT "12865"

/*
 * Connects to a TCP service of 127.0.0.1, given as a decimal port number. Blocks up to about 2
 * minutes, by the kernel's settings, while the service takes no connection.
 *
 * Returns the connected socket, close-on-exec, which the caller closes; -1 on failure; with `quiet`
 * not 0, 0 when the connection was refused, which is then not logged (descriptor 0 must be open, or
 * a socket could get that number).
 */
VLSYS_API int vlsys_surrogate_connect(int quiet, const char *service);

/*
 * Runs a shell command and waits for its end, without a limit. Directly: system().
 *
 * Returns the command's wait status (exit code in bits 8 to 15, see vlsys_exit_status_text),
 * clamped to the range of int, or -1 with errno set: ECONNRESET when the surrogate parent closed
 * the connection without an answer, EPROTO when its answer is not a number followed by a line feed
 * or the end (and when the status itself is negative), EFAULT and EINVAL as above, else that of the
 * call that failed (logged). Logs the exit code at LOG_DEBUG.
 */
VLSYS_API int vlsys_system(const char *command);

/*
 * Starts a shell command in the background. Directly: vlsys_spawn_direct.
 *
 * Returns its process id, or -1 with errno set as for vlsys_system. The surrogate parent's number
 * is not checked: one below 1 is no process to send a signal to. The command is a child of the
 * surrogate parent, and of the caller only when it was started directly. Logs the answer and the
 * process id at LOG_DEBUG.
 */
VLSYS_API int vlsys_spawn(const char *command);

/*
 * Runs a shell command and gives a stream to read its output from. Directly: popen(command, "re").
 * From the surrogate parent, the last line of the stream is the command's wait status in decimal.
 * Close it with vlsys_pclose. The stream's descriptor is close-on-exec. Reading blocks, without a
 * limit, until the command writes or ends.
 *
 * Returns null with errno set on failure. Working directory and command together may have up to
 * 1019 bytes, else errno is E2BIG, or ERANGE when the directory alone has over 1023; nothing is run
 * then. Logs the command's process id at LOG_INFO.
 */
VLSYS_API FILE *vlsys_popen(const char *command);

/*
 * Closes a stream of vlsys_popen. A command that the surrogate parent is still running is ended;
 * this takes 1 second in any case. One that was run directly is waited for without a limit.
 *
 * Returns 0, also when the command could not be told to end (logged); the wait status that pclose
 * gives when the command was run directly; -1 for a null stream.
 */
VLSYS_API int vlsys_pclose(FILE *stream);

/* ---- Video I/O driver ------------------------------------------------------------------------ */

/*
 * The unit has four video I/O boards. Their driver publishes the registers in the text file
 * /proc/driver/VlAvio/status, which these operations read into one table of the library; the
 * product information below is taken from that table. A register that the file does not give keeps
 * its value in the table, and each is 0 until it was read. Register lines under the header of a
 * board with another device id are skipped. A status file that cannot be read to its end counts as
 * one that could not be opened; the registers before that point are in the table. The table belongs
 * to one thread.
 */

/* Device ids of the boards. */
#define VLSYS_AVIO_KRD31 0x4160
#define VLSYS_AVIO_TBX204 0x4161
#define VLSYS_AVIO_TBX205 0x4162
#define VLSYS_AVIO_TBX206 0x4163

/*
 * Result of vlsys_avio_scan_alive: bits 0 to 3 are set for each board found in the file, bits 4 to
 * 7 for each board found alive, both in the order of the device ids, besides the bits here. The
 * result is exactly VLSYS_AVIO_READY when all boards are alive and nothing is amiss.
 */
#define VLSYS_AVIO_READY 0xff
#define VLSYS_AVIO_UNKNOWN_DEVICE 0x100 /* a board with another device id was seen */
#define VLSYS_AVIO_STRAY_ALIVE 0x200    /* an Alive register stands before any board */
#define VLSYS_AVIO_NO_DRIVER 0x400      /* alone: the status file could not be opened or read */

/*
 * Reads the Config register of every board. A value of more than 32 bits, or below 0, is taken as
 * 0xffffffff.
 *
 * Returns 0, or -1 when the file could not be opened or read, a board with another device id was
 * seen (logged at LOG_ERR as "unknown device id: ..."), or a register stands before any board; what
 * could be assigned is in the table even then.
 */
VLSYS_API int vlsys_avio_read_config(void);

/*
 * The Config register of the board with a device id of VLSYS_AVIO_*: 0 after a normal boot, 1 after
 * a boot from the backup image, other values are illegal. Reads the registers first unless the last
 * read of an open status file succeeded.
 *
 * Returns the register's 32 bits, or -1 for another device id and when the registers cannot be
 * read; an illegal register of 0xffffffff reads as -1 too. Logs only what vlsys_avio_read_config
 * logs.
 */
VLSYS_API int vlsys_avio_get_config(unsigned int device_id);

/*
 * Reads the Alive register of every board. A value is taken only when it is odd (the board is
 * alive) and below 0x100; others are ignored.
 *
 * Returns the bits described above. Logs the values of KRD-31 and TBX-204 at LOG_DEBUG, a board
 * with another device id at LOG_ERR.
 */
VLSYS_API int vlsys_avio_scan_alive(void);

/*
 * Waits until all boards are alive: up to 960 scans, about 30 ms apart, which is a little under 29
 * seconds. A status file that is missing or cannot be read, and a signal that interrupts a sleep,
 * end the wait at once. Then reads the Config registers and reports.
 *
 * Returns 1 when the boards came up, or no status file can be read, and none booted from its backup
 * image; else 0.
 * Logs the beginning and the end of the wait at LOG_INFO ("can't get VlAvio status. Emulator ?" at
 * LOG_WARNING without a status), and each Config register at LOG_INFO, with a LOG_WARNING for a
 * boot from backup or an illegal value. With the boards up, or without a status, frame
 * frequency, destination and HDCP capability follow at LOG_INFO; else "timeout (<seconds>). " at
 * LOG_ERR, and the boards not found and those not alive at LOG_INFO.
 */
VLSYS_API int vlsys_avio_wait_ready(void);

/* ---- Product information --------------------------------------------------------------------- */

/*
 * The serial number and the version may be read on any thread; what comes from the table of the
 * video I/O driver, on the thread that the table belongs to.
 */

/*
 * The unit's destination code, "SY" or "CN", cut to a buffer of `size` bytes (3 hold it all). As
 * long as the status of the KRD-31 board has not been read, the first step is
 * vlsys_avio_wait_ready, with its time and messages; without the driver that is so at every call.
 *
 * Returns the length of the whole code, 2.
 * Logs the code at LOG_INFO; at LOG_WARNING that the status is read now, and that an unknown
 * destination is taken as "SY".
 */
VLSYS_API int vlsys_get_destination(char *buffer, size_t size);

/*
 * The unit's frame rate. Calls vlsys_get_destination first, with its time and messages.
 *
 * Returns 50 or 59 (for 59.94). An unknown rate is taken from the destination, 50 for "CN" and 59
 * for "SY", with a LOG_WARNING. Logs the rate at LOG_INFO.
 */
VLSYS_API int vlsys_get_fps(void);

/*
 * Whether the unit can handle HDCP. As long as the status of the TBX-205 board has not been read,
 * waits like vlsys_get_destination, with the same LOG_WARNING; logs nothing else.
 *
 * Returns 1 or 0.
 */
VLSYS_API int vlsys_get_hdcp_capability(void);

/*
 * The unit's main serial number, cut to a buffer of `size` bytes; "00000" when the unit names none.
 * Runs "/usr/bin/Tovrin version -d krd" with vlsys_popen, reads to the end without a limit, and
 * closes it with vlsys_pclose, which takes 1 second more when the surrogate parent ran it.
 *
 * The last line of the output is taken as the command's wait status, which the surrogate parent
 * sends; a text that does not begin with a number counts as 0. A listing that is cut, by a
 * surrogate parent that goes away, is taken as it came: the unit is named by the digits that
 * arrived.
 *
 * Returns
 *   the length of the whole serial number (the text was cut when that is `size` or more);
 *   0 when the output has no serial number: the buffer is then left as it was;
 *   the negated errno when the command could not be started, or its output not read;
 *   VLSYS_SERIAL_COMMAND_FAILED (-200) minus the wait status when a signal ended the command;
 *   VLSYS_SERIAL_COMMAND_FAILED minus the exit code when that is not 0;
 *   VLSYS_SERIAL_DIRECT_FAILED (-301) minus the wait status that vlsys_pclose gives, when that is
 *   not 0 (only when the command ran without the surrogate parent);
 *   VLSYS_SERIAL_PCLOSE_FAILED (-300) when it gives none.
 * After a failure the buffer may hold a serial number that was read before it.
 * Logs each line of the output at LOG_DEBUG.
 */
#define VLSYS_SERIAL_COMMAND_FAILED (-200)
#define VLSYS_SERIAL_PCLOSE_FAILED (-300)
#define VLSYS_SERIAL_DIRECT_FAILED (-301)
VLSYS_API int vlsys_get_serial_number(char *buffer, size_t size);

/*
 * The installed software version: the first line of /etc/velmora-version (its first 1023 bytes),
 * cut to a buffer of `size` bytes, and the file's modification time, stored through `time` (not
 * null). A version that cannot be read is given as "1.00_SQA3", a time that is not known as
 * 2013-02-25 07:54:00 UTC.
 */
VLSYS_API void vlsys_get_version(char *buffer, size_t size, time_t *time);

/* ---- Validation of a network setting --------------------------------------------------------- */

/*
 * A check code names what is wrong with a setting: the interface concerned by its position in the
 * list (0 for the first or only one, and for faults that concern no single interface), the field
 * and the kind of fault. Every check code is VLSYS_CHECK_CODE(0, 0, 0), that is 0x100, or above.
 */
#define VLSYS_CHECK_CODE(position, field, kind) ((((position) + 1) << 8) | ((field) << 4) | (kind))
#define VLSYS_CHECK_IS_CODE(result) ((result) >= 0x100)
#define VLSYS_CHECK_POSITION(code) (((code) >> 8) - 1)
#define VLSYS_CHECK_FIELD(code) (((code) >> 4) & 0xF)
#define VLSYS_CHECK_KIND(code) ((code)&0xF)

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
 *     addr6[0]              IPv6 Manual          IPv6 Manual (addr and prefix)
 *   IPv4 gateway: addr      IPv4 not Off         gateway Manual
 *   IPv6 gateway: addr      IPv6 not Off         gateway Manual
 *     iface                 (has none)           gateway DHCP, IPv6 also Auto
 *   DNS: domain, server[0]  DNS Manual           DNS Manual
 *     server[1]             DNS Manual           DNS Manual
 *     server[2]             never                DNS Manual
 *     iface                 never                never
 *   host name               always               always
 *
 * Some of them reach the setters unread, and are written as they are into files that the network
 * scripts run as shell text:
 * - GATEWAY and IPV6_DEFAULTGW: the gateway's addr, after vlsys_address_check with its family Off,
 *   after vlsys_address_check2 with the gateway's mode DHCP, IPv6 also Auto (a gateway record that
 *   is Off or of an unknown mode is cleared);
 * - DOMAIN, DNS1 and DNS2: domain, server[0] and server[1], with a DNS mode above VLSYS_MODE_DHCP,
 *   which passes both validators and is Manual to the setter (vlsys_address_check turns it Off when
 *   both families are Off, vlsys_address_check2 refuses it when no interface is on).
 * IPv4 modes above VLSYS_MODE_DHCP and IPv6 modes above VLSYS_MODE_AUTO pass as well; the setter
 * takes them for DHCP and Auto, and writes no field that was not read.
 *
 * So a setting that comes from outside goes by way of vlsys_set_network, which clears them, and not
 * from a validator straight to the setters.
 */

/*
 * Checks whether the network setting of one interface can be applied, and brings it into the form
 * that the setters write. The checks stop at the first fault, in the order given here; what was
 * brought into form up to there stays so. The texts are those of the records' fields, where one
 * that is full may lack its NUL; gw4 is a buffer of VLSYS_ADDR4_SIZE, gw6 one of VLSYS_ADDR6_SIZE
 * bytes, both empty for no gateway, and hostname a text in one of at least 64.
 *
 * - The kernel has an interface of that very name; an alternative name is none.
 * - IPv4 Manual: addr, netmask (a prefix length of 8 to 30 becomes a mask) and the gateway become
 *   canonical, broadaddr is filled. A netmask is a prefix length by the number it begins with:
 *   "24abc" and "24.0.0.0" are 24 as well. "31" is none: it is the mask 0.0.0.31, which has a gap.
 *   The gateway lies in the subnet; neither it nor addr is the network or broadcast address, which
 *   a netmask of 255.255.255.255 does not have. IPv4 DHCP: the gateway becomes canonical. IPv4 Off:
 *   it is not looked at.
 * - IPv6 the same, with addr6[0]: a link-local gateway needs no subnet but its "%interface", and
 *   there is no broadcast address.
 * - DNS is turned Off, with a warning, when both families are Off, or when it is DHCP and neither
 *   family is.
 * - DNS Manual: the domain is empty or well-formed. server[0] is given; it and server[1] become
 *   canonical, a repeated server[1] is emptied. A server belongs to a family that is on; one of a
 *   Manual family lies in its subnet or has a gateway to go through. In IPv4 its host bits are not
 *   all zero and it is not the broadcast address (a netmask of 255.255.255.255 has neither rule);
 *   in IPv6 it is not the network address. server[2] is not looked at. In the rules for DNS, and
 *   throughout vlsys_address_check2, only VLSYS_MODE_MANUAL is Manual and only VLSYS_MODE_DHCP is
 *   DHCP.
 * - dns->iface becomes the interface, whatever the DNS mode.
 * - The host name is well-formed and at most 64 characters long; an empty one becomes "localhost",
 *   with a warning.
 *
 * Returns 0, a check code at position 0, EFAULT for a null argument, the errno value of an
 * interface look-up that failed for another reason (EMFILE: no free descriptor), or the errno value
 * or negative resolver code of a failed address conversion; that of broadaddr alone does not stop
 * the checks. Logs the modes at LOG_INFO at the start and when all is well, and each fault at
 * LOG_ERR. Silent: null arguments, an interface that does not exist, an IPv6 prefix length above
 * 128, an address of a range that its field does not allow, a link-local address without scope, a
 * name with a misplaced character (one that is too long is logged) and a missing server[0]. A
 * netmask made of a prefix length is logged at LOG_DEBUG. Asks the kernel for interface names only;
 * no host name is looked up, nothing is waited for.
 */
VLSYS_API int vlsys_address_check(vlsys_ifconf *nif, char *gw4, char *gw6, vlsys_dns *dns,
                                  char *hostname);

/*
 * Checks the network setting of `count` interfaces at once, in the manner of vlsys_address_check;
 * what differs:
 *
 * - Interfaces: "eth1" need not exist, nor is it looked up, and "lo" is refused. A prefix of 8 to
 *   30 replaces the netmask; otherwise it becomes the netmask's length, which must be 8 to 30.
 * - No two interfaces have the same IPv4 address, and none has a Manual address in the subnet of
 *   another one, in either family (in IPv6 silent).
 * - A Manual gateway needs an interface of its family that is on. It lies in the subnet of any
 *   Manual interface, or one learns its routes (DHCP, IPv6 also Auto), or it is link-local; it is
 *   no subnet's network or broadcast address. gw4->iface becomes the last interface whose subnet
 *   holds it.
 * - A learnt gateway (DHCP, IPv6 also Auto) names an interface, and one of the list only if that
 *   interface's mode is neither Off nor Manual.
 * - A gateway record that is Off, Manual without address or of an unknown mode is cleared.
 * - A DNS mode other than Off without an interface that is on, and DHCP without one on DHCP, are
 *   faults.
 * - DNS Manual: of equal servers the last one stays, the others are emptied; at least one of the
 *   three is given. (vlsys_set_dns_settings writes the first two and refuses an empty server[0].) A
 *   server needs an interface of its family that is on, and lies in the subnet of any Manual
 *   interface, or one learns its routes, or the Manual gateway of its family was accepted; it is no
 *   subnet's network or broadcast address.
 * - dns->iface becomes the first interface that is on (DNS Manual) or on DHCP (DNS DHCP), and stays
 *   as it is otherwise.
 *
 * The order is: each interface's name and IPv4 addressing, IPv4 subnets against each other, IPv4
 * gateway; each interface's IPv6 addressing, IPv6 subnets against each other, IPv6 gateway; DNS;
 * host name.
 *
 * Returns as vlsys_address_check, EFAULT also for a count below 1, and the errno value of a failed
 * allocation. A check code carries the position of the interface whose addressing is at fault, or
 * whose network or broadcast address a gateway or server is; else position 0.
 * Logs at LOG_INFO the modes in one word ("MD__M_M4_": the IPv4 modes of the first two interfaces,
 * their IPv6 modes, IPv4 and IPv6 gateway, DNS and the families of its first two servers; a learnt
 * gateway is "0" or "1" for the interface it names, else "!") and the result, "NG (<code>)" or
 * "OK"; values on the way, and an interface that does not exist, at LOG_DEBUG. Silent beyond the
 * faults of vlsys_address_check: a netmask length outside 8 to 30, a learnt gateway without an
 * interface, and a gateway that the interfaces' modes do not support.
 */
VLSYS_API int vlsys_address_check2(vlsys_ifconf *nifs, int count, vlsys_gw4 *gw4, vlsys_gw6 *gw6,
                                   vlsys_dns *dns, char *hostname);

/*
 * A check code in words, such as "eth1: the IPv4 netmask has a gap", cut to a buffer of `size`
 * bytes, which may be null. The `count` interfaces are those that were checked, or null: the text
 * then says "interface 2" in place of a name. It names an interface only where the code concerns
 * one: an overlap, for one, is found between two, and its code does not say which.
 * VLSYS_CHECK_FIELD_IPV6_ADDR is also the third DNS server's field: the text says "third DNS
 * server" where the kind of fault, or an interface without a fixed IPv6 address, tells it is that.
 *
 * Every other result of the validators and of vlsys_set_network has a text, too: "no fault" for 0,
 * "error <number>: " and the system's text for an errno or a negative resolver code.
 *
 * Returns the length of the whole text: it was cut when that is `size` or more. Logs nothing.
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
 * setters, in the order of the steps above. This is the safe way to set what a person or another
 * program asked for: the setters write what they are given into files that scripts run as root, and
 * no text that the check did not look at reaches them.
 *
 * - A mode that its field does not have is refused: above VLSYS_MODE_AUTO for IPv6 and the IPv6
 *   gateway, above VLSYS_MODE_DHCP for IPv4, the IPv4 gateway and DNS.
 * - After the check, every field that the modes leave unread is cleared in the caller's records:
 *   addr, netmask, broadaddr and prefix of an interface whose IPv4 is not Manual; addr6[0] when its
 *   IPv6 is not; a gateway's addr when it is not Manual; domain and servers when DNS is not, and
 *   its iface when it is Off.
 * - DNS servers move up where the check has emptied one. The first two are written.
 * - The first failure ends it; what was written before it stays.
 *
 * `step` may be null; it receives VLSYS_STEP_NONE, or the step that failed.
 *
 * Returns 0; a check code; 22 (EINVAL) for a mode that is refused (logged); 14 (EFAULT) for a null
 * argument or a count below 1; else the positive errno of the check or of the setter that failed.
 * Logs what the check and the setters log, and at LOG_WARNING each part of the setting that the
 * check lets pass and the network scripts are known not to serve: a link-local address as the fixed
 * IPv6 address, an IPv4 gateway outside every fixed subnet, and a global IPv6 gateway outside every
 * fixed subnet, which the scripts set before the prefix is learnt. The result is 0 all the same.
 */
VLSYS_API int vlsys_set_network(vlsys_ifconf *nifs, int count, vlsys_gw4 *gw4, vlsys_gw6 *gw6,
                                vlsys_dns *dns, char *hostname, int *step);

/* ---- Files and directories ------------------------------------------------------------------- */

/*
 * These may run on any thread; but vlsys_remove_tree changes the working directory of the whole
 * process while it works.
 */

/*
 * Rebuilds the font cache: runs "fc-cache" with vlsys_system and waits for it without a limit.
 *
 * Returns the command's exit code (0 is success), its whole wait status when it was ended by a
 * signal, or the negated errno when it could not be run. Logs only what vlsys_system logs.
 */
VLSYS_API int vlsys_fc_cache(void);

/*
 * Makes a directory and every missing directory above it, each with the mode given (permission
 * bits, less the umask). The path must not be null; of a longer one the first 4096 bytes are taken.
 *
 * Returns 0 when every level was made or was there already, -1 on failure (errno says why); levels
 * made before the failure stay. An entry of another kind in the directory's place counts as being
 * there.
 */
VLSYS_API int vlsys_mkdir(const char *path, unsigned int mode);

/*
 * Removes a file, or a directory with all that is in it. Symbolic links are removed, not followed;
 * other file systems mounted below are not entered; slashes at the path's end are ignored. The
 * working directory changes during the call, and the names of a directory are held in memory.
 *
 * Returns 0, or a positive errno: EFAULT for a null path and ENOENT for an empty one (neither is
 * logged), else that of the first removal that failed, or of the walk itself, which ends the work:
 * what was not yet removed stays. Paths below it of over 32,000 bytes can end the walk
 * with ENAMETOOLONG. A directory that cannot be read is passed over silently: removing its parent
 * then fails, or, when it is the path itself, it stays and the result is 0. Any other entry that
 * cannot be walked is logged at LOG_ERR (a directory cycle at LOG_WARNING) and passed over.
 */
VLSYS_API int vlsys_remove_tree(const char *path);

/*
 * The absolute path of an existing file without symbolic links, "." and "..", cut to a buffer of
 * `size` bytes; the buffer may be null.
 *
 * Returns the length of the whole path, -EFAULT for a null path (not logged), or the negated errno.
 */
VLSYS_API int64_t vlsys_realpath(char *buffer, const char *path, size_t size);

/*
 * The size in bytes of the disk or partition that a device path names after its symbolic links are
 * resolved; INT64_MAX when it is larger. It is read from the name's size file:
 * /sys/block/sda/sda1/size for a partition of a disk with a one-letter name ("sda1", "hdb2"),
 * /sys/block/<name>/size for every other name.
 *
 * Returns the size (0 when the file is empty or holds no number), -EFAULT for a null path (not
 * logged), or the negated errno, also that of a size file that opens and cannot be read. Logs the
 * device's name at LOG_DEBUG and the size at LOG_INFO.
 */
VLSYS_API int64_t vlsys_get_block_device_size(const char *path);

#ifdef __cplusplus
}
#endif

#endif
