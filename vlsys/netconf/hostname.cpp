#include "netconf/hostname.h"

#include "core/log.h"
#include "core/paths.h"
#include "netconf/keys.h"

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <unistd.h>

namespace vlsys {

static bool has_good_length(const char *name) {
    const size_t length = strlen(name);
    const size_t limit = length > 0 && name[length - 1] == '.' ? 255 : 254;
    if (length <= limit)
        return true;
    vlsys_log(LOG_ERR, "%s: too long: %d", name, static_cast<int>(length));
    return false;
}

static bool has_good_labels(const char *name) {
    int number = 0;
    for (const char *label = name + strspn(name, "."); *label != '\0'; number++) {
        const auto length = static_cast<int>(strcspn(label, "."));
        if (length > 63) {
            vlsys_log(LOG_ERR, "%s: label[%d] \"%.*s\" is too long (%d)", name, number, length,
                      label, length);
            return false;
        }
        label += length;
        label += strspn(label, ".");
    }
    return true;
}

static bool is_letter_or_digit(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9');
}

// A hyphen or dot only after a letter or digit, and no hyphen at the end.
static bool has_good_characters(const char *name) {
    char before = '.';
    for (; *name != '\0'; before = *name++) {
        if (is_letter_or_digit(*name))
            continue;
        if ((*name != '-' && *name != '.') || !is_letter_or_digit(before))
            return false;
    }
    return before != '-';
}

int check_hostname_format(const char *name) {
    if (name && has_good_length(name) && has_good_labels(name) && has_good_characters(name))
        return 0;
    return -1;
}

static int write_hostname(const char *name) {
    char hostname[VLSYS_HOSTNAME_SIZE + 1];
    snprintf(hostname, sizeof hostname, "%.*s", VLSYS_HOSTNAME_SIZE,
             name && name[0] != '\0' ? name : "localhost");
    vlsys_log(LOG_INFO, "hostname: %s", hostname);
    edit_item array[1];
    ItemList list(array);
    list.set("HOSTNAME", hostname);
    return edit_or_log(SystemPath(network_path).text, list.items());
}

} // namespace vlsys

using namespace vlsys;

int vlsys_set_hostname(const char *name) {
    return -write_hostname(name);
}

int vlsys_get_hostname(char *name) {
    if (!name)
        return EFAULT;
    return gethostname(name, VLSYS_HOSTNAME_SIZE) == 0 ? 0 : errno;
}

int vlsys_set_hostname_immediately(const char *name) {
    static constexpr char self[] = "vlsys_set_hostname_immediately";
    static constexpr size_t longest = 64; // that the kernel takes
    if (check_hostname_format(name) != 0 || strlen(name) > longest) {
        errno = EINVAL;
        log_errno("%s: hostname(%s) is not correct format", self, name);
        return VLSYS_HOSTNAME_REFUSED;
    }
    char current[VLSYS_HOSTNAME_SIZE];
    int result = vlsys_get_hostname(current);
    if (result != 0) {
        vlsys_log(LOG_ERR, "%s: vlsys_get_hostname: %s", self, strerror(result));
        return result;
    }
    if (strcmp(name, current) == 0) {
        vlsys_log(LOG_INFO, "%s: do not set up for the same hostname: %s", self, name);
        return 0;
    }
    result = vlsys_set_hostname(name);
    if (result != 0) {
        errno = result;
        log_errno("%s: vlsys_set_hostname(%s)", self, name);
        return result;
    }
    const size_t length = strlen(name);
    if (sethostname(name, length) != 0)
        return -log_errno("%s: sethostname(%s, %zd)", self, name, length);
    return 0;
}
