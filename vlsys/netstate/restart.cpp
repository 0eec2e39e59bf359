#include "core/lines.h"
#include "core/log.h"
#include "core/owners.h"
#include "core/paths.h"
#include "netstate/report.h"

#include <cerrno>
#include <cstring>
#include <unistd.h>

namespace vlsys {

static constexpr char restart_command[] = "service network restart";

// The HOSTNAME of the network file, in a buffer of VLSYS_HOSTNAME_SIZE bytes; empty when there is
// none, or no file that can be opened. The file is the one that the system's own scripts read,
// whatever the root path is.
// Returns 0, or the negated errno of an open file that cannot be read: it may well have a name.
static int get_sysconfig_hostname(char *hostname) {
    static constexpr char self[] = "get_sysconfig_hostname";
    hostname[0] = '\0';
    const File file(fopen(network_path, "re"));
    if (!file) {
        log_errno("%s: fopen(%s)", self, network_path);
        return 0;
    }
    char line[VLSYS_HOSTNAME_SIZE + sizeof "HOSTNAME=\n" - 1];
    Setting setting;
    int result = 0;
    while ((result = next_setting(file.get(), line, sizeof line, Quotes::remove, &setting)) > 0) {
        if (strcmp(setting.key, "HOSTNAME") == 0) {
            vlsys_strlcpy(hostname, setting.value, VLSYS_HOSTNAME_SIZE);
            return 0;
        }
    }
    return result < 0 ? log_errno("%s: fgets(%s)", self, network_path) : 0;
}

static int set_running_hostname() {
    char hostname[VLSYS_HOSTNAME_SIZE];
    const int result = get_sysconfig_hostname(hostname);
    if (result != 0)
        return result;
    const size_t length = strlen(hostname);
    if (sethostname(hostname, length) != 0)
        return log_errno("%s: sethostname(%s, %d)", "vlsys_network_restart", hostname,
                         static_cast<int>(length));
    return 0;
}

static void remove_resolver_file() {
    if (unlink(resolv_path) != 0 && errno != ENOENT)
        vlsys_log(LOG_WARNING, "%s: unlink(%s): %s", "vlsys_network_restart", resolv_path,
                  strerror(errno));
}

static void report(int exit_code) {
    char hostname[VLSYS_HOSTNAME_SIZE];
    const int result = vlsys_get_hostname(hostname);
    if (result != 0) {
        vlsys_log(LOG_ERR, "vlsys_get_hostname: %s", strerror(result));
        return;
    }
    vlsys_log(LOG_INFO, "hostname: %s", hostname);
    print_network_info(exit_code);
}

} // namespace vlsys

using namespace vlsys;

int vlsys_network_restart(void) {
    int result = set_running_hostname();
    if (result != 0)
        return result;
    // A unit whose DNS settings cannot be read keeps the network it has.
    vlsys_dns dns;
    result = vlsys_get_dns_settings(&dns);
    if (result != 0)
        return result;
    remove_resolver_file();

    const int status = vlsys_system(restart_command);
    if (status < 0) {
        log_errno("%s: vlsys_system(%s)", "vlsys_network_restart", restart_command);
        return status;
    }
    char text[1024];
    const int exit_code = vlsys_exit_status_text(text, sizeof text, 0, restart_command, status);
    vlsys_log(LOG_INFO, "%s: %s", "vlsys_network_restart", text);
    report(exit_code);
    return exit_code;
}
