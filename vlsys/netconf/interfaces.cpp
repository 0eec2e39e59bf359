#include "netconf/interfaces.h"

#include "core/log.h"

#include <algorithm>
#include <cstring>
#include <net/if.h>
#include <span>
#include <sys/socket.h>

namespace vlsys {

namespace {

struct FreeIndex {
    void operator()(struct if_nameindex *index) const { if_freenameindex(index); }
};
using Index = std::unique_ptr<struct if_nameindex, FreeIndex>;

// An array's element, where a plain InterfaceName can't be assigned.
struct Name {
    InterfaceName text;
};

} // namespace

// The C library asks the kernel by way of a socket, and when it gets none says ENOENT, whatever the
// reason. A socket of our own fails alike and leaves the reason in errno.
static void set_true_errno() {
    if (errno != ENOENT)
        return;
    const Fd tried(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
}

int find_interface(const char *name, unsigned int *index) {
    const unsigned int found = if_nametoindex(name);
    if (found == 0) {
        if (errno == ENODEV)
            return -ENXIO;
        set_true_errno();
        return log_errno("if_nametoindex(%s)", name);
    }
    char own_name[IF_NAMESIZE];
    if (!if_indextoname(found, own_name)) {
        if (errno == ENXIO)
            return -ENXIO;
        set_true_errno();
        return log_errno("if_indextoname(%u)", found);
    }
    if (strcmp(name, own_name) != 0)
        return -ENXIO;
    if (index)
        *index = found;
    return 0;
}

bool is_virtual_bridge(const char *name) {
    return strncmp(name, "virbr", 5) == 0;
}

static bool is_listed(const char *name) {
    return strcmp(name, "lo") != 0 && !is_virtual_bridge(name);
}

// A number, or the code of a character that is no digit; in 32 bits.
static uint32_t value_at(const char *text) {
    if (*text >= '0' && *text <= '9')
        return static_cast<uint32_t>(strtol(text, nullptr, 10));
    return static_cast<unsigned char>(*text);
}

int compare_natural(const char *a, const char *b, int n) {
    for (; n > 0; a++, b++, n--) {
        const uint32_t value_a = value_at(a);
        const uint32_t value_b = value_at(b);
        if (value_a != value_b)
            return static_cast<int>(value_a - value_b);
        if (*a != *b || *a == '\0')
            return static_cast<unsigned char>(*a) - static_cast<unsigned char>(*b);
    }
    return 0;
}

int compare_ifname(const void *a, const void *b) {
    return compare_natural(static_cast<const char *>(a), static_cast<const char *>(b),
                           VLSYS_IFNAME_SIZE);
}

static bool is_below(const Name &a, const Name &b) {
    return compare_ifname(a.text, b.text) < 0;
}

// A heap sort stays inside the array whatever the comparison says, unlike qsort and std::sort.
static void sort(std::span<Name> names) {
    std::make_heap(names.begin(), names.end(), is_below);
    std::sort_heap(names.begin(), names.end(), is_below);
}

InterfaceList::InterfaceList() {
    InterfaceName *names = nullptr;
    count_ = vlsys_get_ifname_list(&names);
    names_.reset(names);
}

static struct {
    uint32_t index; // 0: not found yet
    InterfaceName name;
} primary;

static bool is_primary(const char *name) {
    primary.index = if_nametoindex(name);
    vlsys_strlcpy(primary.name, name, sizeof primary.name);
    return primary.index > 0;
}

static bool find_primary() {
    if (is_primary("eth0") || is_primary("enp0s25"))
        return true;
    const InterfaceList interfaces;
    return interfaces.count() > 0 && is_primary(*interfaces.begin());
}

int get_primary_ifname(char *out) {
    if (!out)
        return -EFAULT;
    if (primary.index == 0 && !find_primary())
        return 0;
    vlsys_strlcpy(out, primary.name, sizeof primary.name);
    return static_cast<int>(primary.index);
}

} // namespace vlsys

using namespace vlsys;

int vlsys_get_ifname_list(char (**pifn)[VLSYS_IFNAME_SIZE]) {
    const Index index(if_nameindex());
    if (!index) {
        log_errno("%s", "if_nameindex");
        return 0;
    }
    int count = 0;
    for (const struct if_nameindex *entry = index.get(); entry->if_name; ++entry)
        count += is_listed(entry->if_name);
    if (count == 0 || !pifn)
        return count;
    auto *const names = static_cast<Name *>(calloc(static_cast<size_t>(count), sizeof(Name)));
    *pifn = reinterpret_cast<InterfaceName *>(names);
    if (!names) {
        log_errno("*pifn = calloc(%d, %d)", VLSYS_IFNAME_SIZE, count);
        return 0;
    }
    Name *next = names;
    for (const struct if_nameindex *entry = index.get(); entry->if_name; ++entry)
        if (is_listed(entry->if_name))
            vlsys_strlcpy((next++)->text, entry->if_name, VLSYS_IFNAME_SIZE);
    sort({names, next});
    return count;
}
