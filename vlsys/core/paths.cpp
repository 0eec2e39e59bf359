#include "core/paths.h"

#include "core/log.h"
#include <cstdlib>
#include <cstring>

namespace vlsys {

// Not owners, which would free them when the process exits: another thread may still be at work.
static char *path_root;
static char *path_prefix;
static char *path_data;

static void replace(char **path, char *text) {
    free(*path);
    *path = text;
}

static const char *environment(const char *name, const char *fallback) {
    const char *value = getenv(name);
    return value ? value : fallback;
}

static int join(char **path, const char *root, const char *rest, const char *failure) {
    const size_t size = strlen(root) + strlen(rest) + 1;
    replace(path, static_cast<char *>(malloc(size)));
    if (!*path)
        return log_errno("%s", failure);
    vlsys_strlcpy(*path, root, size);
    vlsys_strlcat(*path, rest, size);
    return 0;
}

int set_up_paths() {
    const char *root = environment("VL_ROOT", "");
    const char *prefix = environment("VL_PREFIX", "/usr");
    const char *data = environment("VL_DATA", "/velmora");

    replace(&path_root, strdup(root));
    if (!path_root)
        return log_errno("%s", "strdup(path_root)");
    const int result = join(&path_prefix, root, prefix, "malloc(path_prefix)");
    if (result < 0)
        return result;
    return join(&path_data, root, data, "malloc(path_data)");
}

void drop_paths() {
    replace(&path_root, nullptr);
    replace(&path_prefix, nullptr);
    replace(&path_data, nullptr);
}

static int64_t get_path(const char *path, char *buffer, size_t size) {
    if (!path)
        return VLSYS_NOT_STARTED;
    if (!buffer)
        return static_cast<int64_t>(strlen(path));
    if (size == 0)
        return 0;
    return static_cast<int64_t>(vlsys_strlcpy(buffer, path, size));
}

SystemPath::SystemPath(const char *fixed, const char *name) {
    text[0] = '\0'; // the getter writes nothing before the library is started
    vlsys_get_path_root(text, sizeof text);
    vlsys_strlcat(text, fixed, sizeof text);
    vlsys_strlcat(text, name, sizeof text);
}

} // namespace vlsys

using namespace vlsys;

int64_t vlsys_get_path_root(char *buffer, size_t size) {
    return get_path(path_root, buffer, size);
}

int64_t vlsys_get_path_prefix(char *buffer, size_t size) {
    return get_path(path_prefix, buffer, size);
}

int64_t vlsys_get_path_data(char *buffer, size_t size) {
    return get_path(path_data, buffer, size);
}
