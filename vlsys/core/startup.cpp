#include "core/log.h"
#include "core/owners.h"
#include "version.h"

#include <cstring>
#include <fcntl.h>

namespace vlsys {

static Text path_root;
static Text path_prefix;
static Text path_data;
static uint32_t start_count;

static const char *environment(const char *name, const char *fallback) {
    const char *value = getenv(name);
    return value ? value : fallback;
}

static int join(Text &path, const char *root, const char *rest, const char *failure) {
    const size_t size = strlen(root) + strlen(rest) + 1;
    path.reset(static_cast<char *>(malloc(size)));
    if (!path) {
        vlsys_log(LOG_ERR, "%s: %m", failure);
        return -errno;
    }
    vlsys_strlcpy(path.get(), root, size);
    vlsys_strlcat(path.get(), rest, size);
    return 0;
}

static int set_up_paths() {
    const char *root = environment("VL_ROOT", "");
    const char *prefix = environment("VL_PREFIX", "/usr");
    const char *data = environment("VL_DATA", "/velmora");

    path_root.reset(strdup(root));
    if (!path_root) {
        vlsys_log(LOG_ERR, "%s: %m", "strdup(path_root)");
        return -errno;
    }
    const int result = join(path_prefix, root, prefix, "malloc(path_prefix)");
    if (result < 0)
        return result;
    return join(path_data, root, data, "malloc(path_data)");
}

// What is written to a closed standard descriptor, here or by a command, would go to the file or
// socket that was opened next. Commands inherit these, so they are not close-on-exec.
static void open_standard_descriptors() {
    int fd = 0;
    do
        fd = open("/dev/null", O_RDWR);
    while (fd >= 0 && fd <= STDERR_FILENO);
    const Fd surplus(fd);
}

static int64_t get_path(const Text &path, char *buffer, size_t size) {
    constexpr int64_t not_started = -200;
    if (!path)
        return not_started;
    if (!buffer)
        return static_cast<int64_t>(strlen(path.get()));
    if (size == 0)
        return 0;
    return static_cast<int64_t>(vlsys_strlcpy(buffer, path.get(), size));
}

} // namespace vlsys

using namespace vlsys;

int vlsys_init(void) {
    if (start_count != 0) {
        vlsys_log(LOG_DEBUG, "initialized %d times", static_cast<int>(start_count));
        return 0;
    }
    open_standard_descriptors();
    vlsys_log(LOG_INFO, "vlsys %s built on %s", VLSYS_VERSION, VLSYS_BUILD_DATE);
    const int result = set_up_paths();
    if (result < 0)
        return result;
    start_count++;
    return 0;
}

void vlsys_exit(void) {
    path_root.reset();
    path_prefix.reset();
    path_data.reset();
    start_count = 0;
}

int64_t vlsys_get_path_root(char *buffer, size_t size) {
    return get_path(path_root, buffer, size);
}

int64_t vlsys_get_path_prefix(char *buffer, size_t size) {
    return get_path(path_prefix, buffer, size);
}

int64_t vlsys_get_path_data(char *buffer, size_t size) {
    return get_path(path_data, buffer, size);
}
